#include "orvex/api/memory/buffer_attributes.h"

#include <array>

#include "fmt/format.h"

namespace orvex {
namespace {

constexpr std::string_view kUnknown = "Unknown";

template <size_t N, typename E>
std::string_view Lookup(const std::array<std::string_view, N>& names, E value) {
  const auto index = static_cast<size_t>(value);
  return index < N ? names[index] : kUnknown;
}

}  // namespace

std::string_view TransportToString(BufferTransport transport) {
  static constexpr std::array<std::string_view, 6> kNames = {"None", "Heap",    "DMA",
                                                             "OTF",  "Foreign", "Opaque"};
  return Lookup(kNames, transport);
}

std::string_view AccessToString(BufferAccess access) {
  static constexpr std::array<std::string_view, 3> kNames = {"None", "CPU", "GPU"};
  return Lookup(kNames, access);
}

std::string_view SecurityToString(BufferSecurity security) {
  return security == BufferSecurity::kNone ? "None" : "Secure";
}

std::string_view CachedToString(BufferCached cached) {
  return cached == BufferCached::kCached ? "Cached" : "UnCached";
}

std::string_view CompressionToString(BufferCompression compression) {
  static constexpr std::array<std::string_view, 7> kNames = {"None",
                                                             "SBWC",
                                                             "AFBC",
                                                             "JPEG",
                                                             "Lossy SBWC Low Compression",
                                                             "Lossy SBWC Medium Compression",
                                                             "Lossy SBWC High Compression"};
  return Lookup(kNames, compression);
}

std::string_view AccessModeToString(BufferAccessMode mode) {
  static constexpr std::array<std::string_view, 3> kNames = {"Read", "Write", "ReadWrite"};
  return Lookup(kNames, mode);
}

std::string BufferAttributesToString(const BufferAttributes& attributes) {
  return fmt::format("Transport: {}, Access: {}, Security: {}, Cached: {}, Compression: {}",
                     TransportToString(attributes.transport), AccessToString(attributes.access),
                     SecurityToString(attributes.security), CachedToString(attributes.cached),
                     CompressionToString(attributes.compression));
}

}  // namespace orvex
