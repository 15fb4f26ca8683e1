#include "orvex/api/memory/buffer_attributes.h"

#include <string_view>
#include <utility>

#include "gtest/gtest.h"

namespace orvex {
namespace {

// One name per text function; past its table (one lookup serves all) a value reads
// "Unknown", a non-zero security or cached byte "Secure" or "UnCached".
TEST(BufferAttributesTest, Texts) {
  const std::pair<std::string_view, std::string_view> cases[] = {
      {TransportToString(BufferTransport::kOpaque), "Opaque"},
      {TransportToString(static_cast<BufferTransport>(6)), "Unknown"},
      {AccessToString(BufferAccess::kGpu), "GPU"},
      {SecurityToString(BufferSecurity::kNone), "None"},
      {SecurityToString(static_cast<BufferSecurity>(7)), "Secure"},
      {CachedToString(BufferCached::kCached), "Cached"},
      {CachedToString(static_cast<BufferCached>(9)), "UnCached"},
      {CompressionToString(BufferCompression::kSbwcLossyMedium), "Lossy SBWC Medium Compression"},
      {AccessModeToString(BufferAccessMode::kReadWrite), "ReadWrite"},
  };
  for (const auto& [got, want] : cases) EXPECT_EQ(got, want);
  EXPECT_EQ(
      BufferAttributesToString({BufferTransport::kOtf, BufferAccess::kNone, BufferSecurity::kSecure,
                                BufferCached::kUnCached, BufferCompression::kJpeg}),
      "Transport: OTF, Access: None, Security: Secure, Cached: UnCached, Compression: JPEG");
}

TEST(BufferAttributesTest, SbwcPredicates) {
  for (int v = 0; v <= 7; ++v) {
    const auto c = static_cast<BufferCompression>(v);
    EXPECT_EQ(IsSbwcLosslessCompression(c), v == 1) << v;
    EXPECT_EQ(IsSbwcLossyCompression(c), v >= 4 && v <= 6) << v;
    EXPECT_EQ(IsSbwcBufferCompression(c), v == 1 || (v >= 4 && v <= 6)) << v;
  }
}

}  // namespace
}  // namespace orvex
