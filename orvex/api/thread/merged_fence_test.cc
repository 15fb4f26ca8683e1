#include "orvex/api/thread/merged_fence.h"

#include <atomic>
#include <chrono>
#include <memory>
#include <stdexcept>
#include <string>
#include <thread>
#include <variant>
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
using ::orvex::testing::NotDone;
using ::orvex::testing::RecordingFence;
using ::orvex::testing::StatusIs;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

const Status kE1 = DataLossError("e1");
const Status kE2 = CancelledError("e2");

// Records every listener call of a merged fence.
struct Calls {
  std::vector<std::string> texts;
  FenceListener Listener() {
    return [this](Status s) { texts.push_back(s.ToString()); };
  }
};

TEST(MergedFenceTest, EmptyAndNullEntriesCountAsDone) {
  for (const std::vector<Fence*>& fences : {std::vector<Fence*>{}, std::vector<Fence*>{nullptr}}) {
    SCOPED_TRACE(fences.size());
    auto merged = MergeFences(fences);
    EXPECT_TRUE(std::get<Status>(merged->WaitForDone(absl::ZeroDuration())).ok());
    Calls calls;
    EXPECT_TRUE(merged->AddListener(calls.Listener()).ok());
    EXPECT_THAT(calls.texts, ElementsAre("OK"));
    merged->Abort();
    merged->TrySignal(kE1);
  }
}

TEST(MergedFenceTest, FirstErrorInFenceOrderWins) {
  SoftwareFence a, b;
  DummyFence dummy;
  auto merged = MergeFences({&dummy, &a, &b});
  Calls calls;
  ASSERT_TRUE(merged->AddListener(calls.Listener()).ok());
  EXPECT_THAT(merged->GetFenceStatus(),
              StatusIs(StatusCode::kUnavailable, "Fence not yet (fully) signalled."));
  b.Signal(kE2);
  EXPECT_TRUE(calls.texts.empty());
  EXPECT_EQ(merged->GetFenceStatus(), UnavailableError("Fence not yet (fully) signalled."));
  a.Signal(kE1);
  EXPECT_THAT(calls.texts, ElementsAre(kE1.ToString()));
  EXPECT_EQ(std::get<Status>(merged->WaitForDone(absl::Seconds(1))), kE1);
  ASSERT_TRUE(merged->AddListener(calls.Listener()).ok());  // done: called at once
  EXPECT_THAT(calls.texts, ElementsAre(kE1.ToString(), kE1.ToString()));
}

// Each covered fence is called once, with the caller's own poll or infinite
// wait, or with the time left until the common deadline.
TEST(MergedFenceTest, EachFenceGetsOneWaitWithItsShareOfTheTimeout) {
  const absl::Duration ms = absl::Milliseconds(1), inf = absl::InfiniteDuration();
  SoftwareFence done, pending;
  TwoStageSoftwareFence two_stage_done, two_stage_pending;
  done.Signal(OkStatus());
  ASSERT_TRUE(two_stage_done.SignalDone(kE1).ok());
  // `first` sleeps `delay` and answers `result`; `second` comes after done
  // fences of both kinds (and `pending`, if any, after `first`).
  const struct {
    absl::Duration timeout;
    FenceWaitResult result;
    absl::Duration delay;
    Fence* pending;
    bool done;
    absl::Duration first_min;  // up to `timeout`
    size_t second_calls;
    absl::Duration second_min, second_max;
  } cases[] = {
      {-3 * ms, OkStatus(), ms, nullptr, true, -3 * ms, 1, -3 * ms, -3 * ms},
      {0 * ms, OkStatus(), ms, nullptr, true, 0 * ms, 1, 0 * ms, 0 * ms},
      {inf, OkStatus(), ms, nullptr, true, inf, 1, inf, inf},
      {20 * ms, OkStatus(), ms, nullptr, true, 15 * ms, 1, absl::Nanoseconds(1), 19 * ms},
      {20 * ms, OkStatus(), 30 * ms, nullptr, true, 15 * ms, 1, 0 * ms, 0 * ms},  // past deadline
      {20 * ms, orvex_api::FenceNotDone{}, ms, nullptr, false, 15 * ms, 0, {}, {}},
      {5 * ms, OkStatus(), ms, &pending, false, 4 * ms, 0, {}, {}},  // `pending` times out
      {5 * ms, OkStatus(), ms, &two_stage_pending, false, 4 * ms, 0, {}, {}},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.timeout);
    RecordingFence first(c.result, c.delay), second;
    std::vector<Fence*> fences = {&first, c.pending, &done, &two_stage_done, &second};
    EXPECT_EQ(Done(MergeFences(fences)->WaitForDone(c.timeout)),
              c.done ? kE1 : InternalError("not done"));
    ASSERT_EQ(first.timeouts.size(), 1u);
    EXPECT_GE(first.timeouts[0], c.first_min);
    EXPECT_LE(first.timeouts[0], c.timeout);
    ASSERT_EQ(second.timeouts.size(), c.second_calls);
    if (c.second_calls == 0) continue;
    EXPECT_GE(second.timeouts[0], c.second_min);
    EXPECT_LE(second.timeouts[0], c.second_max);
  }
}

TEST(MergedFenceTest, RefusedRegistrationIsReturnedAndListenerNeverCalled) {
  SoftwareFence a;
  RecordingFence refusing;
  auto merged = MergeFences({&a, &refusing});
  Calls calls;
  EXPECT_THAT(merged->AddListener(calls.Listener()), StatusIs(StatusCode::kUnimplemented));
  a.Signal(OkStatus());
  EXPECT_THAT(merged->AddListener(calls.Listener()), StatusIs(StatusCode::kUnimplemented));
  EXPECT_TRUE(calls.texts.empty());
}

