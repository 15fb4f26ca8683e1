// Cost of a CPU mapping plus its release: a heap buffer and an already
// mapped hardware buffer over a memfd, beside the naive per-access mmap +
// munmap of the same region. "allocs" counts heap allocations per iteration.

#include <sys/mman.h>
#include <unistd.h>

#include <atomic>
#include <cstdint>
#include <cstdlib>
#include <new>

#include "benchmark/benchmark.h"
#include "orvex/api/memory/buffer.h"
#include "orvex/api/memory/hw_buffer.h"

namespace {

std::atomic<uint64_t> g_allocations{0};

}  // namespace

// The replacement pair below is matched (malloc/free); GCC cannot see that
// once the operators are inlined into their callers.
#pragma GCC diagnostic ignored "-Wmismatched-new-delete"

void* operator new(std::size_t size) {
  g_allocations.fetch_add(1, std::memory_order_relaxed);
  if (void* p = std::malloc(size == 0 ? 1 : size)) return p;
  throw std::bad_alloc();
}
void operator delete(void* p) noexcept { std::free(p); }
void operator delete(void* p, std::size_t) noexcept { std::free(p); }

namespace {

constexpr uint64_t kSize = 4 << 20;

int MakeMemfd() {
  const int fd = memfd_create("buffer_benchmark", MFD_CLOEXEC);
  if (fd < 0 || ftruncate(fd, kSize) != 0) std::abort();
  return fd;
}

void ReportAllocations(benchmark::State& state, uint64_t before) {
  state.counters["allocs"] = benchmark::Counter(static_cast<double>(g_allocations.load() - before) /
                                                static_cast<double>(state.iterations()));
}

void BM_HeapBufferMapRelease(benchmark::State& state) {
  auto buffer = orvex::HeapBuffer<uint8_t>::Make(kSize, orvex::BufferCompression::kNone, nullptr);
  if (!buffer.ok()) std::abort();
  const uint64_t before = g_allocations.load();
  for (auto _ : state) {
    auto handle = (*buffer)->Map(0, kSize, orvex::BufferAccessMode::kReadWrite);
    benchmark::DoNotOptimize((*handle)->data());
  }
  ReportAllocations(state, before);
}
BENCHMARK(BM_HeapBufferMapRelease);

void BM_HwBufferRepeatMapRelease(benchmark::State& state) {
  const int fd = MakeMemfd();
  {
    // Uncached: a memfd is no dma-buf, so there is no cache maintenance to
    // time here; the mapping itself is made once, before the loop.
    auto buffer = orvex::HwBuffer::Make(
        fd, kSize,
        {orvex::BufferTransport::kDma, orvex::BufferAccess::kCpu, orvex::BufferSecurity::kNone,
         orvex::BufferCached::kUnCached, orvex::BufferCompression::kNone},
        nullptr);
    if (!buffer.ok() || !(*buffer)->Map(0, kSize, orvex::BufferAccessMode::kRead).ok()) {
      std::abort();
    }
    const uint64_t before = g_allocations.load();
    for (auto _ : state) {
      auto handle = (*buffer)->Map(0, kSize, orvex::BufferAccessMode::kRead);
      benchmark::DoNotOptimize((*handle)->data());
    }
    ReportAllocations(state, before);
  }
  close(fd);
}
BENCHMARK(BM_HwBufferRepeatMapRelease);

void BM_MmapMunmapUntouched(benchmark::State& state) {
  const int fd = MakeMemfd();
  for (auto _ : state) {
    void* p = mmap(nullptr, kSize, PROT_READ, MAP_SHARED, fd, 0);
    benchmark::DoNotOptimize(p);
    munmap(p, kSize);
  }
  close(fd);
}
BENCHMARK(BM_MmapMunmapUntouched);

void BM_MmapMunmapOnePageRead(benchmark::State& state) {
  const int fd = MakeMemfd();
  if (pwrite(fd, "x", 1, 0) != 1) std::abort();
  for (auto _ : state) {
    void* p = mmap(nullptr, kSize, PROT_READ, MAP_SHARED, fd, 0);
    char first = *static_cast<volatile const char*>(p);
    benchmark::DoNotOptimize(first);
    munmap(p, kSize);
  }
  close(fd);
}
BENCHMARK(BM_MmapMunmapOnePageRead);

}  // namespace

BENCHMARK_MAIN();
