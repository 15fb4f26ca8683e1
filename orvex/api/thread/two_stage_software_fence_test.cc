#include "orvex/api/thread/two_stage_software_fence.h"

#include <atomic>
#include <chrono>
#include <functional>
#include <iterator>
#include <string>
#include <thread>
#include <variant>
#include <vector>

#include "absl/time/clock.h"
#include "absl/time/time.h"
#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/api/thread/fence_testing.h"
#include "orvex/status/status_matchers.h"

namespace orvex {
namespace {

using ::orvex::testing::NotDone;
using ::orvex::testing::StatusIs;
using ::testing::ElementsAre;
using ::testing::HasSubstr;

const Status kE1 = DataLossError("e1");
const Status kE2 = CancelledError("e2");
constexpr char kReadyAgainOk[] =
    "Two stage fence signaled ready-to-start is already signaled with OkStatus, it cannot be "
    "signaled again with OkStatus.";

// Each state is reached from the initial one by a sequence of operations.
using Op = std::function<Status(TwoStageSoftwareFence&)>;
Op Ready(Status s) {
  return [s](auto& f) { return f.SignalReadyToStart(s); };
}
Op Done(Status s) {
  return [s](auto& f) { return f.SignalDone(s); };
}
const Op kReadyOk = Ready(OkStatus()), kReadyE1 = Ready(kE1), kReadyE2 = Ready(kE2);
const Op kDoneOk = Done(OkStatus()), kDoneE1 = Done(kE1), kDoneE2 = Done(kE2);
const Op kAbort = [](auto& f) { return f.Abort(), OkStatus(); };

// "OK"/status text, or "-" for a stage not yet over.
std::string ReadyText(const TwoStageSoftwareFence& fence) {
  Status s = fence.GetReadyToStartStatus();
  return IsUnavailable(s) ? "-" : s.ToString();
}
std::string DoneText(const TwoStageSoftwareFence& fence) {
  FenceWaitResult r = fence.WaitForDone(absl::ZeroDuration());
  return std::holds_alternative<Status>(r) ? std::get<Status>(r).ToString() : "-";
}

TEST(TwoStageSoftwareFenceTest, EveryTransition) {
  const std::string ok = "OK", e1 = kE1.ToString(), e2 = kE2.ToString();
  const std::string aborted = "ABORTED: Fence was aborted";
  const std::string done_twice =
      "FAILED_PRECONDITION: Two stage fence signaled done twice, and one of the statuses was not "
      "an error: Old status = ";
  const std::vector<Op> initial, ready = {kReadyOk}, done_ok = {kReadyOk, kDoneOk},
                                 failed = {kReadyE1}, done_after_ok_start = {kReadyOk, kDoneE1};
  struct Case {
    std::vector<Op> state;
    Op op;
    std::string result, ready, done;
  };
  const Case cases[] = {
      {initial, kReadyOk, ok, ok, "-"},
      {initial, kReadyE2, ok, e2, e2},
      {initial, kDoneOk,
       "FAILED_PRECONDITION: Two stage fence done signaled ok, but ready-to-start signal was "
       "never received",
       "-", "-"},
      {initial, kDoneE2, ok, e2, e2},
      {ready, kReadyOk, "FAILED_PRECONDITION: " + std::string(kReadyAgainOk), ok, "-"},
      {ready, kReadyE2, ok, e2, e2},
      {ready, kDoneOk, ok, ok, ok},
      {ready, kDoneE2, ok, ok, e2},
      {done_ok, kReadyOk, "FAILED_PRECONDITION: " + std::string(kReadyAgainOk), ok, ok},
      {done_ok, kReadyE2, ok, e2, ok},
      {done_ok, kDoneOk, done_twice + "OK New status = OK", ok, ok},
      {done_ok, kDoneE2, done_twice + "OK New status = " + e2, ok, ok},
      {done_ok, kAbort, ok, aborted, aborted},
      {failed, kReadyOk,
       "FAILED_PRECONDITION: Two stage fence signaled ready-to-start is already signaled with " +
           e1 + " Cannot change to OkStatus since error already happened.",
       e1, e1},
      {failed, kReadyE2, ok, e1, e1},
      {failed, kDoneOk, done_twice + e1 + " New status = OK", e1, e1},
      {failed, kDoneE2, ok, e1, e2},
      {failed, kAbort, ok, aborted, aborted},
      {done_after_ok_start, kReadyOk, "FAILED_PRECONDITION: " + std::string(kReadyAgainOk), ok, e1},
      {done_after_ok_start, kReadyE2, ok, e2, e1},
      {done_after_ok_start, kDoneOk, done_twice + e1 + " New status = OK", ok, e1},
      {done_after_ok_start, kDoneE2, ok, ok, e2},
  };
  for (size_t i = 0; i < std::size(cases); ++i) {
    const Case& c = cases[i];
    SCOPED_TRACE(i);
    TwoStageSoftwareFence fence;
    for (const Op& op : c.state) ASSERT_TRUE(op(fence).ok());
    EXPECT_EQ(c.op(fence).ToString(), c.result);
    EXPECT_EQ(ReadyText(fence), c.ready);
    EXPECT_EQ(DoneText(fence), c.done);
  }
}

TEST(TwoStageSoftwareFenceTest, ListenersRunOnlyInSignalDone) {
  TwoStageSoftwareFence fence;
  std::vector<std::string> calls;
  ASSERT_TRUE(fence.AddListener([&](Status s) { calls.push_back("a " + s.ToString()); }).ok());
  ASSERT_TRUE(fence.AddListener([&](Status s) { calls.push_back("b " + s.ToString()); }).ok());
  ASSERT_TRUE(fence.SignalReadyToStart(kE1).ok());
  fence.Abort();
  EXPECT_TRUE(calls.empty());  // failed without SignalDone: nobody called
  ASSERT_TRUE(fence.AddListener([&](Status s) { calls.push_back("c " + s.ToString()); }).ok());
  ASSERT_TRUE(fence.SignalDone(kE2).ok());
  ASSERT_TRUE(fence.AddListener([&](Status s) { calls.push_back("d " + s.ToString()); }).ok());
  EXPECT_THAT(calls, ElementsAre("c ABORTED: Fence was aborted", "a " + kE2.ToString(),
                                 "b " + kE2.ToString(), "d " + kE2.ToString()));
}

TEST(TwoStageSoftwareFenceTest, WaitsTimeOutWakeAndForfeit) {
  TwoStageSoftwareFence fence;
  EXPECT_THAT(fence.GetReadyToStartStatus(),
              StatusIs(StatusCode::kUnavailable,
                       "Two stage fence has not been signaled ready-to-start yet"));
  EXPECT_THAT(fence.WaitUntilReadyToStart(absl::Milliseconds(2)),
              StatusIs(StatusCode::kDeadlineExceeded,
                       "timed out waiting for two stage software fence ready-to-start signal "
                       "with a timeout duration of: 2ms"));
  EXPECT_THAT(fence.WaitUntilReadyToStart(absl::ZeroDuration()),
              StatusIs(StatusCode::kDeadlineExceeded));
  EXPECT_TRUE(NotDone(fence.WaitForDone(absl::Microseconds(100))));
  std::thread producer([&] {
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
    EXPECT_TRUE(fence.SignalReadyToStart(OkStatus()).ok());
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
    EXPECT_TRUE(fence.SignalDone(kE1).ok());
  });
  EXPECT_TRUE(fence.WaitUntilReadyToStart(absl::InfiniteDuration()).ok());
  EXPECT_EQ(std::get<Status>(fence.WaitForDone(absl::Seconds(30))), kE1);
  producer.join();
  // Ready in time: no forfeit.
  EXPECT_TRUE(fence.WaitUntilReadyToStartOrForfeit(absl::ZeroDuration(), kE2).ok());
  EXPECT_EQ(std::get<Status>(fence.WaitForDone(absl::ZeroDuration())), kE1);

  // A consumer that forfeits after its timeout; a second one finds that.
  TwoStageSoftwareFence late;
  const Status forfeit = DeadlineExceededError("consumer gave up");
  EXPECT_THAT(late.WaitUntilReadyToStartOrForfeit(absl::Milliseconds(1), forfeit),
              StatusIs(StatusCode::kDeadlineExceeded,
                       HasSubstr("ready-to-start signal with a timeout duration of: 1ms")));
  EXPECT_EQ(std::get<Status>(late.WaitForDone(absl::ZeroDuration())), forfeit);
  EXPECT_EQ(late.GetReadyToStartStatus(), forfeit);
  EXPECT_THAT(late.SignalDone(OkStatus()),
              StatusIs(StatusCode::kFailedPrecondition, HasSubstr("signaled done twice")));
  EXPECT_THAT(
      late.WaitUntilReadyToStartOrForfeit(absl::Milliseconds(1), kE2),
      StatusIs(StatusCode::kInternal,
               "Ready-to-start fence is with timeout status (DEADLINE_EXCEEDED: consumer "
               "gave up), meaning that the consumer already timeout and gave up the frame"));
}

TEST(TwoStageSoftwareFenceDeathTest, ContractViolations) {
  TwoStageSoftwareFence fence;
  EXPECT_DEATH((void)fence.WaitUntilReadyToStartOrForfeit(absl::Milliseconds(1), OkStatus()),
               "Check failed: forfeit_status != OkStatus\\(\\) \\(forfeit_status=OK, "
               "OkStatus\\(\\)=OK\\) Cannot forfeit with Ok status, even to confuse the enemy\\.");
  EXPECT_DEATH(
      {
        auto* doomed = new TwoStageSoftwareFence();
        (void)doomed->AddListener([doomed](Status) { delete doomed; });
        (void)doomed->SignalDone(kE1);
      },
      "TwoStageSoftwareFence destroyed by one of its own listeners while being signalled");
}

// A producer racing a consumer that forfeits: exactly one of them wins the
// ready-to-start stage, and every listener runs exactly once.
TEST(TwoStageSoftwareFenceStressTest, ForfeitRacesLateProducer) {
  const absl::Time end = absl::Now() + absl::Seconds(2);
  for (int rounds = 0; rounds < 3000 && absl::Now() < end; ++rounds) {
    TwoStageSoftwareFence fence;
    std::atomic<int> calls{0};
    std::vector<Status> seen(4);
    const auto listen = [&](int i) {
      return fence.AddListener([&seen, &calls, i](Status s) { seen[i] = s, ++calls; }).ok();
    };
    ASSERT_TRUE(listen(0) && listen(1));
    Status consumer_result, producer_ready;
    std::thread consumer([&] {
      consumer_result = fence.WaitUntilReadyToStartOrForfeit(absl::Microseconds(rounds % 200), kE1);
    });
    std::thread listener_adder([&] { EXPECT_TRUE(listen(2) && listen(3)); });
    std::thread waiter([&] { (void)fence.WaitForDone(absl::InfiniteDuration()); });
    std::thread producer([&] {
      producer_ready = fence.SignalReadyToStart(OkStatus());
      // A refused producer still completes the frame, with its own error.
      EXPECT_TRUE(fence.SignalDone(producer_ready.ok() ? OkStatus() : kE2).ok());
    });
    for (std::thread* t : {&consumer, &listener_adder, &waiter, &producer}) t->join();
    const Status done = std::get<Status>(fence.WaitForDone(absl::ZeroDuration()));
    if (consumer_result.ok()) {
      EXPECT_TRUE(producer_ready.ok());
      EXPECT_TRUE(done.ok());
    } else {
      EXPECT_THAT(consumer_result, StatusIs(StatusCode::kDeadlineExceeded));
      EXPECT_THAT(producer_ready, StatusIs(StatusCode::kFailedPrecondition));
      EXPECT_EQ(done, kE2);
    }
    ASSERT_EQ(calls.load(), 4);
    // Listeners present at SignalDone see its status; one added after a
    // forfeit runs at once with the forfeit status.
    EXPECT_EQ(seen[0], done);
    EXPECT_EQ(seen[1], done);
    for (int i = 2; i < 4; ++i) EXPECT_TRUE(seen[i] == done || seen[i] == kE1) << seen[i];
  }
}

}  // namespace
}  // namespace orvex