// Merged listeners are destroyed after the last covered fence's signal, so
// they may own the fences; one that throws keeps no other from running, and
// its exception reaches that signaller.
TEST(MergedFenceTest, ListenersMayOwnTheirFencesAndThrow) {
  for (bool two_stage_last : {false, true}) {
    SCOPED_TRACE(two_stage_last);
    auto software = std::make_shared<SoftwareFence>();
    auto two_stage = std::make_shared<TwoStageSoftwareFence>();
    SoftwareFence* s = software.get();
    TwoStageSoftwareFence* t = two_stage.get();
    std::weak_ptr<SoftwareFence> weak = software;
    std::vector<std::string> calls;
    {
      auto merged = MergeFences({s, t});
      ASSERT_TRUE(merged->AddListener([&](Status) { throw std::runtime_error("listener"); }).ok());
      ASSERT_TRUE(merged
                      ->AddListener([&calls, software, two_stage](Status status) {
                        calls.push_back(status.ToString());
                      })
                      .ok());
    }
    software.reset();
    two_stage.reset();
    ASSERT_TRUE(t->SignalReadyToStart(OkStatus()).ok());
    if (two_stage_last) s->Signal(kE1);
    EXPECT_TRUE(two_stage_last || t->SignalDone(kE2).ok());
    EXPECT_THROW(two_stage_last ? (void)t->SignalDone(kE2) : s->Signal(kE1), std::runtime_error);
    EXPECT_THAT(calls, ElementsAre(kE1.ToString()));
    EXPECT_TRUE(weak.expired());
  }
}

// Over two-stage fences, whose Abort calls no listener, the listener waits
// for a SignalDone.
TEST(MergedFenceTest, AbortReachesCoveredFences) {
  SoftwareFence s1, s2;
  TwoStageSoftwareFence t1, t2;
  const std::pair<std::shared_ptr<MergedFence>, size_t> cases[] = {{MergeFences({&s1, &s2}), 1},
                                                                   {MergeFences({&t1, &t2}), 0}};
  for (const auto& [merged, listener_calls] : cases) {
    Calls calls;
    ASSERT_TRUE(merged->AddListener(calls.Listener()).ok());
    merged->Abort();
    EXPECT_THAT(merged->GetFenceStatus(), StatusIs(StatusCode::kAborted, "Fence was aborted"));
    EXPECT_EQ(calls.texts, std::vector<std::string>(listener_calls, "ABORTED: Fence was aborted"));
  }
}

TEST(MergedFenceTest, TrySignalReachesSoftwareKindsOnly) {
  SoftwareFence software, nested_software;
  TwoStageSoftwareFence two_stage;
  ASSERT_TRUE(two_stage.SignalReadyToStart(OkStatus()).ok());
  DummyFence dummy;
  auto nested = MergeFences({&nested_software});
  auto merged = MergeFences({nullptr, &software, &two_stage, &dummy, nested.get()});
  merged->TrySignal(kE1);
  EXPECT_EQ(software.GetStatus(), kE1);
  EXPECT_EQ(two_stage.GetStatus(), kE1);
  EXPECT_EQ(nested_software.GetStatus(), kE1);
  EXPECT_EQ(std::get<Status>(merged->WaitForDone(absl::ZeroDuration())), kE1);
}

TEST(MergedFenceDeathTest, TrySignalOnRefusingTwoStageFenceIsFatal) {
  TwoStageSoftwareFence two_stage;
  auto merged = MergeFences({&two_stage});
  EXPECT_DEATH(merged->TrySignal(OkStatus()),
               "Check failed: two_stage_software_fence->SignalDone\\(status\\) == OkStatus\\(\\) "
               "\\(two_stage_software_fence->SignalDone\\(status\\)=FAILED_PRECONDITION: Two "
               "stage fence done signaled ok, but ready-to-start signal was never received, "
               "OkStatus\\(\\)=OK\\) ");
}

// Fences complete on their own threads while others add listeners and wait:
// the merged fence completes once, with the first error in fence order.
TEST(MergedFenceStressTest, CompletesOnceWithFirstErrorInOrder) {
  constexpr int kFences = 6, kAdders = 3, kPerAdder = 3;
  const absl::Time end = absl::Now() + absl::Seconds(2);
  int rounds = 0;
  for (; rounds < 2000 && absl::Now() < end; ++rounds) {
    std::vector<SoftwareFence> fences(kFences);
    std::vector<Fence*> pointers;
    for (SoftwareFence& f : fences) pointers.push_back(&f);
    auto merged = MergeFences(pointers);
    std::atomic<int> calls{0}, wrong{0};
    std::vector<std::thread> threads;
    for (int i = 0; i < kAdders; ++i) {
      threads.emplace_back([&] {
        for (int j = 0; j < kPerAdder; ++j) {
          EXPECT_TRUE(merged
                          ->AddListener([&](Status s) {
                            calls.fetch_add(1);
                            if (s != kE1) wrong.fetch_add(1);
                          })
                          .ok());
        }
      });
    }
    threads.emplace_back(
        [&] { EXPECT_EQ(std::get<Status>(merged->WaitForDone(absl::InfiniteDuration())), kE1); });
    for (int i = 0; i < kFences; ++i) {
      threads.emplace_back([&, i] { fences[i].Signal(i == 2 ? kE1 : i == 4 ? kE2 : OkStatus()); });
    }
    for (std::thread& t : threads) t.join();
    ASSERT_EQ(calls.load(), kAdders * kPerAdder);
    ASSERT_EQ(wrong.load(), 0);
  }
  EXPECT_GT(rounds, 0);
}

}  // namespace
}  // namespace orvex
