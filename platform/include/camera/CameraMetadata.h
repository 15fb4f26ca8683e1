#ifndef ORVEX_PLATFORM_CAMERA_CAMERA_METADATA_H_
#define ORVEX_PLATFORM_CAMERA_CAMERA_METADATA_H_

// Host stand-in for the camera stack's metadata interface: the typed entry
// lookups that liborvex_base calls, and an in-memory implementation for tests
// and embedding code. On a device the camera stack supplies its own
// implementation of the interface.
//
// A lookup returns a MetadataEntryView: a read-only array that shares
// ownership of its storage, so it stays valid after the metadata object
// changes the entry or is destroyed. An absent tag, or a tag whose values are
// of another type, gives an empty view.
//
// Thread safety: const operations of InMemoryCameraMetadata may run
// concurrently; a mutation must not overlap any other call on the same
// object. Views are independent values.

#include <cstddef>
#include <cstdint>
#include <map>
#include <memory>
#include <span>
#include <utility>
#include <variant>
#include <vector>

namespace android {
namespace nuvora_camera_hal {

// A shared, read-only view of the values of one metadata entry: an owner that
// keeps the storage alive, a data pointer and a count.
template <typename T>
class MetadataEntryView {
 public:
  MetadataEntryView() = default;
  MetadataEntryView(std::shared_ptr<const void> owner, const T* data, size_t count)
      : owner_(std::move(owner)), data_(data), count_(data == nullptr ? 0 : count) {}

  const T* data() const { return data_; }
  size_t size() const { return count_; }
  bool empty() const { return count_ == 0; }
  // Precondition: index < size().
  const T& operator[](size_t index) const { return data_[index]; }
  const T* begin() const { return data_; }
  const T* end() const { return data_ + count_; }
  std::span<const T> span() const { return {data_, count_}; }

 private:
  std::shared_ptr<const void> owner_;
  const T* data_ = nullptr;
  size_t count_ = 0;
};

class __attribute__((visibility("default"))) CameraMetadata {
 public:
  virtual ~CameraMetadata();

  // The unsigned 8-bit values of `tag`; empty when the tag is absent, holds
  // no values, or holds values of another type.
  virtual MetadataEntryView<uint8_t> GetUint8Entry(uint32_t tag) const = 0;
  // The signed 32-bit values of `tag`; empty as above.
  virtual MetadataEntryView<int32_t> GetInt32Entry(uint32_t tag) const = 0;
};

// CameraMetadata held in memory: a map from tag to a typed array of values.
class __attribute__((visibility("default"))) InMemoryCameraMetadata final : public CameraMetadata {
 public:
  InMemoryCameraMetadata();
  ~InMemoryCameraMetadata() override;
  InMemoryCameraMetadata(const InMemoryCameraMetadata&);
  InMemoryCameraMetadata& operator=(const InMemoryCameraMetadata&);
  InMemoryCameraMetadata(InMemoryCameraMetadata&&) noexcept;
  InMemoryCameraMetadata& operator=(InMemoryCameraMetadata&&) noexcept;

  MetadataEntryView<uint8_t> GetUint8Entry(uint32_t tag) const override;
  MetadataEntryView<int32_t> GetInt32Entry(uint32_t tag) const override;

  // Sets the entry of `tag`, replacing any earlier entry (of either type).
  // An empty vector makes an entry that exists with zero values. Views
  // taken earlier keep the earlier values.
  void SetUint8(uint32_t tag, std::vector<uint8_t> values);
  void SetInt32(uint32_t tag, std::vector<int32_t> values);
  // Removes the entry of `tag`; returns whether there was one.
  bool Erase(uint32_t tag);
  bool Contains(uint32_t tag) const;
  // The number of entries.
  size_t size() const;

 private:
  using Entry = std::variant<std::shared_ptr<const std::vector<uint8_t>>,
                             std::shared_ptr<const std::vector<int32_t>>>;
  std::map<uint32_t, Entry> entries_;
};

}  // namespace nuvora_camera_hal
}  // namespace android

#endif  // ORVEX_PLATFORM_CAMERA_CAMERA_METADATA_H_
