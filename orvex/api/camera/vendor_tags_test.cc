#include "orvex/api/camera/vendor_tags.h"

#include <set>
#include <string>

#include "gtest/gtest.h"

namespace android {
namespace nuvora_camera_hal {
namespace {

TEST(VendorTagsTest, IdentifiersAndNamesAreUnique) {
  std::set<uint32_t> ids;
  std::set<std::string> names;
  for (const VendorTagSection& section : kVendorTagSections) {
    EXPECT_TRUE(names.insert(section.section_name).second) << section.section_name;
    for (const VendorTag& tag : section.tags) {
      EXPECT_TRUE(ids.insert(tag.tag_id).second && tag.tag_id >> 16 == kVendorTagStart >> 16)
          << tag.tag_name;
      EXPECT_TRUE(names.insert(section.section_name + "." + tag.tag_name).second) << tag.tag_name;
    }
  }
}

}  // namespace
}  // namespace nuvora_camera_hal
}  // namespace android
