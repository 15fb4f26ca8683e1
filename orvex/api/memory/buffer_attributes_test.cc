#include "orvex/api/memory/buffer_attributes.h"

#include <vector>

#include "gtest/gtest.h"

namespace orvex {
namespace {

TEST(BufferAttributesTest, Texts) {
  const std::vector<std::pair<std::string_view, std::string_view>> cases = {
      {TransportToString(BufferTransport::kNone), "None"},
      {TransportToString(BufferTransport::kDma), "DMA"},
      {TransportToString(BufferTransport::kOtf), "OTF"},
      {TransportToString(BufferTransport::kOpaque), "Opaque"},
      {TransportToString(static_cast<BufferTransport>(6)), "Unknown"},
      {AccessToString(BufferAccess::kCpu), "CPU"},
      {AccessToString(BufferAccess::kGpu), "GPU"},
      {AccessToString(static_cast<BufferAccess>(200)), "Unknown"},
      {SecurityToString(BufferSecurity::kNone), "None"},
      {SecurityToString(static_cast<BufferSecurity>(7)), "Secure"},
      {CachedToString(BufferCached::kCached), "Cached"},
      {CachedToString(static_cast<BufferCached>(9)), "UnCached"},
      {CompressionToString(BufferCompression::kJpeg), "JPEG"},
      {CompressionToString(BufferCompression::kSbwcLossyMedium), "Lossy SBWC Medium Compression"},
      {CompressionToString(static_cast<BufferCompression>(7)), "Unknown"},
      {AccessModeToString(BufferAccessMode::kReadWrite), "ReadWrite"},
  };
  for (const auto& [got, want] : cases) EXPECT_EQ(got, want);
  BufferAttributes a{BufferTransport::kHeap, BufferAccess::kCpu, BufferSecurity::kNone,
                     BufferCached::kUnCached, BufferCompression::kSbwc};
  EXPECT_EQ(BufferAttributesToString(a),
            "Transport: Heap, Access: CPU, Security: None, Cached: UnCached, Compression: SBWC");
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
