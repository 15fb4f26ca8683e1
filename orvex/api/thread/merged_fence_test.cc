#include "orvex/api/thread/merged_fence.h"

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
#include "orvex/api/thread/fence.h"
#include "orvex/api/thread/two_stage_software_fence.h"
#include "orvex/status/status_matchers.h"

namespace orvex {
namespace {

using ::orvex::testing::StatusIs;
using ::testing::ElementsAre;

const Status kE1 = DataLossError("e1");
const Status kE2 = CancelledError("e2");

bool NotDone(const FenceWaitResult& r) {
  return std::holds_alternative<orvex_api::FenceNotDone>(r);
}

// Records every listener call of a merged fence.
struct Calls {
  std::vector<std::string> texts;
  FenceListener Listener() {
    return [this](Status s) { texts.push_back(s.ToString()); };
  }
};

// Keeps the base AddListener (refuses listeners).
class RefusingFence : public Fence {
 public:
  FenceWaitResult WaitForDone(absl::Duration) const override { return OkStatus(); }
  void Abort() override {}
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

TEST(MergedFenceTest, SharedDeadlinePollsLaterFences) {
  SoftwareFence slow, done;
  done.Signal(OkStatus());
  std::thread signaller([&] {
    std::this_thread::sleep_for(std::chrono::milliseconds(50));
    slow.Signal(OkStatus());
  });
  EXPECT_TRUE(
      NotDone(WaitForMultipleFencesDone(std::vector<Fence*>{&slow, &done}, absl::Milliseconds(5))));
  EXPECT_TRUE(
      NotDone(WaitForMultipleFencesDone(std::vector<Fence*>{&done, &slow}, absl::ZeroDuration())));
  EXPECT_TRUE(std::get<Status>(WaitForMultipleFencesDone(std::vector<Fence*>{&slow, &done},
                                                         absl::InfiniteDuration()))
                  .ok());
  signaller.join();
}

TEST(MergedFenceTest, RefusedRegistrationIsReturnedAndListenerNeverCalled) {
  SoftwareFence a;
  RefusingFence refusing;
  auto merged = MergeFences({&a, &refusing});
  Calls calls;
  EXPECT_THAT(merged->AddListener(calls.Listener()), StatusIs(StatusCode::kUnimplemented));
  a.Signal(OkStatus());
  EXPECT_THAT(merged->AddListener(calls.Listener()), StatusIs(StatusCode::kUnimplemented));
  EXPECT_TRUE(calls.texts.empty());
}

TEST(MergedFenceTest, OutlivesItsOwnerUntilEveryFenceCalledBack) {
  SoftwareFence a, b;
  Calls calls;
  std::weak_ptr<MergedFence> weak;
  {
    auto merged = MergeFences({&a, &b});
    weak = merged;
    ASSERT_TRUE(merged->AddListener(calls.Listener()).ok());
  }
  EXPECT_FALSE(weak.expired());
  a.Signal(OkStatus());
  b.Signal(OkStatus());
  EXPECT_TRUE(weak.expired());
  EXPECT_THAT(calls.texts, ElementsAre("OK"));
}

TEST(MergedFenceTest, AbortReachesCoveredFences) {
  SoftwareFence s1, s2;
  auto software = MergeFences({&s1, &s2});
  Calls software_calls;
  ASSERT_TRUE(software->AddListener(software_calls.Listener()).ok());
  software->Abort();
  EXPECT_THAT(software_calls.texts, ElementsAre("ABORTED: Fence was aborted"));

  TwoStageSoftwareFence t1, t2;
  auto two_stage = MergeFences({&t1, &t2});
  Calls two_stage_calls;
  ASSERT_TRUE(two_stage->AddListener(two_stage_calls.Listener()).ok());
  two_stage->Abort();
  EXPECT_TRUE(two_stage_calls.texts.empty());  // a two-stage abort calls no listener
  EXPECT_THAT(two_stage->GetFenceStatus(), StatusIs(StatusCode::kAborted, "Fence was aborted"));
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
