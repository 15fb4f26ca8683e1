#include "orvex/api/sysprop/fatp_property_keys.h"

#include <cstdint>
#include <set>
#include <string>

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/api/sysprop/system_properties.h"
#include "orvex/status/status_matchers.h"

namespace orvex {
namespace {

using ::orvex::testing::IsOk;
using ::orvex::testing::IsOkAndHolds;
using ::orvex::testing::StatusIs;

TEST(FatpPropertyKeysTest, KeysAndWrites) {
  std::set<std::string> keys;
  for (int value = 1; value <= 65; ++value) {
    SCOPED_TRACE(value);
    const std::string key = GetFatpSystemPropertyKeyOrDie(static_cast<FatpTag>(value));
    EXPECT_THAT(GetFatpSystemPropertyKey(static_cast<FatpTag>(value)), IsOkAndHolds(key));
    EXPECT_THAT(key, ::testing::StartsWith("vendor.camera.fatp."));
    keys.insert(key);
  }
  EXPECT_EQ(keys.size(), 65u);
  EXPECT_EQ(GetFatpSystemPropertyKeyOrDie(FatpTag::kAfPosDac), "vendor.camera.fatp.af.pos_dac");
  for (int value : {0, 66, INT32_MIN}) {
    const std::string message = "Tag " + std::to_string(value) + " system property not found";
    EXPECT_THAT(GetFatpSystemPropertyKey(static_cast<FatpTag>(value)),
                StatusIs(StatusCode::kNotFound, message));
    EXPECT_THAT(SetFatpSystemProperty(static_cast<FatpTag>(value), "x"),
                StatusIs(StatusCode::kNotFound, message));
  }
  SystemProperties& props = SystemProperties::GetInstance();
  props.SetFake(true);
  EXPECT_THAT(SetFatpSystemProperty(FatpTag::kRteleBarcode, "BC-123"), IsOk());
  EXPECT_THAT(props.Get("vendor.camera.fatp.rtele.barcode"), IsOkAndHolds("BC-123"));
  props.SetProxy(nullptr);
  EXPECT_THAT(SetFatpSystemProperty(FatpTag::kRteleSn, "x"), StatusIs(StatusCode::kUnavailable));
  props.SetFake(false);
}

TEST(FatpPropertyKeysDeathTest, OrDieWithoutKeyIsFatal) {
  EXPECT_DEATH(GetFatpSystemPropertyKeyOrDie(static_cast<FatpTag>(66)),
               "Check failed: property_or\\.ok\\(\\) NOT_FOUND: Tag 66 system property not found");
}

}  // namespace
}  // namespace orvex
