#include "orvex/api/thread/fence.h"

#include <atomic>
#include <chrono>
#include <memory>
#include <string>
#include <thread>
#include <variant>
#include <vector>

#include "absl/time/clock.h"
#include "absl/time/time.h"
#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/api/debug/perf_trace.h"
#include "orvex/api/debug/testing/trace_recording.h"
#include "orvex/api/thread/two_stage_software_fence.h"
#include "orvex/status/status_matchers.h"

namespace orvex {
namespace {

using ::orvex::testing::StatusIs;
using ::testing::ElementsAre;

bool NotDone(const FenceWaitResult& result) {
  return std::holds_alternative<orvex_api::FenceNotDone>(result);
}
Status Done(const FenceWaitResult& result) {
  EXPECT_FALSE(NotDone(result));
  return NotDone(result) ? InternalError("not done") : std::get<Status>(result);
}

// A fence that keeps the base AddListener.
class PlainFence : public Fence {
 public:
  FenceWaitResult WaitForDone(absl::Duration) const override { return OkStatus(); }
  void Abort() override {}
};

TEST(FenceTest, DummyAndBaseBehaviour) {
  DummyFence dummy;
  for (absl::Duration timeout :
       {absl::ZeroDuration(), absl::Milliseconds(-5), absl::InfiniteDuration()}) {
    EXPECT_TRUE(Done(dummy.WaitForDone(timeout)).ok());
  }
  dummy.Abort();
  EXPECT_TRUE(dummy.GetStatus().ok());
  std::thread::id called_on;
  EXPECT_TRUE(dummy
                  .AddListener([&](Status s) {
                    EXPECT_TRUE(s.ok());
                    called_on = std::this_thread::get_id();
                  })
                  .ok());
  EXPECT_EQ(called_on, std::this_thread::get_id());

  PlainFence plain;
  bool called = false;
  EXPECT_THAT(plain.AddListener([&](Status) { called = true; }),
              StatusIs(StatusCode::kUnimplemented,
                       "Fence::AddListener is unimplemented by design. Specific fence "
                       "implementations must provide their own implementation of AddListener "
                       "if needed."));
  EXPECT_FALSE(called);
}

TEST(FenceTest, CreateFenceMakesEachKind) {
  EXPECT_NE(dynamic_cast<DummyFence*>(CreateFence(FenceType::kDummy).get()), nullptr);
  std::unique_ptr<Fence> software = CreateFence(FenceType::kSoftware);
  ASSERT_NE(dynamic_cast<SoftwareFence*>(software.get()), nullptr);
  EXPECT_EQ(static_cast<SoftwareFence*>(software.get())->name(), "unnamed");
  std::unique_ptr<Fence> two_stage = CreateFence(FenceType::kTwoStageSoftware);
  ASSERT_NE(dynamic_cast<TwoStageSoftwareFence*>(two_stage.get()), nullptr);
  EXPECT_TRUE(NotDone(two_stage->WaitForDone(absl::ZeroDuration())));
}

TEST(FenceDeathTest, CreateFenceRefusesDefault) {
  EXPECT_DEATH(CreateFence(FenceType::kDefault),
               "Should not reach here. Allocator must substsitute a proper type for kDefault "
               "before calling this function.");
}

TEST(SoftwareFenceTest, StatusBeforeAndAfterSignal) {
  SoftwareFence fence("frame");
  EXPECT_EQ(fence.name(), "frame");
  EXPECT_THAT(fence.GetStatus(),
              StatusIs(StatusCode::kUnavailable, "Fence not yet (fully) signalled."));
  EXPECT_TRUE(NotDone(fence.WaitForDone(absl::Milliseconds(2))));
  fence.Signal(DataLossError("bad frame"));
  EXPECT_THAT(Done(fence.WaitForDone(absl::ZeroDuration())),
              StatusIs(StatusCode::kDataLoss, "bad frame"));
  // The last signal wins.
  fence.Signal(OkStatus());
  EXPECT_TRUE(Done(fence.WaitForDone(absl::InfiniteDuration())).ok());
  fence.Abort();
  EXPECT_THAT(fence.GetStatus(), StatusIs(StatusCode::kAborted, "Fence was aborted"));
}

TEST(SoftwareFenceTest, ListenersRunOnceInOrderOnTheRightThread) {
  SoftwareFence fence;
  std::vector<std::string> calls;
  ASSERT_TRUE(fence.AddListener([&](Status s) { calls.push_back("first " + s.ToString()); }).ok());
  ASSERT_TRUE(fence.AddListener(nullptr).ok());  // a listener without target is skipped
  ASSERT_TRUE(fence.AddListener([&](Status) { calls.push_back("second"); }).ok());
  std::thread([&] { fence.Abort(); }).join();
  EXPECT_THAT(calls, ElementsAre("first ABORTED: Fence was aborted", "second"));
  fence.Signal(OkStatus());  // no listener runs again
  ASSERT_TRUE(fence.AddListener([&](Status s) { calls.push_back("late " + s.ToString()); }).ok());
  EXPECT_THAT(calls, ElementsAre("first ABORTED: Fence was aborted", "second", "late OK"));
}

TEST(SoftwareFenceTest, ListenerMayCallBackIntoTheFence) {
  SoftwareFence fence;
  bool inner_called = false;
  ASSERT_TRUE(fence
                  .AddListener([&](Status) {
                    EXPECT_TRUE(fence.GetStatus().ok());
                    EXPECT_TRUE(fence.AddListener([&](Status) { inner_called = true; }).ok());
                  })
                  .ok());
  fence.Signal(OkStatus());
  EXPECT_TRUE(inner_called);
}

TEST(SoftwareFenceTest, ResetDropsListenersWithoutCallingThem) {
  SoftwareFence fence;
  auto token = std::make_shared<int>(0);
  bool called = false;
  ASSERT_TRUE(fence.AddListener([&called, token](Status) { called = true; }).ok());
  EXPECT_EQ(token.use_count(), 2);
  fence.Reset("again");
  EXPECT_EQ(token.use_count(), 1);
  EXPECT_EQ(fence.name(), "again");
  EXPECT_TRUE(NotDone(fence.WaitForDone(absl::ZeroDuration())));
  fence.Signal(OkStatus());
  EXPECT_FALSE(called);
  fence.Reset("third");
  EXPECT_TRUE(NotDone(fence.WaitForDone(absl::ZeroDuration())));
}

TEST(SoftwareFenceTest, TimedWaitIsWokenBySignal) {
  SoftwareFence fence;
  std::thread signaller([&] {
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
    fence.Signal(CancelledError("stop"));
  });
  EXPECT_THAT(Done(fence.WaitForDone(absl::Seconds(30))), StatusIs(StatusCode::kCancelled));
  signaller.join();
}

TEST(SoftwareFenceTest, DestructionWaitsForASignalStillCallingListeners) {
  auto fence = std::make_unique<SoftwareFence>();
  std::atomic<bool> listener_done{false};
  ASSERT_TRUE(fence
                  ->AddListener([&](Status) {
                    std::this_thread::sleep_for(std::chrono::milliseconds(20));
                    listener_done = true;
                  })
                  .ok());
  std::thread signaller([&] { fence->Signal(OkStatus()); });
  // A poll sees the signal while the listener still runs.
  while (!fence->GetStatus().ok()) std::this_thread::yield();
  fence.reset();
  EXPECT_TRUE(listener_done);
  signaller.join();
}

TEST(SoftwareFenceDeathTest, DestroyedByItsOwnListener) {
  EXPECT_DEATH(
      {
        auto* fence = new SoftwareFence("doomed");
        (void)fence->AddListener([fence](Status) { delete fence; });
        fence->Signal(OkStatus());
      },
      "SoftwareFence \"doomed\" destroyed by one of its own listeners while being signalled");
}

TEST(FenceTraceTest, WaitsOpenLevelFiveSections) {
  SoftwareFence software;
  TwoStageSoftwareFence two_stage;
  const auto wait_all = [&] {
    (void)software.WaitForDone(absl::ZeroDuration());
    (void)two_stage.WaitForDone(absl::ZeroDuration());
    (void)two_stage.WaitUntilReadyToStart(absl::ZeroDuration());
    (void)two_stage.WaitUntilReadyToStartOrForfeit(absl::ZeroDuration(), CancelledError("x"));
  };
  std::vector<std::string> names;
  {
    testing::TraceRecording recording;
    wait_all();  // level 0: nothing
    PerfTrace::trace_level_ = 5;
    wait_all();
    PerfTrace::trace_level_ = 0;
    for (const auto& event : recording.Stop()) names.push_back(event.ph + event.name);
  }
  EXPECT_THAT(names,
              ElementsAre("BSoftwareFence WaitForDone", "E", "BTwoStageSoftwareFence WaitForDone",
                          "E", "BTwoStageSoftwareFence WaitUntilReadyToStart", "E",
                          "BTwoStageSoftwareFence WaitUntilReadyToStartOrForfeit", "E"));
}

// Many threads signal, wait, poll and add listeners on one fence per round.
TEST(SoftwareFenceStressTest, ListenersRunOnceAndBeforeWaitersWake) {
  constexpr int kEarlyListeners = 3;
  const absl::Time end = absl::Now() + absl::Seconds(2);
  int rounds = 0;
  for (; rounds < 2000 && absl::Now() < end; ++rounds) {
    SoftwareFence fence;
    std::atomic<int> early{0}, late_added{0}, late_called{0};
    for (int i = 0; i < kEarlyListeners; ++i) {
      ASSERT_TRUE(fence.AddListener([&](Status) { early.fetch_add(1); }).ok());
    }
    std::vector<std::thread> threads;
    for (int i = 0; i < 2; ++i) {
      threads.emplace_back([&] {
        Status s = Done(fence.WaitForDone(absl::InfiniteDuration()));
        EXPECT_EQ(early.load(), kEarlyListeners);
        EXPECT_TRUE(s.ok() || IsAborted(s)) << s;
      });
    }
    threads.emplace_back([&] {
      FenceWaitResult r = fence.WaitForDone(absl::Microseconds(300));
      if (!NotDone(r)) {
        EXPECT_TRUE(std::get<Status>(r).ok() || IsAborted(std::get<Status>(r)));
      }
    });
    threads.emplace_back([&] {
      while (NotDone(fence.WaitForDone(absl::ZeroDuration()))) std::this_thread::yield();
    });
    threads.emplace_back([&] {
      for (int i = 0; i < 4; ++i) {
        late_added.fetch_add(1);
        EXPECT_TRUE(fence.AddListener([&](Status) { late_called.fetch_add(1); }).ok());
      }
    });
    threads.emplace_back([&] { fence.Signal(OkStatus()); });
    threads.emplace_back([&] { fence.Abort(); });
    for (std::thread& t : threads) t.join();
    ASSERT_EQ(early.load(), kEarlyListeners);
    ASSERT_EQ(late_called.load(), late_added.load());
  }
  EXPECT_GT(rounds, 0);
}

}  // namespace
}  // namespace orvex
