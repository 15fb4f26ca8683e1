#include "orvex/status/printable.h"

#include <sstream>
#include <vector>

#include "gtest/gtest.h"
#include "orvex/status/status_builder.h"

namespace orvex {
namespace {

class Crop : public Printable {
 public:
  std::string DebugStr() const override {
    return BuildOrvexDebugStrWithStrings("NormalizedCrop", {{"left", "0.25"}, {"top", "0.5"}});
  }
};

TEST(DebugStrTest, Shapes) {
  struct Case {
    std::string_view type;
    std::vector<std::pair<std::string_view, std::string_view>> fields;
    std::string expected;
  };
  const std::vector<Case> cases = {
      {"Buffer", {}, "{type: Buffer}"},
      {"", {}, "{type: }"},
      {"", {{"a", "1"}}, "{type: , a: 1}"},
      {"T", {{"a", ""}, {"b", "x, y"}}, "{type: T, a: , b: x, y}"},
      {"T", {{"a", "1"}, {"a", "2"}}, "{type: T, a: 1, a: 2}"},
      {"T", {{"\"q\"", "{}"}}, "{type: T, \"q\": {}}"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.expected);
    EXPECT_EQ(BuildOrvexDebugStr(c.type, c.fields), c.expected);
    std::vector<std::pair<std::string, std::string>> owned;
    for (const auto& [n, t] : c.fields) owned.emplace_back(n, t);
    EXPECT_EQ(BuildOrvexDebugStrWithStrings(c.type, owned), c.expected);
  }
}

TEST(DebugStrTest, ContainerDebugStr) {
  const std::vector<int> values = {1, 2, 3};
  auto fmt = [](int v) { return std::to_string(v * 10); };
  EXPECT_EQ(ContainerDebugStr(values, fmt), "{10, 20, 30}");
  EXPECT_EQ(ContainerDebugStr<false>(values, fmt), "10, 20, 30");
  EXPECT_EQ(ContainerDebugStr(std::vector<int>{}, fmt), "{}");
}

TEST(PrintableTest, StreamsDebugStr) {
  Crop crop;
  std::ostringstream os;
  os << crop;
  EXPECT_EQ(os.str(), "{type: NormalizedCrop, left: 0.25, top: 0.5}");
  EXPECT_EQ(crop.GetInstanceName(), "");
  Status s = InvalidArgumentErrorBuilder(ORVEX_LOC) << "bad crop " << crop;
  EXPECT_EQ(s.message(), "bad crop {type: NormalizedCrop, left: 0.25, top: 0.5}");
}

}  // namespace
}  // namespace orvex
