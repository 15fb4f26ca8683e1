#include "orvex/api/camera/vendor_tags.h"

#include <set>
#include <string>

#include "gtest/gtest.h"

namespace android {
namespace nuvora_camera_hal {
namespace {

TEST(VendorTagsTest, IdentifiersAndSectionNamesAreUnique) {
  std::set<uint32_t> ids;
  std::set<std::string> sections;
  std::set<std::string> full_names;
  for (const VendorTagSection& section : kVendorTagSections) {
    EXPECT_TRUE(sections.insert(section.section_name).second) << section.section_name;
    for (const VendorTag& tag : section.tags) {
      SCOPED_TRACE(tag.tag_name);
      EXPECT_TRUE(ids.insert(tag.tag_id).second);
      EXPECT_TRUE(full_names.insert(section.section_name + "." + tag.tag_name).second);
      EXPECT_GE(tag.tag_id, kVendorTagStart);
      EXPECT_LT(tag.tag_id, kVendorTagStart + 0x10000);
    }
  }
  EXPECT_EQ(ids.size(), 14u);
}

}  // namespace
}  // namespace nuvora_camera_hal
}  // namespace android
