// Our fences beside their peers in one binary, so the figures compare within
// one run.
//
// Ping-pong: the timed thread signals "ping", a worker thread wakes and
// signals "pong" back, the timed thread wakes: one iteration is one round
// trip. Each side alternates between two slots per direction and renews a
// slot (Reset, or a new object) once both threads are done with it:
//   SoftwareFence          reset between rounds (Reset);
//   TwoStageSoftwareFence  new fence per round (SignalReadyToStart + SignalDone,
//                          WaitForDone);
//   CondVarFlag            a bare mutex + condition variable + flag;
//   Future                 new std::promise / std::future pair per round;
//   Notification           new absl::Notification per round.

#include <atomic>
#include <condition_variable>
#include <future>
#include <mutex>
#include <optional>
#include <thread>
#include <vector>

#include "absl/synchronization/notification.h"
#include "absl/time/time.h"
#include "benchmark/benchmark.h"
#include "orvex/api/thread/fence.h"
#include "orvex/api/thread/merged_fence.h"
#include "orvex/api/thread/two_stage_software_fence.h"

namespace {

struct SoftwareFenceKind {
  using Slot = orvex::SoftwareFence;
  static void Signal(Slot& s) { s.Signal(orvex::OkStatus()); }
  static void Wait(Slot& s) { benchmark::DoNotOptimize(s.WaitForDone(absl::InfiniteDuration())); }
  static void Renew(Slot& s) { s.Reset(""); }
};

struct TwoStageKind {
  using Slot = std::optional<orvex::TwoStageSoftwareFence>;
  static void Signal(Slot& s) {
    benchmark::DoNotOptimize(s->SignalReadyToStart(orvex::OkStatus()));
    benchmark::DoNotOptimize(s->SignalDone(orvex::OkStatus()));
  }
  static void Wait(Slot& s) { benchmark::DoNotOptimize(s->WaitForDone(absl::InfiniteDuration())); }
  static void Renew(Slot& s) { s.emplace(); }
};

struct CondVarFlag {
  std::mutex mutex;
  std::condition_variable cond;
  bool set = false;
};
struct CondVarKind {
  using Slot = CondVarFlag;
  static void Signal(Slot& s) {
    {
      std::lock_guard<std::mutex> lock(s.mutex);
      s.set = true;
    }
    s.cond.notify_all();
  }
  static void Wait(Slot& s) {
    std::unique_lock<std::mutex> lock(s.mutex);
    s.cond.wait(lock, [&] { return s.set; });
  }
  static void Renew(Slot& s) {
    std::lock_guard<std::mutex> lock(s.mutex);
    s.set = false;
  }
};

struct PromisePair {
  std::promise<void> promise;
  std::future<void> future = promise.get_future();
};
struct FutureKind {
  using Slot = std::optional<PromisePair>;
  static void Signal(Slot& s) { s->promise.set_value(); }
  static void Wait(Slot& s) { s->future.wait(); }
  static void Renew(Slot& s) { s.emplace(); }
};

struct NotificationKind {
  using Slot = std::optional<absl::Notification>;
  static void Signal(Slot& s) { s->Notify(); }
  static void Wait(Slot& s) { s->WaitForNotification(); }
  static void Renew(Slot& s) { s.emplace(); }
};

template <typename Kind>
void BM_PingPong(benchmark::State& state) {
  typename Kind::Slot ping[2], pong[2];
  for (int i = 0; i < 2; ++i) {
    Kind::Renew(ping[i]);
    Kind::Renew(pong[i]);
  }
  std::atomic<bool> stop{false};
  std::thread worker([&] {
    for (uint64_t round = 0;; ++round) {
      const int slot = static_cast<int>(round & 1);
      Kind::Wait(ping[slot]);
      if (stop.load(std::memory_order_acquire)) return;
      // Both threads are done with last round's pong.
      if (round > 0) Kind::Renew(pong[slot ^ 1]);
      Kind::Signal(pong[slot]);
    }
  });
  uint64_t round = 0;
  for (auto _ : state) {
    const int slot = static_cast<int>(round & 1);
    if (round > 0) Kind::Renew(ping[slot ^ 1]);
    Kind::Signal(ping[slot]);
    Kind::Wait(pong[slot]);
    ++round;
  }
  const int slot = static_cast<int>(round & 1);
  if (round > 0) Kind::Renew(ping[slot ^ 1]);
  stop.store(true, std::memory_order_release);
  Kind::Signal(ping[slot]);
  worker.join();
}
BENCHMARK_TEMPLATE(BM_PingPong, CondVarKind)->UseRealTime();
BENCHMARK_TEMPLATE(BM_PingPong, SoftwareFenceKind)->UseRealTime();
BENCHMARK_TEMPLATE(BM_PingPong, TwoStageKind)->UseRealTime();
BENCHMARK_TEMPLATE(BM_PingPong, FutureKind)->UseRealTime();
BENCHMARK_TEMPLATE(BM_PingPong, NotificationKind)->UseRealTime();

// Single-thread costs.

void BM_SoftwareFence_PollDone(benchmark::State& state) {
  orvex::SoftwareFence fence;
  fence.Signal(orvex::OkStatus());
  for (auto _ : state) benchmark::DoNotOptimize(fence.WaitForDone(absl::ZeroDuration()));
}
BENCHMARK(BM_SoftwareFence_PollDone);

void BM_CondVarFlag_PollSet(benchmark::State& state) {
  CondVarFlag flag;
  flag.set = true;
  for (auto _ : state) {
    std::lock_guard<std::mutex> lock(flag.mutex);
    benchmark::DoNotOptimize(flag.set);
  }
}
BENCHMARK(BM_CondVarFlag_PollSet);

void BM_SoftwareFence_AddListenerDone(benchmark::State& state) {
  orvex::SoftwareFence fence;
  fence.Signal(orvex::OkStatus());
  int calls = 0;
  for (auto _ : state) {
    benchmark::DoNotOptimize(fence.AddListener([&calls](orvex::Status) { ++calls; }));
  }
  benchmark::DoNotOptimize(calls);
}
BENCHMARK(BM_SoftwareFence_AddListenerDone);

// Neither a waiter nor a listener: no system call is needed.
void BM_SoftwareFence_SignalUnwatched(benchmark::State& state) {
  orvex::SoftwareFence fence;
  for (auto _ : state) fence.Signal(orvex::OkStatus());
}
BENCHMARK(BM_SoftwareFence_SignalUnwatched);

void BM_CondVarFlag_SignalUnwatched(benchmark::State& state) {
  CondVarFlag flag;
  for (auto _ : state) CondVarKind::Signal(flag);
}
BENCHMARK(BM_CondVarFlag_SignalUnwatched);

void BM_MergedFence_WaitForDone8Done(benchmark::State& state) {
  std::vector<orvex::SoftwareFence> fences(8);
  std::vector<orvex::Fence*> pointers;
  for (orvex::SoftwareFence& f : fences) {
    f.Signal(orvex::OkStatus());
    pointers.push_back(&f);
  }
  auto merged = orvex::MergeFences(pointers);
  for (auto _ : state) benchmark::DoNotOptimize(merged->WaitForDone(absl::Milliseconds(10)));
}
BENCHMARK(BM_MergedFence_WaitForDone8Done);

}  // namespace

BENCHMARK_MAIN();
