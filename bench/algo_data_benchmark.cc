// Per-frame costs of the algorithm data types: alignment-map unpacking
// beside a plain scalar loop and beside memcpy, and the global tone map.
//
// Bandwidth figures count bytes read plus bytes written, for the unpack
// loops and memcpy alike, so that their bytes_per_second compare directly.

#include <cstring>
#include <memory>
#include <random>
#include <vector>

#include "benchmark/benchmark.h"
#include "orvex/api/algo/data_types/alignment_map.h"
#include "orvex/api/algo/data_types/data_kernels.h"
#include "orvex/api/algo/data_types/local_tone_mapping_data_v1.h"

namespace {

constexpr int64_t kMapWords4032x3024 = 64 * 48;  // stride 64, 48 rows
constexpr int64_t kLargeWords = int64_t{16} << 20;

std::vector<uint32_t> RandomWords(size_t n) {
  std::vector<uint32_t> words(n);
  std::mt19937 rng(1);
  for (auto& w : words) w = static_cast<uint32_t>(rng());
  return words;
}

// The straightforward loop, as the compiler builds it at this file's
// optimisation level.
[[gnu::noinline]] void ScalarMotionVectors(const uint32_t* in, size_t n, int32_t* out) {
  for (size_t i = 0; i < n; ++i) {
    out[2 * i] = static_cast<int32_t>(in[i]) >> 20;
    out[2 * i + 1] = static_cast<int32_t>(in[i] << 12) >> 20;
  }
}

[[gnu::noinline]] void ScalarMatchingErrors(const uint32_t* in, size_t n, uint8_t* out) {
  for (size_t i = 0; i < n; ++i) out[i] = static_cast<uint8_t>(in[i]);
}

void BM_MotionVectorsKernel(benchmark::State& state) {
  const auto words = RandomWords(static_cast<size_t>(state.range(0)));
  std::vector<int32_t> out(2 * words.size());
  for (auto _ : state) {
    orvex::UnpackMotionVectorWords(words, out);
    benchmark::ClobberMemory();
  }
  state.SetBytesProcessed(state.iterations() * state.range(0) * 12);
}

void BM_MotionVectorsScalar(benchmark::State& state) {
  const auto words = RandomWords(static_cast<size_t>(state.range(0)));
  std::vector<int32_t> out(2 * words.size());
  for (auto _ : state) {
    ScalarMotionVectors(words.data(), words.size(), out.data());
    benchmark::ClobberMemory();
  }
  state.SetBytesProcessed(state.iterations() * state.range(0) * 12);
}

void BM_MatchingErrorsKernel(benchmark::State& state) {
  const auto words = RandomWords(static_cast<size_t>(state.range(0)));
  std::vector<uint8_t> out(words.size());
  for (auto _ : state) {
    orvex::UnpackMatchingErrorWords(words, out);
    benchmark::ClobberMemory();
  }
  state.SetBytesProcessed(state.iterations() * state.range(0) * 5);
}

void BM_MatchingErrorsScalar(benchmark::State& state) {
  const auto words = RandomWords(static_cast<size_t>(state.range(0)));
  std::vector<uint8_t> out(words.size());
  for (auto _ : state) {
    ScalarMatchingErrors(words.data(), words.size(), out.data());
    benchmark::ClobberMemory();
  }
  state.SetBytesProcessed(state.iterations() * state.range(0) * 5);
}

// memcpy of range(1) bytes per word: 8 for the motion-vector output's
// size, 4 for the packed map's.
void BM_Memcpy(benchmark::State& state) {
  const auto bytes = static_cast<size_t>(state.range(0) * state.range(1));
  std::vector<unsigned char> in(bytes, 1);
  std::vector<unsigned char> out(bytes);
  for (auto _ : state) {
    std::memcpy(out.data(), in.data(), bytes);
    benchmark::ClobberMemory();
  }
  state.SetBytesProcessed(state.iterations() * static_cast<int64_t>(bytes) * 2);
}

// The whole AlignmentMap operation into an existing output buffer:
// mapping, zeroing of the tail and the unpack itself.
void BM_AlignmentMapUnpackMotionVectors(benchmark::State& state) {
  const auto words = static_cast<uint64_t>(state.range(0));
  auto packed =
      orvex::HeapBuffer<uint32_t>::Make(words, orvex::BufferCompression::kNone, nullptr).value();
  const auto random = RandomWords(static_cast<size_t>(words));
  std::memcpy(packed->GetPointer().get(), random.data(), words * 4);
  // One row of 8 words per 64 pixels wide; as many rows as needed.
  auto map = orvex::AlignmentMap::Make({64 * 8, static_cast<int>(64 * (words / 8))}, packed);
  std::shared_ptr<orvex::Buffer> output =
      orvex::HeapBuffer<int32_t>::Make(2 * words, orvex::BufferCompression::kNone, nullptr).value();
  // Fault the output's pages in before timing, as for the other loops.
  benchmark::DoNotOptimize(map->UnpackMotionVectors(nullptr, output));
  for (auto _ : state) {
    auto handle = map->UnpackMotionVectors(nullptr, output);
    benchmark::DoNotOptimize(handle);
  }
  state.SetBytesProcessed(state.iterations() * state.range(0) * 12);
}

BENCHMARK(BM_MotionVectorsKernel)->Arg(kMapWords4032x3024)->Arg(kLargeWords);
BENCHMARK(BM_MotionVectorsScalar)->Arg(kMapWords4032x3024)->Arg(kLargeWords);
BENCHMARK(BM_Memcpy)->Args({kMapWords4032x3024, 8})->Args({kLargeWords, 8});
BENCHMARK(BM_AlignmentMapUnpackMotionVectors)->Arg(kMapWords4032x3024)->Arg(kLargeWords);
BENCHMARK(BM_MatchingErrorsKernel)->Arg(kMapWords4032x3024)->Arg(kLargeWords);
BENCHMARK(BM_MatchingErrorsScalar)->Arg(kMapWords4032x3024)->Arg(kLargeWords);
BENCHMARK(BM_Memcpy)->Args({kMapWords4032x3024, 4})->Args({kLargeWords, 4});

void BM_GlobalToneMap(benchmark::State& state) {
  auto data = orvex::HeapAllocateLocalToneMappingDataV1().value();
  auto* grid = static_cast<uint16_t*>(data->grid->GetPointer());
  for (int i = 0; i < 16 * 12 * 8 * 2; ++i) {
    grid[i] = orvex::FloatToHalf((i % 2 == 0) ? 0.5f + 0.001f * static_cast<float>(i % 97) : 0.01f);
  }
  auto* curve = static_cast<float*>(data->guide_curve->GetPointer());
  for (int i = 0; i < 128; ++i) curve[i] = static_cast<float>(i) / 127.0f;
  const int n = static_cast<int>(state.range(0));
  std::vector<float> lut(static_cast<size_t>(n));
  for (auto _ : state) {
    benchmark::DoNotOptimize(data->GetGlobalToneMap(n, lut.data()));
    benchmark::ClobberMemory();
  }
}
BENCHMARK(BM_GlobalToneMap)->Arg(257)->Arg(256);

}  // namespace

BENCHMARK_MAIN();
