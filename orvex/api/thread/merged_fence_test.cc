#include "orvex/api/thread/merged_fence.h"

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
#include "orvex/api/thread/fence.h"
#include "orvex/api/thread/fence_testing.h"
#include "orvex/api/thread/two_stage_software_fence.h"
#include "orvex/status/status_matchers.h"

namespace orvex {
namespace {

using ::orvex::testing::Done;
using ::orvex::testing::RecordingFence;
using ::orvex::testing::StatusIs;
using ::testing::ElementsAre;

const Status kE1 = DataLossError("e1"), kE2 = CancelledError("e2");

// A listener that records the status of each call in `calls`.
FenceListener Recorder(std::vector<std::string>& calls) {
  return [&calls](Status s) { calls.push_back(s.ToString()); };
}

TEST(MergedFenceTest, EmptyAndNullEntriesCountAsDone) {
  for (size_t nulls : {0, 1}) {
    SCOPED_TRACE(nulls);
    auto merged = MergeFences(std::vector<Fence*>(nulls, nullptr));
    EXPECT_TRUE(Done(merged->WaitForDone(absl::ZeroDuration())).ok());
    std::vector<std::string> calls;
    EXPECT_TRUE(merged->AddListener(Recorder(calls)).ok());
    EXPECT_THAT(calls, ElementsAre("OK"));
    merged->Abort();
  }
}

TEST(MergedFenceTest, FirstErrorInFenceOrderWins) {
  SoftwareFence a, b;
  std::unique_ptr<Fence> dummy = CreateFence(FenceType::kDummy);
  auto merged = MergeFences({dummy.get(), &a, &b});
  std::vector<std::string> calls;
  ASSERT_TRUE(merged->AddListener(Recorder(calls)).ok());
  b.Signal(kE2);
  EXPECT_TRUE(calls.empty());
  EXPECT_THAT(merged->GetFenceStatus(), StatusIs(StatusCode::kUnavailable));
  a.Signal(kE1);
  EXPECT_EQ(Done(merged->WaitForDone(absl::Seconds(1))), kE1);
  ASSERT_TRUE(merged->AddListener(Recorder(calls)).ok());  // done: called at once
  EXPECT_THAT(calls, ElementsAre(kE1.ToString(), kE1.ToString()));
}

// Each fence gets one call: the caller's poll or infinite wait, or the time left.
TEST(MergedFenceTest, EachFenceGetsOneWaitWithItsShareOfTheTimeout) {
  const absl::Duration ms = absl::Milliseconds(1), inf = absl::InfiniteDuration();
  SoftwareFence done, pending;
  TwoStageSoftwareFence two_stage_done, two_stage_pending;
  done.Signal(OkStatus());
  ASSERT_TRUE(two_stage_done.SignalDone(kE1).ok());
  const FenceWaitResult ok = OkStatus(), not_done = orvex_api::FenceNotDone{};
  // clang-format off
  const struct {
    absl::Duration timeout; FenceWaitResult result; absl::Duration delay; Fence* pending;
    absl::Duration first_min, second_min, second_max;
  } cases[] = {
      {-3 * ms, ok, ms, nullptr, -3 * ms, -3 * ms, -3 * ms},
      {inf, ok, ms, nullptr, inf, inf, inf},
      {20 * ms, ok, ms, nullptr, 15 * ms, absl::Nanoseconds(1), 19 * ms},
      {20 * ms, ok, 30 * ms, nullptr, 15 * ms, 0 * ms, 0 * ms},  // polled past the deadline
      {20 * ms, not_done, ms, nullptr, 15 * ms, inf, -inf},
      {5 * ms, ok, ms, &pending, 4 * ms, inf, -inf},  // `pending` times out
      {5 * ms, ok, ms, &two_stage_pending, 4 * ms, inf, -inf},
  };
  // clang-format on
  for (const auto& c : cases) {
    SCOPED_TRACE(c.timeout);
    RecordingFence first(c.result, c.delay), second;
    std::vector<Fence*> fences = {&first, c.pending, &done, &two_stage_done, &second};
    const bool reached = c.second_min <= c.second_max;
    EXPECT_EQ(Done(MergeFences(fences)->WaitForDone(c.timeout)),
              reached ? kE1 : InternalError("not done"));
    ASSERT_EQ(first.timeouts.size(), 1u);
    EXPECT_TRUE(first.timeouts[0] >= c.first_min && first.timeouts[0] <= c.timeout);
    ASSERT_EQ(second.timeouts.size(), reached ? 1u : 0u);
    for (absl::Duration t : second.timeouts) EXPECT_TRUE(t >= c.second_min && t <= c.second_max);
  }
}

TEST(MergedFenceTest, RefusedRegistrationIsReturnedAndListenerNeverCalled) {
  SoftwareFence a;
  RecordingFence refusing;
  auto merged = MergeFences({&a, &refusing});
  const auto never = [](Status) { ADD_FAILURE(); };
  EXPECT_THAT(merged->AddListener(never), StatusIs(StatusCode::kUnimplemented));
  a.Signal(OkStatus());
  EXPECT_THAT(merged->AddListener(never), StatusIs(StatusCode::kUnimplemented));
}

// Listeners may own the fences (destroyed after the last signal) and throw.
TEST(MergedFenceTest, ListenersMayOwnTheirFencesAndThrow) {
  for (bool two_stage_last : {false, true}) {
    SCOPED_TRACE(two_stage_last);
    auto software = std::make_shared<SoftwareFence>();
    auto two_stage = std::make_shared<TwoStageSoftwareFence>();
    SoftwareFence* s = software.get();
    TwoStageSoftwareFence* t = two_stage.get();
    std::weak_ptr<SoftwareFence> weak = software;
    std::vector<std::string> calls;
    auto merged = MergeFences({s, t});
    ASSERT_TRUE(merged->AddListener([](Status) { throw std::runtime_error("listener"); }).ok());
    ASSERT_TRUE(merged
                    ->AddListener([&calls, sw = std::move(software), ts = std::move(two_stage)](
                                      Status st) { calls.push_back(st.ToString()); })
                    .ok());
    merged.reset();
    ASSERT_TRUE(t->SignalReadyToStart(OkStatus()).ok());
    if (two_stage_last) s->Signal(kE1);
    EXPECT_TRUE(two_stage_last || t->SignalDone(kE2).ok());
    EXPECT_THROW(two_stage_last ? (void)t->SignalDone(kE2) : s->Signal(kE1), std::runtime_error);
    EXPECT_THAT(calls, ElementsAre(kE1.ToString()));
    EXPECT_TRUE(weak.expired());
  }
}

// Two-stage fences' Abort calls no listener, so the merged one waits on.
TEST(MergedFenceTest, AbortAndTrySignalReachCoveredFences) {
  SoftwareFence s1, s2;
  TwoStageSoftwareFence t1, t2;
  DummyFence dummy;
  for (bool software : {true, false}) {
    auto merged = software ? MergeFences({&s1, &dummy, &s2}) : MergeFences({&t1, &t2});
    std::vector<std::string> calls;
    ASSERT_TRUE(merged->AddListener(Recorder(calls)).ok());
    merged->Abort();
    EXPECT_THAT(merged->GetFenceStatus(), StatusIs(StatusCode::kAborted, "Fence was aborted"));
    EXPECT_EQ(calls, std::vector<std::string>(software, "ABORTED: Fence was aborted"));
  }
  SoftwareFence software, nested_software;
  TwoStageSoftwareFence two_stage;
  ASSERT_TRUE(two_stage.SignalReadyToStart(OkStatus()).ok());
  auto nested = MergeFences({&nested_software});
  MergeFences({nullptr, &software, &two_stage, &dummy, nested.get()})->TrySignal(kE1);
  for (Fence* f : std::vector<Fence*>{&software, &two_stage, &nested_software}) {
    EXPECT_EQ(f->GetStatus(), kE1);
  }
}

TEST(MergedFenceDeathTest, TrySignalOnRefusingTwoStageFenceIsFatal) {
  TwoStageSoftwareFence two_stage;
  EXPECT_DEATH(MergeFences({&two_stage})->TrySignal(OkStatus()),
               "Check failed: two_stage_software_fence->SignalDone\\(status\\) == OkStatus\\(\\) "
               "\\(two_stage_software_fence->SignalDone\\(status\\)=FAILED_PRECONDITION: "
               ".*, OkStatus\\(\\)=OK\\) ");
}

// Racing signals, listeners and waits: done once, with the first error in order.
TEST(MergedFenceStressTest, CompletesOnceWithFirstErrorInOrder) {
  const absl::Time end = absl::Now() + absl::Seconds(2);
  for (int rounds = 0; rounds < 2000 && absl::Now() < end; ++rounds) {
    SoftwareFence fences[4];
    auto merged = MergeFences({&fences[0], &fences[1], &fences[2], &fences[3]});
    std::atomic<int> calls{0}, wrong{0};
    const auto add = [&] {
      EXPECT_TRUE(merged->AddListener([&](Status s) { ++(s == kE1 ? calls : wrong); }).ok());
    };
    std::vector<std::thread> threads;
    for (int i = 0; i < 3; ++i) threads.emplace_back([&] { add(), add(), add(); });
    threads.emplace_back(
        [&] { EXPECT_EQ(Done(merged->WaitForDone(absl::InfiniteDuration())), kE1); });
    for (int i = 0; i < 4; ++i) {
      threads.emplace_back([&, i] { fences[i].Signal(i == 1 ? kE1 : i == 3 ? kE2 : OkStatus()); });
    }
    for (std::thread& t : threads) t.join();
    ASSERT_EQ(calls.load(), 9);
    ASSERT_EQ(wrong.load(), 0);
  }
}

}  // namespace
}  // namespace orvex
