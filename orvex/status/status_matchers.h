#ifndef ORVEX_STATUS_STATUS_MATCHERS_H_
#define ORVEX_STATUS_STATUS_MATCHERS_H_

// gMock matchers for Status and StatusOr<T>, for users' tests.
//
//   EXPECT_THAT(Parse("x"), orvex::testing::StatusIs(orvex::StatusCode::kInvalidArgument));
//   EXPECT_THAT(Parse("x"), orvex::testing::StatusIs(orvex::StatusCode::kInvalidArgument,
//                                                    ::testing::HasSubstr("bad")));
//   EXPECT_THAT(Parse("5"), orvex::testing::IsOkAndHolds(5));
//   EXPECT_THAT(DoIt(), orvex::testing::IsOk());
//
// Link the `orvex_testing` target (which brings gMock).

#include <ostream>
#include <string>
#include <utility>

#include "gmock/gmock.h"
#include "orvex/status/status.h"
#include "orvex/status/statusor.h"

namespace orvex {

// Lets gtest print statuses and StatusOr values in failure messages.
inline void PrintTo(const Status& status, std::ostream* os) { *os << status.ToString(); }
template <typename T>
void PrintTo(const StatusOr<T>& status_or, std::ostream* os) {
  if (status_or.ok()) {
    *os << "OK holding " << ::testing::PrintToString(*status_or);
  } else {
    *os << status_or.status().ToString();
  }
}

namespace testing {
namespace internal {

inline const Status& GetStatus(const Status& status) { return status; }
template <typename T>
const Status& GetStatus(const StatusOr<T>& status_or) {
  return status_or.status();
}

MATCHER_P2(StatusIsImpl, code_matcher, message_matcher, "") {
  const Status& status = GetStatus(arg);
  const bool code_ok = ::testing::ExplainMatchResult(code_matcher, status.code(), result_listener);
  const bool message_ok = ::testing::ExplainMatchResult(
      message_matcher, std::string(status.message()), result_listener);
  if (!(code_ok && message_ok)) *result_listener << "status is " << status.ToString();
  return code_ok && message_ok;
}

MATCHER_P(IsOkAndHoldsImpl, value_matcher, "") {
  if (!arg.ok()) {
    *result_listener << "status is " << arg.status().ToString();
    return false;
  }
  return ::testing::ExplainMatchResult(value_matcher, *arg, result_listener);
}

}  // namespace internal

// Matches a Status or StatusOr whose code() matches `code`.
template <typename CodeMatcher>
auto StatusIs(CodeMatcher code) {
  return internal::StatusIsImpl(code, ::testing::_);
}
// ... and whose message matches `message`.
template <typename CodeMatcher, typename MessageMatcher>
auto StatusIs(CodeMatcher code, MessageMatcher message) {
  return internal::StatusIsImpl(code, message);
}
// Matches an OK Status or StatusOr.
inline auto IsOk() { return internal::StatusIsImpl(StatusCode::kOk, ::testing::_); }
// Matches an OK StatusOr whose value matches `value`.
template <typename ValueMatcher>
auto IsOkAndHolds(ValueMatcher value) {
  return internal::IsOkAndHoldsImpl(value);
}

}  // namespace testing
}  // namespace orvex

#endif  // ORVEX_STATUS_STATUS_MATCHERS_H_
