#include "orvex/api/thread/fence.h"

#include <atomic>
#include <chrono>
#include <memory>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "absl/time/clock.h"
#include "absl/time/time.h"
#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/api/debug/perf_trace.h"
#include "orvex/api/debug/testing/trace_recording.h"
#include "orvex/api/thread/fence_testing.h"
#include "orvex/api/thread/merged_fence.h"
#include "orvex/api/thread/two_stage_software_fence.h"
#include "orvex/status/status_matchers.h"

namespace orvex {
namespace {

using ::orvex::testing::BlockedWaiter;
using ::orvex::testing::Done;
using ::orvex::testing::ExpectDonePromptly;
using ::orvex::testing::NotDone;
using ::orvex::testing::StatusIs;
using ::testing::ElementsAre;

const Status kE1 = DataLossError("e1");

// Completes a software or two-stage fence with `status`.
void Complete(Fence& fence, const Status& status) {
  if (auto* software = dynamic_cast<SoftwareFence*>(&fence)) return software->Signal(status);
  auto& two_stage = dynamic_cast<TwoStageSoftwareFence&>(fence);
  ASSERT_TRUE(two_stage.SignalReadyToStart(OkStatus()).ok());
  EXPECT_TRUE(two_stage.SignalDone(status).ok());
}

TEST(FenceTest, DummyAndBaseFences) {
  DummyFence dummy;
  dummy.Abort();
  EXPECT_TRUE(Done(dummy.WaitForDone(absl::Milliseconds(-5))).ok());
  std::thread::id called_on;
  ASSERT_TRUE(dummy.AddListener([&](Status) { called_on = std::this_thread::get_id(); }).ok());
  EXPECT_EQ(called_on, std::this_thread::get_id());
  EXPECT_NE(dynamic_cast<DummyFence*>(CreateFence(FenceType::kDummy).get()), nullptr);

  testing::RecordingFence plain;
  EXPECT_THAT(plain.AddListener([&](Status) { ADD_FAILURE(); }),
              StatusIs(StatusCode::kUnimplemented,
                       "Fence::AddListener is unimplemented by design. Specific fence "
                       "implementations must provide their own implementation of AddListener "
                       "if needed."));
}

TEST(SoftwareFenceTest, SignalsListenersAndReset) {
  EXPECT_EQ(SoftwareFence().name(), "unnamed");
  SoftwareFence fence("frame");
  EXPECT_THAT(fence.GetStatus(),
              StatusIs(StatusCode::kUnavailable, "Fence not yet (fully) signalled."));
  EXPECT_TRUE(NotDone(fence.WaitForDone(absl::Milliseconds(2))));
  std::vector<std::string> calls;
  const auto first = [&](Status s) {
    calls.push_back("first " + s.ToString());
    // No lock is held: the listener may use the fence.
    (void)fence.AddListener([&](Status) { calls.push_back("nested"); });
  };
  ASSERT_TRUE(fence.AddListener(first).ok());
  ASSERT_TRUE(fence.AddListener(nullptr).ok());  // a listener without target is skipped
  ASSERT_TRUE(fence.AddListener([&](Status) { calls.push_back("second"); }).ok());
  std::thread signaller([&] {
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
    fence.Signal(kE1);
  });
  EXPECT_EQ(Done(fence.WaitForDone(absl::Seconds(30))), kE1);
  signaller.join();
  fence.Signal(OkStatus());  // the last signal wins and calls no listener
  EXPECT_TRUE(Done(fence.WaitForDone(absl::ZeroDuration())).ok());
  fence.Abort();
  ASSERT_TRUE(fence.AddListener([&](Status s) { calls.push_back("late " + s.ToString()); }).ok());
  EXPECT_THAT(calls, ElementsAre("first " + kE1.ToString(), "nested", "second",
                                 "late ABORTED: Fence was aborted"));

  auto token = std::make_shared<int>(0);
  fence.Reset("again");
  ASSERT_TRUE(fence.AddListener([token](Status) { ADD_FAILURE(); }).ok());
  fence.Reset("third");  // drops the listener uncalled
  EXPECT_EQ(token.use_count(), 1);
  EXPECT_EQ(fence.name(), "third");
  EXPECT_TRUE(NotDone(fence.WaitForDone(absl::ZeroDuration())));
}

// Waits that begin after the signal return at once: a listener's own, and
// another thread's while a listener still runs. A waiter blocked before the
// signal wakes only after the listeners.
TEST(FenceKindsTest, WaitsBegunAfterTheSignalReturnAtOnce) {
  for (FenceType type : {FenceType::kSoftware, FenceType::kTwoStageSoftware}) {
    SCOPED_TRACE(static_cast<int>(type));
    std::unique_ptr<Fence> fence = CreateFence(type);
    auto* two_stage = dynamic_cast<TwoStageSoftwareFence*>(fence.get());
    std::atomic<bool> in_listener{false}, release{false}, listener_done{false};
    const auto listener = [&](Status) {
      EXPECT_EQ(Done(fence->WaitForDone(absl::InfiniteDuration())), kE1);
      ExpectDonePromptly(*fence, kE1);
      EXPECT_TRUE(two_stage == nullptr ||
                  two_stage->WaitUntilReadyToStart(absl::InfiniteDuration()).ok());
      in_listener = true;
      while (!release) std::this_thread::yield();
      listener_done = true;
    };
    ASSERT_TRUE(fence->AddListener(listener).ok());
    BlockedWaiter blocked([&] {
      EXPECT_EQ(Done(fence->WaitForDone(absl::Seconds(30))), kE1);
      EXPECT_TRUE(listener_done);
    });
    std::thread signaller([&] { Complete(*fence, kE1); });
    while (!in_listener) std::this_thread::yield();
    ExpectDonePromptly(*fence, kE1);
    release = true;
    signaller.join();
  }
}

// A listener that throws: the others still run, blocked waiters wake, later
// waits see the status, and the first exception reaches the signaller.
TEST(FenceKindsTest, ThrowingListenersLeaveTheFenceConsistent) {
  for (FenceType type : {FenceType::kSoftware, FenceType::kTwoStageSoftware}) {
    SCOPED_TRACE(static_cast<int>(type));
    std::unique_ptr<Fence> fence = CreateFence(type);
    std::vector<std::string> calls;
    ASSERT_TRUE(fence->AddListener([&](Status) { throw std::runtime_error("first"); }).ok());
    ASSERT_TRUE(fence->AddListener([&](Status) { throw std::logic_error("second"); }).ok());
    ASSERT_TRUE(fence->AddListener([&](Status s) { calls.push_back(s.ToString()); }).ok());
    {
      BlockedWaiter blocked([&] { ExpectDonePromptly(*fence, kE1); });
      EXPECT_THROW(Complete(*fence, kE1), std::runtime_error);
    }
    EXPECT_THAT(calls, ElementsAre(kE1.ToString()));
    ExpectDonePromptly(*fence, kE1);
  }
}

TEST(SoftwareFenceTest, DestructionWaitsForASignalStillCallingListeners) {
  auto fence = std::make_unique<SoftwareFence>();
  std::atomic<bool> listener_done{false};
  const auto listener = [&](Status) {
    std::this_thread::sleep_for(std::chrono::milliseconds(20));
    listener_done = true;
  };
  ASSERT_TRUE(fence->AddListener(listener).ok());
  std::thread signaller([&] { fence->Signal(OkStatus()); });
  while (!fence->GetStatus().ok()) std::this_thread::yield();  // a poll sees the signal early
  fence.reset();
  EXPECT_TRUE(listener_done);
  signaller.join();
}

TEST(FenceDeathTest, ContractViolations) {
  EXPECT_DEATH(CreateFence(FenceType::kDefault),
               "Should not reach here. Allocator must substsitute a proper type for kDefault "
               "before calling this function.");
  EXPECT_DEATH(
      {
        // Deleted by the listener of a fence that its own listener signals.
        auto* doomed = new SoftwareFence("doomed");
        SoftwareFence other;
        (void)other.AddListener([doomed](Status) { delete doomed; });
        (void)doomed->AddListener([&other](Status) { other.Signal(OkStatus()); });
        doomed->Signal(OkStatus());
      },
      "SoftwareFence \"doomed\" destroyed by one of its own listeners while being signalled");
}

TEST(FenceTraceTest, EachWaitOpensOneLevelFiveSection) {
  SoftwareFence software;
  TwoStageSoftwareFence two_stage;
  const auto wait_all = [&] {
    (void)software.WaitForDone(absl::ZeroDuration());
    (void)WaitForMultipleFencesDone(std::vector<Fence*>{&software}, absl::Microseconds(1));
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
  EXPECT_THAT(
      recording.Stop(),
      ElementsAre("B SoftwareFence WaitForDone" + me, "E" + me, "B SoftwareFence WaitForDone" + me,
                  "E" + me, "B TwoStageSoftwareFence WaitForDone" + me, "E" + me,
                  "B TwoStageSoftwareFence WaitUntilReadyToStart" + me, "E" + me,
                  "B TwoStageSoftwareFence WaitUntilReadyToStartOrForfeit" + me, "E" + me));
}

// Many threads signal, wait, poll and add listeners on one fence per round.
TEST(SoftwareFenceStressTest, ListenersRunOnceAndWaitsEnd) {
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
