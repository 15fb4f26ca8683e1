#include "orvex/api/algo/supported_vendor_tags.h"

#include <memory>
#include <set>
#include <span>
#include <vector>

#include "gtest/gtest.h"

namespace orvex_api {
namespace {

// Every set is non-empty, names each tag once, draws only from the other
// component's block or this library's own, and holds the tags all three
// algorithms share.
TEST(SupportedVendorTagsTest, SetsAreUniqueAndFromKnownBlocks) {
  const AeVendorTagsV1 ae;
  const AfVendorTagsV1 af;
  const AwbVendorTagsV1 awb;
  const std::pair<const char*, std::span<const uint32_t>> cases[] = {
      {"ae", ae.tags()}, {"af", af.tags()}, {"awb", awb.tags()}};
  for (const auto& [name, tags] : cases) {
    SCOPED_TRACE(name);
    ASSERT_FALSE(tags.empty());
    const std::set<uint32_t> unique(tags.begin(), tags.end());
    EXPECT_EQ(unique.size(), tags.size());
    for (uint32_t tag : tags) {
      EXPECT_TRUE((tag & 0xFF000000u) == 0x83000000u || (tag & 0xFF000000u) == 0x84000000u)
          << std::hex << tag;
    }
    for (uint32_t shared : {0x83000001u, 0x83000047u, 0x83000081u}) {
      EXPECT_EQ(unique.count(shared), 1u) << std::hex << shared;
    }
  }

  std::vector<std::unique_ptr<SupportedVendorTagSet>> sets;
  sets.push_back(std::make_unique<AeVendorTagsV1>());
  sets.push_back(std::make_unique<AwbVendorTagsV1>());
  sets.clear();  // Through the root's virtual destructor.
}

}  // namespace
}  // namespace orvex_api
