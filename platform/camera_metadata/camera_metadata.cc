#include "camera/CameraMetadata.h"

#include <utility>

namespace android {
namespace nuvora_camera_hal {
namespace {

template <typename T, typename Map>
MetadataEntryView<T> Lookup(const Map& entries, uint32_t tag) {
  const auto it = entries.find(tag);
  if (it == entries.end()) return {};
  const auto* values = std::get_if<std::shared_ptr<const std::vector<T>>>(&it->second);
  if (values == nullptr || (*values)->empty()) return {};
  return MetadataEntryView<T>(*values, (*values)->data(), (*values)->size());
}

}  // namespace

CameraMetadata::~CameraMetadata() = default;

InMemoryCameraMetadata::InMemoryCameraMetadata() = default;
InMemoryCameraMetadata::~InMemoryCameraMetadata() = default;
// Copies share the immutable value arrays; a later Set on either object
// replaces its own entry only.
InMemoryCameraMetadata::InMemoryCameraMetadata(const InMemoryCameraMetadata&) = default;
InMemoryCameraMetadata& InMemoryCameraMetadata::operator=(const InMemoryCameraMetadata&) = default;
InMemoryCameraMetadata::InMemoryCameraMetadata(InMemoryCameraMetadata&&) noexcept = default;
InMemoryCameraMetadata& InMemoryCameraMetadata::operator=(InMemoryCameraMetadata&&) noexcept =
    default;

MetadataEntryView<uint8_t> InMemoryCameraMetadata::GetUint8Entry(uint32_t tag) const {
  return Lookup<uint8_t>(entries_, tag);
}

MetadataEntryView<int32_t> InMemoryCameraMetadata::GetInt32Entry(uint32_t tag) const {
  return Lookup<int32_t>(entries_, tag);
}

void InMemoryCameraMetadata::SetUint8(uint32_t tag, std::vector<uint8_t> values) {
  entries_[tag] = std::make_shared<const std::vector<uint8_t>>(std::move(values));
}

void InMemoryCameraMetadata::SetInt32(uint32_t tag, std::vector<int32_t> values) {
  entries_[tag] = std::make_shared<const std::vector<int32_t>>(std::move(values));
}

bool InMemoryCameraMetadata::Erase(uint32_t tag) { return entries_.erase(tag) != 0; }

bool InMemoryCameraMetadata::Contains(uint32_t tag) const { return entries_.contains(tag); }

size_t InMemoryCameraMetadata::size() const { return entries_.size(); }

}  // namespace nuvora_camera_hal
}  // namespace android
