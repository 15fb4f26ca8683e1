#ifndef ORVEX_API_ALGO_SUPPORTED_VENDOR_TAGS_H_
#define ORVEX_API_ALGO_SUPPORTED_VENDOR_TAGS_H_

// The fixed sets of vendor tags that each 3A algorithm family supports.
// Identifiers of the 0x84000000 block are this library's own tags (see
// orvex/api/camera/vendor_tags.h); the 0x83000000 block belongs to another
// component of the camera stack. An identifier may appear in several sets
// but at most once within one set.
//
// Thread safety: the objects are read-only after construction.

#include <array>
#include <cstddef>
#include <cstdint>

#include "orvex/base/export.h"

namespace orvex_api {

class ORVEX_EXPORT SupportedVendorTagSet {
 public:
  virtual ~SupportedVendorTagSet();
};

// A set held as one fixed array of N identifiers, in the order given.
template <size_t N>
class FixedVendorTagSet : public SupportedVendorTagSet {
 public:
  static constexpr size_t kCount = N;
  const std::array<uint32_t, N>& tags() const { return tags_; }

 protected:
  explicit FixedVendorTagSet(const std::array<uint32_t, N>& tags) : tags_(tags) {}

 private:
  std::array<uint32_t, N> tags_;
};

// Auto exposure: 31 identifiers.
class ORVEX_EXPORT AeVendorTagsV1 : public FixedVendorTagSet<31> {
 public:
  AeVendorTagsV1();
  ~AeVendorTagsV1() override;
};

// Auto focus: 34 identifiers.
class ORVEX_EXPORT AfVendorTagsV1 : public FixedVendorTagSet<34> {
 public:
  AfVendorTagsV1();
  ~AfVendorTagsV1() override;
};

// Auto white balance: 27 identifiers.
class ORVEX_EXPORT AwbVendorTagsV1 : public FixedVendorTagSet<27> {
 public:
  AwbVendorTagsV1();
  ~AwbVendorTagsV1() override;
};

}  // namespace orvex_api

#endif  // ORVEX_API_ALGO_SUPPORTED_VENDOR_TAGS_H_
