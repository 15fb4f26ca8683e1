#include "orvex/api/algo/supported_vendor_tags.h"

#include <set>
#include <span>

#include "gtest/gtest.h"

namespace orvex_api {
namespace {

TEST(SupportedVendorTagsTest, EachSetIsUniqueAndFromKnownBlocks) {
  const AeVendorTagsV1 ae;
  const AfVendorTagsV1 af;
  const AwbVendorTagsV1 awb;
  const std::span<const uint32_t> sets[] = {ae.tags(), af.tags(), awb.tags()};
  for (const std::span<const uint32_t> tags : sets) {
    const std::set<uint32_t> unique(tags.begin(), tags.end());
    EXPECT_EQ(unique.size(), tags.size());
    for (uint32_t tag : tags)
      EXPECT_TRUE(tag >> 24 == 0x83 || tag >> 24 == 0x84) << std::hex << tag;
  }
}

}  // namespace
}  // namespace orvex_api
