#include "orvex/api/algo/supported_vendor_tags.h"

#include <memory>
#include <set>
#include <span>
#include <vector>

#include "gtest/gtest.h"

namespace orvex_api {
namespace {

TEST(SupportedVendorTagsTest, SetsHaveTheirCountsEndsAndNoRepeats) {
  const AeVendorTagsV1 ae;
  const AfVendorTagsV1 af;
  const AwbVendorTagsV1 awb;
  const struct {
    const char* name;
    std::span<const uint32_t> tags;
    size_t count;
    uint32_t first;
    uint32_t last;
    size_t own;  // Identifiers of this library's own block.
  } cases[] = {
      {"ae", ae.tags(), 31, 0x8300007E, 0x830000A7, 2},
      {"af", af.tags(), 34, 0x83000007, 0x8300005D, 0},
      {"awb", awb.tags(), 27, 0x83000008, 0x8300008F, 0},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    ASSERT_EQ(c.tags.size(), c.count);
    EXPECT_EQ(c.tags.front(), c.first);
    EXPECT_EQ(c.tags.back(), c.last);
    const std::set<uint32_t> unique(c.tags.begin(), c.tags.end());
    EXPECT_EQ(unique.size(), c.count);
    size_t own = 0;
    for (uint32_t tag : c.tags) {
      // Either the other component's block or this library's own block.
      EXPECT_TRUE((tag & 0xFF000000u) == 0x83000000u || (tag & 0xFF000000u) == 0x84000000u)
          << std::hex << tag;
      own += (tag & 0xFF000000u) == 0x84000000u ? 1 : 0;
    }
    EXPECT_EQ(own, c.own);
    // Shared across all three sets.
    for (uint32_t shared : {0x83000001u, 0x83000047u, 0x83000081u}) {
      EXPECT_EQ(unique.count(shared), 1u) << std::hex << shared;
    }
  }
  // This library's own tags sit at positions 2 and 8 of the auto exposure set.
  EXPECT_EQ(ae.tags()[1], 0x84000001u);
  EXPECT_EQ(ae.tags()[7], 0x84000002u);
  EXPECT_EQ(af.tags()[15], 0x83000047u);
  EXPECT_EQ(awb.tags()[9], 0x8300007Eu);

  std::vector<std::unique_ptr<SupportedVendorTagSet>> sets;
  sets.push_back(std::make_unique<AeVendorTagsV1>());
  sets.push_back(std::make_unique<AwbVendorTagsV1>());
  sets.clear();  // Through the root's virtual destructor.
}

}  // namespace
}  // namespace orvex_api
