#include "orvex/status/statusor.h"

#include <memory>
#include <string>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/status/status_macros.h"
#include "orvex/status/status_matchers.h"

namespace orvex {
namespace {

using ::orvex::testing::IsOk;
using ::orvex::testing::IsOkAndHolds;
using ::orvex::testing::StatusIs;

TEST(StatusOrTest, ValueErrorAndOkArguments) {
  StatusOr<int> v = 7;
  StatusOr<int> e = NotFoundError("no");
  EXPECT_THAT(e, StatusIs(StatusCode::kNotFound, "no"));
  EXPECT_EQ(e.value_or(3), 3);
  EXPECT_THAT(StatusOr<int>(), StatusIs(StatusCode::kUnknown, ""));
  const Status ok_replaced =
      InternalError("An OK status is not a valid constructor argument to StatusOr<T>");
  EXPECT_EQ(StatusOr<int>(OkStatus()).status(), ok_replaced);
  EXPECT_EQ(StatusOr<int>(StatusBuilder(OkStatus(), ORVEX_LOC)).status(), ok_replaced);
  v = OkStatus();
  EXPECT_EQ(v.status(), ok_replaced);
}

TEST(StatusOrTest, CopyMoveAssignKeepsOwnership) {
  auto counter = std::make_shared<int>(0);
  StatusOr<std::shared_ptr<int>> a = counter;
  {
    StatusOr<std::shared_ptr<int>> b = a;
    StatusOr<std::shared_ptr<int>> c = std::move(b);
    c = AbortedError("x");
    EXPECT_EQ(counter.use_count(), 2);
    c = a;
    b = std::move(c);
    EXPECT_EQ(counter.use_count(), 3);
    b = StatusOr<std::shared_ptr<int>>(DataLossError("d"));
    c.emplace(std::make_shared<int>(1));
    EXPECT_EQ(counter.use_count(), 2);
  }
  EXPECT_EQ(counter.use_count(), 2);
  a = NotFoundError("");
  EXPECT_EQ(counter.use_count(), 1);
}

TEST(StatusOrTest, Conversions) {
  StatusOr<std::unique_ptr<int>> p = std::make_unique<int>(4);
  StatusOr<std::shared_ptr<int>> q = std::move(p);
  ASSERT_THAT(q, IsOk());
  EXPECT_EQ(**q, 4);
  StatusOr<const char*> text = "abc";
  EXPECT_THAT(StatusOr<std::string>(text), IsOkAndHolds("abc"));
  StatusOr<int> err = DataLossError("d");
  EXPECT_THAT(StatusOr<long>(err), StatusIs(StatusCode::kDataLoss, "d"));
}

StatusOr<int> Half(int v) {
  if (v % 2 != 0) return InvalidArgumentErrorBuilder(ORVEX_LOC) << "odd " << v;
  return v / 2;
}

StatusOr<int> Quarter(int v) {
  ORVEX_ASSIGN_OR_RETURN(int half, Half(v));
  ORVEX_RETURN_IF_ERROR(Half(half)) << "quarter of " << v;
  ORVEX_RETURN_IF_ERROR(OkStatus());
  ORVEX_ASSIGN_OR_RETURN(half, Half(half));
  return half;
}

TEST(StatusMacrosTest, Propagation) {
  EXPECT_THAT(Quarter(8), IsOkAndHolds(2));
  EXPECT_THAT(Quarter(5), StatusIs(StatusCode::kInvalidArgument, "odd 5"));
  EXPECT_THAT(Quarter(6), StatusIs(StatusCode::kInvalidArgument, "odd 3; quarter of 6"));
}

TEST(StatusOrDeathTest, ValueOfErrorIsFatal) {
  StatusOr<int> e = NotFoundError("missing frame");
  EXPECT_DEATH((void)e.value(),
               "Attempting to fetch value instead of handling error NOT_FOUND: missing frame");
}

}  // namespace
}  // namespace orvex
