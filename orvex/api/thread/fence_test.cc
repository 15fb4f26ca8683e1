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

bool NotDone(const FenceWaitResult& r) {
  return std::holds_alternative<orvex_api::FenceNotDone>(r);
}
Status Done(const FenceWaitResult& r) {
  return NotDone(r) ? InternalError("not done") : std::get<Status>(r);
}

// A fence that keeps the base AddListener.
class PlainFence : public Fence {
 public:
  FenceWaitResult WaitForDone(absl::Duration) const override { return OkStatus(); }
  void Abort() override {}
};

TEST(FenceTest, DummyAndBaseBehaviour) {
  DummyFence dummy;
  EXPECT_TRUE(Done(dummy.WaitForDone(absl::Milliseconds(-5))).ok());
  dummy.Abort();
  EXPECT_TRUE(dummy.GetStatus().ok());
  std::thread::id called_on;
  ASSERT_TRUE(dummy.AddListener([&](Status) { called_on = std::this_thread::get_id(); }).ok());
  EXPECT_EQ(called_on, std::this_thread::get_id());

  PlainFence plain;
  EXPECT_THAT(plain.AddListener([&](Status) { ADD_FAILURE(); }),
              StatusIs(StatusCode::kUnimplemented,
                       "Fence::AddListener is unimplemented by design. Specific fence "
                       "implementations must provide their own implementation of AddListener "
                       "if needed."));
}

TEST(FenceTest, CreateFenceMakesEachKind) {
  EXPECT_NE(dynamic_cast<DummyFence*>(CreateFence(FenceType::kDummy).get()), nullptr);
  std::unique_ptr<Fence> software = CreateFence(FenceType::kSoftware);
  ASSERT_NE(dynamic_cast<SoftwareFence*>(software.get()), nullptr);
  EXPECT_EQ(static_cast<SoftwareFence*>(software.get())->name(), "unnamed");
  std::unique_ptr<Fence> two_stage = CreateFence(FenceType::kTwoStageSoftware);
  ASSERT_NE(dynamic_cast<TwoStageSoftwareFence*>(two_stage.get()), nullptr);
  EXPECT_TRUE(NotDone(two_stage->WaitForDone(absl::ZeroDuration())));
  EXPECT_DEATH(CreateFence(FenceType::kDefault),
               "Should not reach here. Allocator must substsitute a proper type for kDefault "
               "before calling this function.");
}

TEST(SoftwareFenceTest, StatusBeforeAndAfterSignals) {
  SoftwareFence fence("frame");
  EXPECT_THAT(fence.GetStatus(),
              StatusIs(StatusCode::kUnavailable, "Fence not yet (fully) signalled."));
  EXPECT_TRUE(NotDone(fence.WaitForDone(absl::Milliseconds(2))));
  std::thread signaller([&] {
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
    fence.Signal(DataLossError("bad frame"));
  });
  EXPECT_THAT(Done(fence.WaitForDone(absl::Seconds(30))), StatusIs(StatusCode::kDataLoss));
  signaller.join();
  EXPECT_EQ(Done(fence.WaitForDone(absl::ZeroDuration())), DataLossError("bad frame"));
  fence.Signal(OkStatus());  // the last signal wins
  EXPECT_TRUE(Done(fence.WaitForDone(absl::InfiniteDuration())).ok());
  fence.Abort();
  EXPECT_THAT(fence.GetStatus(), StatusIs(StatusCode::kAborted, "Fence was aborted"));
}

TEST(SoftwareFenceTest, ListenersRunOnceInOrderOutsideTheLock) {
  SoftwareFence fence;
  std::vector<std::string> calls;
  ASSERT_TRUE(fence
                  .AddListener([&](Status s) {
                    calls.push_back("first " + s.ToString());
                    // No lock is held: the listener may use the fence.
                    EXPECT_FALSE(fence.GetStatus().ok());
                    (void)fence.AddListener([&](Status) { calls.push_back("nested"); });
                  })
                  .ok());
  ASSERT_TRUE(fence.AddListener(nullptr).ok());  // a listener without target is skipped
  ASSERT_TRUE(fence.AddListener([&](Status) { calls.push_back("second"); }).ok());
  std::thread([&] { fence.Abort(); }).join();
  fence.Signal(OkStatus());  // calls no listener
  ASSERT_TRUE(fence.AddListener([&](Status s) { calls.push_back("late " + s.ToString()); }).ok());
  EXPECT_THAT(calls,
              ElementsAre("first ABORTED: Fence was aborted", "nested", "second", "late OK"));
}

