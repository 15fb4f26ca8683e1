#ifndef ORVEX_API_ALGO_DATA_TYPES_LOCAL_TONE_MAPPING_DATA_V1_H_
#define ORVEX_API_ALGO_DATA_TYPES_LOCAL_TONE_MAPPING_DATA_V1_H_

// Result of a local tone-mapping algorithm in a resolution-independent form:
// a coarse 3-D grid of affine coefficients (a slope and a bias per spatial
// cell and intensity bin, IEEE binary16 elements) and a guide curve (32-bit
// floats) that maps an input intensity to a position on the grid's
// intensity axis.
//
// Example:
//
//   ORVEX_ASSIGN_OR_RETURN(auto ltm, orvex::HeapAllocateLocalToneMappingDataV1());
//   ltm->SetIdentity();
//   std::vector<float> gains(257);
//   ORVEX_RETURN_IF_ERROR(ltm->GetGlobalToneMap(257, gains.data()));
//
// Thread safety: no internal locking. GetGlobalToneMap only reads, so
// concurrent calls are safe while nobody writes the grid or guide curve.

#include <cstdint>
#include <memory>

#include "orvex/base/export.h"
#include "orvex/status/status.h"
#include "orvex/status/statusor.h"

namespace orvex {

struct ORVEX_EXPORT LocalToneMappingDataV1 {
  // Shape and element layout of the grid. The slope of cell (x, y) in bin d
  // is element stride_x*x + stride_y*y + stride_z*d; its bias follows after
  // stride_channel elements. The defaults describe a bin-major, row, column
  // layout with slope and bias interleaved.
  struct GridDesc {
    int32_t width = 16;
    int32_t height = 12;
    int32_t depth = 8;
    int32_t channels = 2;  // 0 = slope, 1 = bias
    int32_t stride_x = 2;
    int32_t stride_y = 32;
    int32_t stride_z = 384;
    int32_t stride_channel = 1;
    int32_t element_size = 2;  // bytes per element

    // width * height * depth * channels * element_size bytes (the strides
    // are not taken into account); 6144 for the defaults.
    int64_t GetBufferSize() const;
  };

  struct GuideCurveDesc {
    int32_t num_entries = 128;
    int32_t entry_size = 4;  // bytes per entry

    // num_entries * entry_size bytes; 512 for the defaults.
    int64_t GetBufferSize() const;
  };

  // Grid storage of binary16 elements, addressed through desc's strides.
  // The library's heap grid holds desc.GetBufferSize() bytes of the default
  // description; any other implementation's storage must cover every element
  // its strides address (padded rows and bins are fine).
  class ORVEX_EXPORT Grid {
   public:
    virtual ~Grid();
    virtual void* GetPointer() = 0;
    virtual const void* GetPointer() const = 0;

    GridDesc desc;
  };

  // Guide-curve storage: desc.num_entries 32-bit floats, which any
  // implementation's storage must hold.
  class ORVEX_EXPORT GuideCurve {
   public:
    virtual ~GuideCurve();
    virtual void* GetPointer() = 0;
    virtual const void* GetPointer() const = 0;

    GuideCurveDesc desc;
  };

  // Sets every slope to 1.0, every bias to 0 and every guide-curve entry to
  // 1.0. Requires a grid of binary16 elements with at least two channels and
  // no negative stride, and a float guide curve; for the heap storage, the
  // descriptions must stay inside the allocation (fatal otherwise).
  void SetIdentity();

  // Reduces the grid to one global tone curve and writes it as gains:
  // gain_lut[i] for i in [0, n) such that input level t = i / (n - 1) maps
  // to output t * gain_lut[i]; gain_lut[0] is 1.0. The curve is made
  // strictly rising (by at least 1e-6 per entry).
  //
  // Returns INVALID_ARGUMENT, leaving gain_lut untouched, for an element size
  // other than 2, an entry size other than 4, missing storage, a channel
  // count other than 2, n < 1, an empty grid or guide curve, a negative
  // stride, or heap storage that the descriptions outrun. `gain_lut` must
  // not be null (checked, fatal) and must hold n entries.
  Status GetGlobalToneMap(int n, float* gain_lut) const;

  std::shared_ptr<Grid> grid;
  std::shared_ptr<GuideCurve> guide_curve;
};

// A new LocalToneMappingDataV1 over heap storage with the default grid
// (6144 bytes) and guide curve (512 bytes) descriptions. The storage is not
// initialised: fill it or call SetIdentity(). Always succeeds.
ORVEX_EXPORT StatusOr<std::unique_ptr<LocalToneMappingDataV1>> HeapAllocateLocalToneMappingDataV1();

// binary16 <-> binary32 conversions used for grid elements. Float to half
// rounds to nearest even; out-of-range values become infinities; NaN stays
// NaN.
ORVEX_EXPORT float HalfToFloat(uint16_t half);
ORVEX_EXPORT uint16_t FloatToHalf(float value);

}  // namespace orvex

#endif  // ORVEX_API_ALGO_DATA_TYPES_LOCAL_TONE_MAPPING_DATA_V1_H_
