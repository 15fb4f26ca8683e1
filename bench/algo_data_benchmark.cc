// Per-frame costs of the algorithm data types.

#include <vector>

#include "benchmark/benchmark.h"
#include "orvex/api/algo/data_types/local_tone_mapping_data_v1.h"

namespace {

void BM_GlobalToneMap(benchmark::State& state) {
  auto data = orvex::HeapAllocateLocalToneMappingDataV1().value();
  data->SetIdentity();
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
