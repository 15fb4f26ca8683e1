#include "orvex/api/thread/two_stage_software_fence.h"

#include <atomic>
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

using ::orvex::testing::Done;
using ::orvex::testing::NotDone;
using ::orvex::testing::StatusIs;
using ::testing::ElementsAre;

const Status kE1 = DataLossError("e1");
const Status kE2 = CancelledError("e2");
const Status kGaveUp = DeadlineExceededError("gave up");

// Applies "r" (SignalReadyToStart) or "d" (SignalDone) with OK ("+"), kE1
// ("1") or kE2 ("2"); "a" aborts; "f" forfeits at once with kGaveUp.
Status Apply(TwoStageSoftwareFence& fence, const std::string& op) {
  if (op == "a") return fence.Abort(), OkStatus();
  if (op == "f") return fence.WaitUntilReadyToStartOrForfeit(absl::ZeroDuration(), kGaveUp);
  const Status s = op[1] == '+' ? OkStatus() : op[1] == '1' ? kE1 : kE2;
  return op[0] == 'r' ? fence.SignalReadyToStart(s) : fence.SignalDone(s);
}

// The status of a stage, "-" while it is not over.
std::string ReadyText(const TwoStageSoftwareFence& fence) {
  Status s = fence.GetReadyToStartStatus();
  return IsUnavailable(s) ? "-" : s.ToString();
}
std::string DoneText(const TwoStageSoftwareFence& fence) {
  FenceWaitResult r = fence.WaitForDone(absl::ZeroDuration());
  return NotDone(r) ? "-" : std::get<Status>(r).ToString();
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
    EXPECT_EQ(ReadyText(fence), cases[i].ready);
    EXPECT_EQ(DoneText(fence), cases[i].done);
  }
}

TEST(TwoStageSoftwareFenceTest, ListenersRunOnlyInSignalDone) {
  TwoStageSoftwareFence fence;
  std::vector<std::string> calls;
  const auto add = [&](const std::string& name) {
    ASSERT_TRUE(
        fence.AddListener([&, name](Status s) { calls.push_back(name + s.ToString()); }).ok());
  };
  add("a "), add("b ");
  ASSERT_TRUE(fence.SignalReadyToStart(kE1).ok());
  fence.Abort();
  EXPECT_TRUE(calls.empty());  // failed without SignalDone: nobody called
  add("c ");
  ASSERT_TRUE(fence.SignalDone(kE2).ok());
  add("d ");
  EXPECT_THAT(calls, ElementsAre("c ABORTED: Fence was aborted", "a " + kE2.ToString(),
                                 "b " + kE2.ToString(), "d " + kE2.ToString()));
}

TEST(TwoStageSoftwareFenceTest, WaitsTimeOutAndWake) {
  TwoStageSoftwareFence fence;
  EXPECT_THAT(fence.GetReadyToStartStatus(),
              StatusIs(StatusCode::kUnavailable,
                       "Two stage fence has not been signaled ready-to-start yet"));
  EXPECT_THAT(fence.WaitUntilReadyToStart(absl::Milliseconds(2)),
              StatusIs(StatusCode::kDeadlineExceeded,
                       "timed out waiting for two stage software fence ready-to-start signal "
                       "with a timeout duration of: 2ms"));
  EXPECT_TRUE(NotDone(fence.WaitForDone(absl::Microseconds(100))));
  std::thread producer([&] {
    absl::SleepFor(absl::Milliseconds(5));
    EXPECT_TRUE(fence.SignalReadyToStart(OkStatus()).ok());
    EXPECT_TRUE(fence.SignalDone(kE1).ok());
  });
  EXPECT_TRUE(fence.WaitUntilReadyToStart(absl::InfiniteDuration()).ok());
  EXPECT_EQ(Done(fence.WaitForDone(absl::Seconds(30))), kE1);
  producer.join();
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

// A producer racing a consumer that forfeits: exactly one of them wins the
// ready-to-start stage, and every listener runs exactly once.
TEST(TwoStageSoftwareFenceStressTest, ForfeitRacesLateProducer) {
  const absl::Time end = absl::Now() + absl::Seconds(2);
  for (int rounds = 0; rounds < 3000 && absl::Now() < end; ++rounds) {
    TwoStageSoftwareFence fence;
    std::atomic<int> calls{0};
    Status seen[4], consumer, producer;
    const auto listen = [&](int i) {
      EXPECT_TRUE(fence.AddListener([&, i](Status s) { seen[i] = s, ++calls; }).ok());
    };
    listen(0), listen(1);
    std::thread threads[] = {
        std::thread([&] {
          consumer = fence.WaitUntilReadyToStartOrForfeit(absl::Microseconds(rounds % 200), kE1);
        }),
        std::thread([&] { listen(2), listen(3); }),
        std::thread([&] { (void)fence.WaitForDone(absl::InfiniteDuration()); }), std::thread([&] {
          producer = fence.SignalReadyToStart(OkStatus());
          // A refused producer still completes the frame, with its own error.
          EXPECT_TRUE(fence.SignalDone(producer.ok() ? OkStatus() : kE2).ok());
        })};
    for (std::thread& t : threads) t.join();
    const Status done = Done(fence.WaitForDone(absl::ZeroDuration()));
    EXPECT_EQ(consumer.ok(), producer.ok());
    EXPECT_EQ(done, consumer.ok() ? OkStatus() : kE2);
    EXPECT_TRUE(consumer.ok() || IsDeadlineExceeded(consumer)) << consumer;
    ASSERT_EQ(calls.load(), 4);
    // Listeners added after a forfeit run at once with the forfeit status.
    for (int i = 0; i < 4; ++i) EXPECT_TRUE(seen[i] == done || (i >= 2 && seen[i] == kE1)) << i;
  }
}

}  // namespace
}  // namespace orvex
