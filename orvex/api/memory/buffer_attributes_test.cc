#include "orvex/api/memory/buffer_attributes.h"

#include <string_view>
#include <utility>

#include "gtest/gtest.h"

namespace orvex {
namespace {

// One name per text function, and what values outside its table read as.
TEST(BufferAttributesTest, Texts) {
  const std::pair<std::string_view, std::string_view> cases[] = {
      {TransportToString(BufferTransport::kOpaque), "Opaque"},
      {TransportToString(static_cast<BufferTransport>(6)), "Unknown"},
      {AccessToString(BufferAccess::kGpu), "GPU"},
      {AccessToString(static_cast<BufferAccess>(3)), "Unknown"},
      {SecurityToString(BufferSecurity::kNone), "None"},
      {SecurityToString(static_cast<BufferSecurity>(7)), "Secure"},
      {CachedToString(BufferCached::kCached), "Cached"},
      {CachedToString(static_cast<BufferCached>(9)), "UnCached"},
      {CompressionToString(BufferCompression::kSbwcLossyMedium), "Lossy SBWC Medium Compression"},
      {CompressionToString(static_cast<BufferCompression>(7)), "Unknown"},
      {AccessModeToString(BufferAccessMode::kReadWrite), "ReadWrite"},
      {AccessModeToString(static_cast<BufferAccessMode>(3)), "Unknown"},
  };
  for (const auto& [got, want] : cases) EXPECT_EQ(got, want);
  EXPECT_EQ(
      BufferAttributesToString({BufferTransport::kOtf, BufferAccess::kNone, BufferSecurity::kSecure,
                                BufferCached::kUnCached, BufferCompression::kJpeg}),
      "Transport: OTF, Access: None, Security: Secure, Cached: UnCached, Compression: JPEG");
  EXPECT_EQ(sizeof(BufferAttributes), 5u);
}

TEST(BufferAttributesTest, SbwcPredicates) {
  for (int v = 0; v <= 7; ++v) {
    SCOPED_TRACE(v);
    const auto c = static_cast<BufferCompression>(v);
    EXPECT_EQ(IsSbwcLosslessCompression(c), v == 1);
    EXPECT_EQ(IsSbwcLossyCompression(c), v >= 4 && v <= 6);
    EXPECT_EQ(IsSbwcBufferCompression(c), v == 1 || (v >= 4 && v <= 6));
  }
}

}  // namespace
}  // namespace orvex
