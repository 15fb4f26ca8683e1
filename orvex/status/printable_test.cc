#include "orvex/status/printable.h"

#include <vector>

#include "gtest/gtest.h"
#include "orvex/status/status_builder.h"

namespace orvex {
namespace {

TEST(DebugStrTest, ShapesAndPrintables) {
  const struct {
    std::string_view type;
    std::vector<std::pair<std::string_view, std::string_view>> fields;
    std::string expected;
  } cases[] = {{"Buffer", {}, "{type: Buffer}"},
               {"", {{"a", "1"}}, "{type: , a: 1}"},
               {"T", {{"a", ""}, {"b", "x, y"}}, "{type: T, a: , b: x, y}"},
               {"T", {{"a", "1"}, {"a", "2"}}, "{type: T, a: 1, a: 2}"}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.expected);
    EXPECT_EQ(BuildOrvexDebugStr(c.type, c.fields), c.expected);
    std::vector<std::pair<std::string, std::string>> owned(c.fields.begin(), c.fields.end());
    EXPECT_EQ(BuildOrvexDebugStrWithStrings(c.type, owned), c.expected);
  }
  auto tens = [](int v) { return std::to_string(v * 10); };
  EXPECT_EQ(ContainerDebugStr(std::vector<int>{1, 2, 3}, tens), "{10, 20, 30}");
  EXPECT_EQ(ContainerDebugStr<false>(std::vector<int>{1, 2}, tens), "10, 20");
  EXPECT_EQ(ContainerDebugStr(std::vector<int>{}, tens), "{}");
  struct Crop : Printable {
    std::string DebugStr() const override { return "{type: NormalizedCrop}"; }
  } crop;
  EXPECT_EQ(crop.GetInstanceName(), "");
  Status s = InvalidArgumentErrorBuilder(ORVEX_LOC) << "bad crop " << crop;
  EXPECT_EQ(s.message(), "bad crop {type: NormalizedCrop}");
}

}  // namespace
}  // namespace orvex