TEST(SoftwareFenceTest, ResetDropsListenersWithoutCallingThem) {
  SoftwareFence fence;
  auto token = std::make_shared<int>(0);
  ASSERT_TRUE(fence.AddListener([token](Status) { ADD_FAILURE(); }).ok());
  fence.Reset("again");
  EXPECT_EQ(token.use_count(), 1);
  EXPECT_EQ(fence.name(), "again");
  EXPECT_TRUE(NotDone(fence.WaitForDone(absl::ZeroDuration())));
  fence.Signal(OkStatus());
  fence.Reset("third");
  EXPECT_TRUE(NotDone(fence.WaitForDone(absl::ZeroDuration())));
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
  while (!fence->GetStatus().ok()) std::this_thread::yield();  // a poll sees the signal early
  fence.reset();
  EXPECT_TRUE(listener_done);
  signaller.join();

  EXPECT_DEATH(
      {
        auto* doomed = new SoftwareFence("doomed");
        (void)doomed->AddListener([doomed](Status) { delete doomed; });
        doomed->Signal(OkStatus());
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
  testing::TraceRecording recording;
  wait_all();  // level 0: nothing
  PerfTrace::trace_level_ = 5;
  wait_all();
  PerfTrace::trace_level_ = 0;
  const std::string me = " @" + std::to_string(testing::CurrentTid());
  EXPECT_THAT(recording.Stop(),
              ElementsAre("B SoftwareFence WaitForDone" + me, "E" + me,
                          "B TwoStageSoftwareFence WaitForDone" + me, "E" + me,
                          "B TwoStageSoftwareFence WaitUntilReadyToStart" + me, "E" + me,
                          "B TwoStageSoftwareFence WaitUntilReadyToStartOrForfeit" + me, "E" + me));
}

// Many threads signal, wait, poll and add listeners on one fence per round.
TEST(SoftwareFenceStressTest, ListenersRunOnceAndBeforeWaitersWake) {
  constexpr int kEarly = 3, kLate = 4;
  const absl::Time end = absl::Now() + absl::Seconds(2);
  for (int round = 0; round < 2000 && absl::Now() < end; ++round) {
    SoftwareFence fence;
    std::atomic<int> early{0}, late{0};
    for (int i = 0; i < kEarly; ++i) ASSERT_TRUE(fence.AddListener([&](Status) { ++early; }).ok());
    std::vector<std::thread> threads;
    for (int i = 0; i < 2; ++i) {
      threads.emplace_back([&] {
        const Status s = Done(fence.WaitForDone(absl::InfiniteDuration()));
        EXPECT_EQ(early.load(), kEarly);
        EXPECT_TRUE(s.ok() || IsAborted(s)) << s;
      });
    }
    threads.emplace_back([&] { (void)fence.WaitForDone(absl::Microseconds(300)); });
    threads.emplace_back([&] {
      while (NotDone(fence.WaitForDone(absl::ZeroDuration()))) std::this_thread::yield();
    });
    threads.emplace_back([&] {
      for (int i = 0; i < kLate; ++i) EXPECT_TRUE(fence.AddListener([&](Status) { ++late; }).ok());
    });
    threads.emplace_back([&] { fence.Signal(OkStatus()); });
    threads.emplace_back([&] { fence.Abort(); });
    for (std::thread& t : threads) t.join();
    ASSERT_EQ(early.load(), kEarly);
    ASSERT_EQ(late.load(), kLate);
  }
}

}  // namespace
}  // namespace orvex
