#include "orvex/api/thread/fence.h"

#include <atomic>
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

namespace orvex {
namespace {

using ::orvex::testing::BlockedWaiter;
using ::orvex::testing::Done;
using ::orvex::testing::ExpectDonePromptly;
using ::orvex::testing::NotDone;
using ::testing::ElementsAre;

const Status kE1 = DataLossError("e1"), kE2 = CancelledError("e2");

TEST(FenceTest, BaseAddListenerRefuses) {
  EXPECT_EQ(testing::RecordingFence().AddListener([](Status) { ADD_FAILURE(); }).ToString(),
            "UNIMPLEMENTED: Fence::AddListener is unimplemented by design. Specific fence "
            "implementations must provide their own implementation of AddListener if needed.");
}

TEST(SoftwareFenceTest, SignalsListenersAndReset) {
  SoftwareFence fence("frame");
  EXPECT_EQ(fence.GetStatus().ToString(), "UNAVAILABLE: Fence not yet (fully) signalled.");
  std::vector<std::string> calls;
  const auto record = [&](Status s) { calls.push_back(s.ToString()); };
  ASSERT_TRUE(fence.AddListener(record).ok());
  ASSERT_TRUE(fence.AddListener(nullptr).ok());  // a listener without target is skipped
  ASSERT_TRUE(fence.AddListener([&](Status) { calls.push_back("second"); }).ok());
  fence.Signal(kE1);
  fence.Signal(OkStatus());  // the last signal wins and calls no listener
  EXPECT_TRUE(Done(fence.WaitForDone(absl::ZeroDuration())).ok());
  fence.Abort();
  ASSERT_TRUE(fence.AddListener(record).ok());
  EXPECT_THAT(calls, ElementsAre(kE1.ToString(), "second", "ABORTED: Fence was aborted"));
  fence.Reset("again");
  EXPECT_TRUE(NotDone(fence.WaitForDone(absl::ZeroDuration())));
  auto token = std::make_shared<int>(0);
  ASSERT_TRUE(fence.AddListener([token](Status) { ADD_FAILURE(); }).ok());
  fence.Reset("third");  // drops the listener uncalled
  EXPECT_EQ(token.use_count(), 1);
}

// Late waits return at once; blocked ones wait for all listeners or see the status at timeout.
TEST(FenceKindsTest, WaitsBegunAfterTheSignalReturnAtOnce) {
  for (FenceType type : {FenceType::kSoftware, FenceType::kTwoStageSoftware}) {
    SCOPED_TRACE(static_cast<int>(type));
    std::unique_ptr<Fence> fence = CreateFence(type);
    auto* software = dynamic_cast<SoftwareFence*>(fence.get());
    auto* two_stage = dynamic_cast<TwoStageSoftwareFence*>(fence.get());
    ASSERT_TRUE(software != nullptr || two_stage->SignalReadyToStart(OkStatus()).ok());
    std::atomic<bool> in_listener{false}, release{false}, listener_done{false}, timed_out{false};
    const auto listener = [&](Status) {
      EXPECT_EQ(Done(fence->WaitForDone(absl::InfiniteDuration())), kE1);
      ExpectDonePromptly(*fence, kE1);
      EXPECT_TRUE(software || two_stage->WaitUntilReadyToStart(absl::InfiniteDuration()).ok());
      in_listener = true;
      while (!release) std::this_thread::yield();
      EXPECT_TRUE(software ? (software->Signal(kE2), true) : two_stage->SignalDone(kE2).ok());
      absl::SleepFor(absl::Milliseconds(20)), listener_done = true;
    };
    ASSERT_TRUE(fence->AddListener([](Status) { throw std::runtime_error("first"); }).ok());
    ASSERT_TRUE(fence->AddListener(listener).ok());
    ASSERT_TRUE(fence->AddListener([](Status) { throw std::logic_error("second"); }).ok());
    BlockedWaiter blocked([&] {
      EXPECT_EQ(Done(fence->WaitForDone(absl::Seconds(30))), kE2);
      EXPECT_TRUE(listener_done);
    });
    BlockedWaiter timed([&] {  // its deadline passes while a listener runs
      EXPECT_EQ(Done(fence->WaitForDone(absl::Milliseconds(500))), kE1);
      timed_out = true;
    });
    std::thread signaller([&] {
      EXPECT_THROW(software ? software->Signal(kE1) : (void)two_stage->SignalDone(kE1),
                   std::runtime_error);
    });
    while (!in_listener) std::this_thread::yield();
    ExpectDonePromptly(*fence, kE1);
    while (!timed_out) std::this_thread::yield();
    release = true;
    signaller.join();
  }
}

TEST(SoftwareFenceTest, DestructionWaitsForASignalStillCallingListeners) {
  auto fence = std::make_unique<SoftwareFence>();
  std::atomic<bool> listener_done{false};
  const auto slow = [&](Status) { absl::SleepFor(absl::Milliseconds(20)), listener_done = true; };
  ASSERT_TRUE(fence->AddListener(slow).ok());
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
      {  // deleted by a listener of a fence that doomed's own listener signals
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
  testing::TraceRecording recording;
  for (int level : {4, 5}) {
    PerfTrace::trace_level_ = level;
    (void)software.WaitForDone(absl::ZeroDuration());
    (void)WaitForMultipleFencesDone(std::vector<Fence*>{&software}, absl::Microseconds(1));
    (void)two_stage.WaitForDone(absl::ZeroDuration());
    (void)two_stage.WaitUntilReadyToStart(absl::ZeroDuration());
    (void)two_stage.WaitUntilReadyToStartOrForfeit(absl::ZeroDuration(), CancelledError("x"));
  }
  PerfTrace::trace_level_ = 0;
  const std::string me = " @" + std::to_string(testing::CurrentTid());
  EXPECT_THAT(
      recording.Stop(),
      ElementsAre("B SoftwareFence WaitForDone" + me, "E" + me, "B SoftwareFence WaitForDone" + me,
                  "E" + me, "B TwoStageSoftwareFence WaitForDone" + me, "E" + me,
                  "B TwoStageSoftwareFence WaitUntilReadyToStart" + me, "E" + me,
                  "B TwoStageSoftwareFence WaitUntilReadyToStartOrForfeit" + me, "E" + me));
}

// Threads signal, abort, wait, poll and add listeners on one fence per round.
TEST(SoftwareFenceStressTest, ListenersRunOnceAndWaitsEnd) {
  const absl::Time end = absl::Now() + absl::Seconds(2);
  for (int round = 0; round < 2000 && absl::Now() < end; ++round) {
    SoftwareFence fence;
    std::atomic<int> calls{0};
    const auto add = [&] { EXPECT_TRUE(fence.AddListener([&](Status) { ++calls; }).ok()); };
    add(), add(), add();
    const auto waiter = [&](absl::Duration timeout) {  // polls until done
      while (NotDone(fence.WaitForDone(timeout)) && timeout <= absl::ZeroDuration())
        std::this_thread::yield();
    };
    std::thread threads[] = {std::thread(waiter, absl::InfiniteDuration()),
                             std::thread(waiter, absl::Microseconds(300)),
                             std::thread(waiter, absl::ZeroDuration()),
                             std::thread([&] { add(), add(), add(), add(); }),
                             std::thread([&] { fence.Signal(OkStatus()); }),
                             std::thread([&] { fence.Abort(); })};
    for (std::thread& t : threads) t.join();
    ASSERT_EQ(calls.load(), 7);
  }
}

}  // namespace
}  // namespace orvex
