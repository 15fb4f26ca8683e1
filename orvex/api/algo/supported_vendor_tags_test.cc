#include "orvex/api/algo/supported_vendor_tags.h"

#include <memory>
#include <set>
#include <span>

#include "gtest/gtest.h"

namespace orvex_api {
namespace {

// Every set names each tag once, draws only from the other component's block
// or this library's own, and holds the tags all three algorithms share.
TEST(SupportedVendorTagsTest, SetsAreUniqueAndFromKnownBlocks) {
  const AeVendorTagsV1 ae;
  const AfVendorTagsV1 af;
  const std::unique_ptr<SupportedVendorTagSet> awb = std::make_unique<AwbVendorTagsV1>();
  const std::pair<const char*, std::span<const uint32_t>> cases[] = {
      {"ae", ae.tags()}, {"af", af.tags()}, {"awb", static_cast<AwbVendorTagsV1&>(*awb).tags()}};
  for (const auto& [name, tags] : cases) {
    SCOPED_TRACE(name);
    const std::set<uint32_t> unique(tags.begin(), tags.end());
    EXPECT_EQ(unique.size(), tags.size());
    for (uint32_t tag : tags) {
      EXPECT_TRUE((tag >> 24) == 0x83 || (tag >> 24) == 0x84) << std::hex << tag;
    }
    for (uint32_t shared : {0x83000001u, 0x83000047u, 0x83000081u}) {
      EXPECT_EQ(unique.count(shared), 1u) << std::hex << shared;
    }
  }
}

}  // namespace
}  // namespace orvex_api
