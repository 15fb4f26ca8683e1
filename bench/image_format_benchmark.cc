// Layout construction and conformance checks of ImageFormat at a 12 MP
// camera size. Targets on the development host: Make under 500 ns, quiet
// ConformsTo under 200 ns.

#include "benchmark/benchmark.h"
#include "orvex/api/memory/image_format.h"

namespace {

using orvex::HalPixelFormat;
using orvex::ImageFormat;

void BM_Make(benchmark::State& state, HalPixelFormat format) {
  for (auto _ : state) {
    auto made = ImageFormat::Make(4000, 3000, format);
    benchmark::DoNotOptimize(made);
  }
}
BENCHMARK_CAPTURE(BM_Make, YCBCR_420_888, HalPixelFormat::YCBCR_420_888);
BENCHMARK_CAPTURE(BM_Make, YV12, HalPixelFormat::YV12);
BENCHMARK_CAPTURE(BM_Make, RAW10, HalPixelFormat::RAW10);
BENCHMARK_CAPTURE(BM_Make, YCBCR_420_SP_M_SBWC, HalPixelFormat::YCBCR_420_SP_M_SBWC);
BENCHMARK_CAPTURE(BM_Make, YCBCR_420_888_AFBC_EXTRAWIDEBLK,
                  HalPixelFormat::YCBCR_420_888_AFBC_EXTRAWIDEBLK);

void BM_ConformsTo(benchmark::State& state, bool verbose) {
  const ImageFormat format = *ImageFormat::Make(4000, 3000, HalPixelFormat::YCBCR_420_888);
  for (auto _ : state) {
    auto status = format.ConformsTo(HalPixelFormat::YCBCR_420_888, verbose);
    benchmark::DoNotOptimize(status);
  }
}
BENCHMARK_CAPTURE(BM_ConformsTo, Quiet, false);
BENCHMARK_CAPTURE(BM_ConformsTo, Verbose, true);

// A failing verbose check composes its message.
void BM_ConformsToFailingVerbose(benchmark::State& state) {
  const ImageFormat format = *ImageFormat::Make(1000, 8, HalPixelFormat::YCBCR_420_888);
  for (auto _ : state) {
    auto status = format.ConformsTo(HalPixelFormat::YCBCR_420_888_STRIDE_ALIGNED_64, true);
    benchmark::DoNotOptimize(status);
  }
}
BENCHMARK(BM_ConformsToFailingVerbose);

}  // namespace
BENCHMARK_MAIN();
