#ifndef ORVEX_API_MEMORY_BUFFER_ATTRIBUTES_H_
#define ORVEX_API_MEMORY_BUFFER_ATTRIBUTES_H_

// The attribute vocabulary of buffers: where the memory lives, which
// processor touches it, whether it is protected or cached, and how its
// contents are compressed; with their text forms.
//
// Every text function returns a view of static text. A value outside an
// enumeration's table reads as "Unknown" (except security and cached, where
// any non-zero byte reads as "Secure" and "UnCached").
//
// Thread safety: pure functions and plain values.

#include <cstdint>
#include <string>
#include <string_view>

#include "orvex/base/export.h"

namespace orvex {

enum class BufferTransport : uint8_t {
  kNone = 0,
  kHeap = 1,
  kDma = 2,
  kOtf = 3,
  kForeign = 4,
  kOpaque = 5,
};

enum class BufferAccess : uint8_t {
  kNone = 0,
  kCpu = 1,
  kGpu = 2,
};

enum class BufferSecurity : uint8_t {
  kNone = 0,
  kSecure = 1,
};

enum class BufferCached : uint8_t {
  kCached = 0,
  kUnCached = 1,
};

// SBWC is lossless at kSbwc and lossy at the three kSbwcLossy values; AFBC
// is Arm frame buffer compression.
enum class BufferCompression : uint8_t {
  kNone = 0,
  kSbwc = 1,
  kAfbc = 2,
  kJpeg = 3,
  kSbwcLossyLow = 4,
  kSbwcLossyMedium = 5,
  kSbwcLossyHigh = 6,
};

// The kind of CPU access requested when mapping. The order is relied on:
// read maps read-only, write maps write-only, read-write maps both.
enum class BufferAccessMode : int32_t {
  kRead = 0,
  kWrite = 1,
  kReadWrite = 2,
};

// Five one-byte fields, in this order.
struct BufferAttributes {
  BufferTransport transport = BufferTransport::kNone;
  BufferAccess access = BufferAccess::kNone;
  BufferSecurity security = BufferSecurity::kNone;
  BufferCached cached = BufferCached::kCached;
  BufferCompression compression = BufferCompression::kNone;

  friend bool operator==(const BufferAttributes&, const BufferAttributes&) = default;
};

ORVEX_EXPORT std::string_view TransportToString(BufferTransport transport);
ORVEX_EXPORT std::string_view AccessToString(BufferAccess access);
ORVEX_EXPORT std::string_view SecurityToString(BufferSecurity security);
ORVEX_EXPORT std::string_view CachedToString(BufferCached cached);
ORVEX_EXPORT std::string_view CompressionToString(BufferCompression compression);
// "Read", "Write", "ReadWrite".
ORVEX_EXPORT std::string_view AccessModeToString(BufferAccessMode mode);

// "Transport: {}, Access: {}, Security: {}, Cached: {}, Compression: {}".
ORVEX_EXPORT std::string BufferAttributesToString(const BufferAttributes& attributes);

// True exactly for kSbwc.
constexpr bool IsSbwcLosslessCompression(BufferCompression c) {
  return c == BufferCompression::kSbwc;
}
// True exactly for the three lossy SBWC values.
constexpr bool IsSbwcLossyCompression(BufferCompression c) {
  return c == BufferCompression::kSbwcLossyLow || c == BufferCompression::kSbwcLossyMedium ||
         c == BufferCompression::kSbwcLossyHigh;
}
// Lossless or lossy SBWC.
constexpr bool IsSbwcBufferCompression(BufferCompression c) {
  return IsSbwcLosslessCompression(c) || IsSbwcLossyCompression(c);
}

}  // namespace orvex

#endif  // ORVEX_API_MEMORY_BUFFER_ATTRIBUTES_H_
