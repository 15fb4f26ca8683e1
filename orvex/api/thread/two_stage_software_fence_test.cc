#include "orvex/api/thread/two_stage_software_fence.h"

#include <atomic>
#include <iterator>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "absl/time/clock.h"
#include "absl/time/time.h"
#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/api/thread/fence_testing.h"

namespace orvex {
namespace {

using ::orvex::testing::Done;
using ::orvex::testing::NotDone;
using ::testing::ElementsAre;

const Status kE1 = DataLossError("e1"), kE2 = CancelledError("e2");
const Status kGaveUp = DeadlineExceededError("gave up");

// "r"/"d" signal ready/done with OK ("+"), kE1 or kE2; "a" aborts; "f" forfeits.
Status Apply(TwoStageSoftwareFence& fence, const std::string& op) {
  if (op == "a") return fence.Abort(), OkStatus();
  if (op == "f") return fence.WaitUntilReadyToStartOrForfeit(absl::ZeroDuration(), kGaveUp);
  const Status s = op[1] == '+' ? OkStatus() : op[1] == '1' ? kE1 : kE2;
  return op[0] == 'r' ? fence.SignalReadyToStart(s) : fence.SignalDone(s);
}

// The statuses of both stages, "-" for one not yet over.
std::pair<std::string, std::string> Stages(const TwoStageSoftwareFence& fence) {
  const Status ready = fence.GetReadyToStartStatus();
  const FenceWaitResult done = fence.WaitForDone(absl::ZeroDuration());
  return {IsUnavailable(ready) ? "-" : ready.ToString(),
          NotDone(done) ? "-" : Done(done).ToString()};
}

TEST(TwoStageSoftwareFenceTest, EveryTransition) {
  const std::string ok = "OK", e1 = kE1.ToString(), e2 = kE2.ToString(), g = kGaveUp.ToString();
  const std::string aborted = "ABORTED: Fence was aborted", pre = "FAILED_PRECONDITION: ";
  const std::string twice = pre +
                            "Two stage fence signaled done twice, and one of the statuses was not "
                            "an error: Old status = ";
  const std::string ready_again = pre +
                                  "Two stage fence signaled ready-to-start is already signaled "
                                  "with OkStatus, it cannot be signaled again with OkStatus.";
  const std::string not_after_error =
      pre + "Two stage fence signaled ready-to-start is already signaled with " + e1 +
      " Cannot change to OkStatus since error already happened.";
  const std::string never_ready =
      pre + "Two stage fence done signaled ok, but ready-to-start signal was never received";
  const std::string timed_out =
      "DEADLINE_EXCEEDED: timed out waiting for two stage software fence ready-to-start signal "
      "with a timeout duration of: 0";
  const std::string forfeited =
      "INTERNAL: Ready-to-start fence is with timeout status (" + g +
      "), meaning that the consumer already timeout and gave up the frame";
  // clang-format off
  const struct {
    std::vector<std::string> state;
    std::string op, result, ready, done;
  } cases[] = {
      {{}, "r+", ok, ok, "-"}, {{}, "r2", ok, e2, e2}, {{}, "d+", never_ready, "-", "-"},
      {{}, "d2", ok, e2, e2}, {{}, "f", timed_out, g, g},
      {{"r+"}, "r+", ready_again, ok, "-"}, {{"r+"}, "r2", ok, e2, e2},
      {{"r+"}, "d+", ok, ok, ok}, {{"r+"}, "d2", ok, ok, e2}, {{"r+"}, "f", ok, ok, "-"},
      {{"r+", "d+"}, "r2", ok, e2, ok}, {{"r+", "d+"}, "a", ok, aborted, aborted},
      {{"r+", "d+"}, "d+", twice + "OK New status = OK", ok, ok},
      {{"r+", "d+"}, "d2", twice + "OK New status = " + e2, ok, ok},
      {{"r1"}, "r+", not_after_error, e1, e1}, {{"r1"}, "r2", ok, e1, e1},
      {{"r1"}, "d+", twice + e1 + " New status = OK", e1, e1}, {{"r1"}, "d2", ok, e1, e2},
      {{"f"}, "f", forfeited, g, g}, {{"f"}, "d+", twice + g + " New status = OK", g, g},
  };
  // clang-format on
  for (size_t i = 0; i < std::size(cases); ++i) {
    SCOPED_TRACE(i);
    TwoStageSoftwareFence fence;
    for (const std::string& op : cases[i].state) (void)Apply(fence, op);
    EXPECT_EQ(Apply(fence, cases[i].op).ToString(), cases[i].result);
    EXPECT_EQ(Stages(fence), std::pair(cases[i].ready, cases[i].done));
  }
}

TEST(TwoStageSoftwareFenceTest, ListenersRunOnlyInSignalDone) {
  TwoStageSoftwareFence fence;
  std::vector<std::string> calls;
  const auto record = [&](Status s) { calls.push_back(s.ToString()); };
  ASSERT_TRUE(fence.AddListener(record).ok());
  ASSERT_TRUE(fence.SignalReadyToStart(kE1).ok());
  fence.Abort();
  ASSERT_TRUE(fence.AddListener(record).ok());  // done: called at once
  ASSERT_TRUE(fence.SignalDone(kE2).ok());
  EXPECT_THAT(calls, ElementsAre("ABORTED: Fence was aborted", kE2.ToString()));
}

TEST(TwoStageSoftwareFenceTest, WaitsTimeOutOrWake) {
  TwoStageSoftwareFence fence;
  EXPECT_EQ(fence.GetReadyToStartStatus().ToString(),
            "UNAVAILABLE: Two stage fence has not been signaled ready-to-start yet");
  EXPECT_EQ(fence.WaitUntilReadyToStart(absl::Milliseconds(2)).ToString(),
            "DEADLINE_EXCEEDED: timed out waiting for two stage software fence ready-to-start "
            "signal with a timeout duration of: 2ms");
  EXPECT_TRUE(NotDone(fence.WaitForDone(absl::Microseconds(100))));
  testing::BlockedWaiter waiter(
      [&] { EXPECT_TRUE(fence.WaitUntilReadyToStart(absl::InfiniteDuration()).ok()); });
  EXPECT_TRUE(fence.SignalReadyToStart(OkStatus()).ok());
}

TEST(TwoStageSoftwareFenceDeathTest, ContractViolations) {
  EXPECT_DEATH((void)TwoStageSoftwareFence().WaitUntilReadyToStartOrForfeit(absl::Milliseconds(1),
                                                                            OkStatus()),
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

// A forfeit racing the producer: one wins ready-to-start; listeners run once.
TEST(TwoStageSoftwareFenceStressTest, ForfeitRacesLateProducer) {
  const absl::Time end = absl::Now() + absl::Seconds(2);
  for (int rounds = 0; rounds < 3000 && absl::Now() < end; ++rounds) {
    TwoStageSoftwareFence fence;
    std::atomic<int> calls{0};
    Status heard, consumer, producer;
    ASSERT_TRUE(fence.AddListener([&](Status s) { heard = s, ++calls; }).ok());
    const auto listen = [&] { EXPECT_TRUE(fence.AddListener([&](Status) { ++calls; }).ok()); };
    std::thread threads[] = {
        std::thread([&] {
          consumer = fence.WaitUntilReadyToStartOrForfeit(absl::Microseconds(rounds % 200), kE1);
        }),
        std::thread([&] { listen(), listen(); }),
        std::thread([&] { (void)fence.WaitForDone(absl::InfiniteDuration()); }), std::thread([&] {
          producer = fence.SignalReadyToStart(OkStatus());
          // A refused producer still completes the frame, with its own error.
          EXPECT_TRUE(fence.SignalDone(producer.ok() ? OkStatus() : kE2).ok());
        })};
    for (std::thread& t : threads) t.join();
    EXPECT_EQ(consumer.ok(), producer.ok());
    EXPECT_TRUE(consumer.ok() || IsDeadlineExceeded(consumer)) << consumer;
    EXPECT_EQ(heard, consumer.ok() ? OkStatus() : kE2);
    ASSERT_EQ(calls.load(), 3);
  }
}

}  // namespace
}  // namespace orvex
