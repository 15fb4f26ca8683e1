// Our Status and StatusOr beside absl::Status and absl::StatusOr in one
// binary, so the figures compare within one run.

#include <string>

#include "absl/status/status.h"
#include "absl/status/statusor.h"
#include "benchmark/benchmark.h"
#include "orvex/status/status.h"
#include "orvex/status/statusor.h"

namespace {

constexpr char kMessage[] = "buffer size mismatch";  // 20 characters

void BM_Orvex_OkConstruct(benchmark::State& state) {
  for (auto _ : state) {
    orvex::Status s;
    benchmark::DoNotOptimize(s);
  }
}
BENCHMARK(BM_Orvex_OkConstruct);
void BM_Absl_OkConstruct(benchmark::State& state) {
  for (auto _ : state) {
    absl::Status s;
    benchmark::DoNotOptimize(s);
  }
}
BENCHMARK(BM_Absl_OkConstruct);

void BM_Orvex_ErrorNoMessage(benchmark::State& state) {
  for (auto _ : state) {
    orvex::Status s = orvex::NotFoundError("");
    benchmark::DoNotOptimize(s);
  }
}
BENCHMARK(BM_Orvex_ErrorNoMessage);
void BM_Absl_ErrorNoMessage(benchmark::State& state) {
  for (auto _ : state) {
    absl::Status s = absl::NotFoundError("");
    benchmark::DoNotOptimize(s);
  }
}
BENCHMARK(BM_Absl_ErrorNoMessage);

void BM_Orvex_ErrorWithMessage(benchmark::State& state) {
  for (auto _ : state) {
    orvex::Status s = orvex::NotFoundError(kMessage);
    benchmark::DoNotOptimize(s);
  }
}
BENCHMARK(BM_Orvex_ErrorWithMessage);
void BM_Absl_ErrorWithMessage(benchmark::State& state) {
  for (auto _ : state) {
    absl::Status s = absl::NotFoundError(kMessage);
    benchmark::DoNotOptimize(s);
  }
}
BENCHMARK(BM_Absl_ErrorWithMessage);

void BM_Orvex_CopyError(benchmark::State& state) {
  const orvex::Status source = orvex::NotFoundError(kMessage);
  for (auto _ : state) {
    orvex::Status s = source;
    benchmark::DoNotOptimize(s);
  }
}
BENCHMARK(BM_Orvex_CopyError);
void BM_Absl_CopyError(benchmark::State& state) {
  const absl::Status source = absl::NotFoundError(kMessage);
  for (auto _ : state) {
    absl::Status s = source;
    benchmark::DoNotOptimize(s);
  }
}
BENCHMARK(BM_Absl_CopyError);

void BM_Orvex_Ok(benchmark::State& state) {
  orvex::Status s = orvex::NotFoundError(kMessage);
  for (auto _ : state) {
    benchmark::DoNotOptimize(s);
    benchmark::DoNotOptimize(s.ok());
  }
}
BENCHMARK(BM_Orvex_Ok);
void BM_Absl_Ok(benchmark::State& state) {
  absl::Status s = absl::NotFoundError(kMessage);
  for (auto _ : state) {
    benchmark::DoNotOptimize(s);
    benchmark::DoNotOptimize(s.ok());
  }
}
BENCHMARK(BM_Absl_Ok);

void BM_Orvex_ToString(benchmark::State& state) {
  const orvex::Status s = orvex::NotFoundError(kMessage);
  for (auto _ : state) benchmark::DoNotOptimize(s.ToString());
}
BENCHMARK(BM_Orvex_ToString);
void BM_Absl_ToString(benchmark::State& state) {
  const absl::Status s = absl::NotFoundError(kMessage);
  for (auto _ : state) benchmark::DoNotOptimize(s.ToString());
}
BENCHMARK(BM_Absl_ToString);

void BM_Orvex_StatusOrFromValue(benchmark::State& state) {
  int v = 42;
  for (auto _ : state) {
    benchmark::DoNotOptimize(v);
    orvex::StatusOr<int> s = v;
    benchmark::DoNotOptimize(s);
  }
}
BENCHMARK(BM_Orvex_StatusOrFromValue);
void BM_Absl_StatusOrFromValue(benchmark::State& state) {
  int v = 42;
  for (auto _ : state) {
    benchmark::DoNotOptimize(v);
    absl::StatusOr<int> s = v;
    benchmark::DoNotOptimize(s);
  }
}
BENCHMARK(BM_Absl_StatusOrFromValue);

void BM_Orvex_StatusOrFromError(benchmark::State& state) {
  for (auto _ : state) {
    orvex::StatusOr<int> s = orvex::NotFoundError(kMessage);
    benchmark::DoNotOptimize(s);
  }
}
BENCHMARK(BM_Orvex_StatusOrFromError);
void BM_Absl_StatusOrFromError(benchmark::State& state) {
  for (auto _ : state) {
    absl::StatusOr<int> s = absl::NotFoundError(kMessage);
    benchmark::DoNotOptimize(s);
  }
}
BENCHMARK(BM_Absl_StatusOrFromError);

}  // namespace

BENCHMARK_MAIN();
