#ifndef ORVEX_API_CAMERA_TUNING_H_
#define ORVEX_API_CAMERA_TUNING_H_

// Abstract tuning and tuning-metadata interfaces of the camera stack. The
// stack implements them; the library fixes their shape: every class has its
// virtual destructor first, then its pure operations in the order declared
// below (that order is the slot order). TuningPoint, which carries a
// completion fence, is in tuning_point.h.
//
// Thread safety: that of the implementations. TuningPointOpaqueMetadata is a
// value holder: const access from several threads is safe.

#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>

#include "orvex/api/math/generic_types.h"
#include "orvex/base/export.h"

namespace orvex {

class TuningPoint;

// Root of the camera stack's tuning data; no operation of its own.
class ORVEX_EXPORT TuningBase {
 public:
  virtual ~TuningBase();
};

class ORVEX_EXPORT TuningBlock {
 public:
  virtual ~TuningBlock();
  // Slot 1.
  virtual uint32_t GetBlockId() const = 0;
};

// Lens shading correction tuning.
class ORVEX_EXPORT LscTuningBlock : public TuningBlock {
 public:
  ~LscTuningBlock() override;
  // Slots 2 and 3, after TuningBlock's.
  virtual GenericSize<int> GetGridSize() const = 0;
  // The gain grid of one colour channel, row by row.
  virtual std::span<const float> GetGainTable(int channel) const = 0;
};

class ORVEX_EXPORT TuningBundle {
 public:
  virtual ~TuningBundle();
  // Slots 1 and 2. FindBlock returns null for an unknown block.
  virtual std::shared_ptr<const TuningBlock> FindBlock(uint32_t block_id) const = 0;
  virtual size_t GetBlockCount() const = 0;
};

// Metadata that the tuning side passes through without reading it.
class ORVEX_EXPORT OpaqueMetadata {
 public:
  virtual ~OpaqueMetadata();
};

// Opaque metadata that keeps one tuning point alive; the point is released
// when the metadata is destroyed.
class ORVEX_EXPORT TuningPointOpaqueMetadata : public OpaqueMetadata {
 public:
  explicit TuningPointOpaqueMetadata(std::shared_ptr<TuningPoint> tuning_point);
  ~TuningPointOpaqueMetadata() override;

  const std::shared_ptr<TuningPoint>& tuning_point() const { return tuning_point_; }

 private:
  std::shared_ptr<TuningPoint> tuning_point_;
};

class ORVEX_EXPORT TuningMetadata {
 public:
  virtual ~TuningMetadata();
};

class ORVEX_EXPORT TuningPointMetadata {
 public:
  virtual ~TuningPointMetadata();
};

class ORVEX_EXPORT TuningInputMetadata {
 public:
  virtual ~TuningInputMetadata();
};

class ORVEX_EXPORT TuningOutputMetadata {
 public:
  virtual ~TuningOutputMetadata();
};

// The metadata of one frame's tuning pass.
class ORVEX_EXPORT TuningMetadataBundle {
 public:
  virtual ~TuningMetadataBundle();
  // Slots 1 to 9.
  virtual std::shared_ptr<TuningInputMetadata> GetInputMetadata() const = 0;
  virtual std::shared_ptr<TuningOutputMetadata> GetOutputMetadata() const = 0;
  virtual std::shared_ptr<TuningPointMetadata> GetPointMetadata() const = 0;
  virtual std::shared_ptr<OpaqueMetadata> GetOpaqueMetadata() const = 0;
  virtual void SetInputMetadata(std::shared_ptr<TuningInputMetadata> metadata) = 0;
  virtual void SetOutputMetadata(std::shared_ptr<TuningOutputMetadata> metadata) = 0;
  virtual void SetPointMetadata(std::shared_ptr<TuningPointMetadata> metadata) = 0;
  virtual void SetOpaqueMetadata(std::shared_ptr<OpaqueMetadata> metadata) = 0;
  virtual void Clear() = 0;
};

}  // namespace orvex

#endif  // ORVEX_API_CAMERA_TUNING_H_
