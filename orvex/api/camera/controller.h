#ifndef ORVEX_API_CAMERA_CONTROLLER_H_
#define ORVEX_API_CAMERA_CONTROLLER_H_

// Controller identifiers with their printed names, and the abstract
// controller interfaces through which the camera stack passes its
// controllers around. The stack implements the interfaces; the library fixes
// their shape: every class has its virtual destructor first, then its pure
// operations in the order declared below (that order is the slot order).
//
// Thread safety: ControllerId printing is pure. The interfaces' thread
// safety is that of their implementations.

#include <cstdint>
#include <memory>
#include <ostream>
#include <string>
#include <string_view>

#include "orvex/base/export.h"
#include "orvex/status/status.h"
#include "orvex/status/statusor.h"

namespace orvex {

class TuningBase;
class TuningBlock;
class TuningBundle;
class TuningMetadataBundle;
class TuningPoint;

// Controllers of the camera stack, numbered from 1.
enum class ControllerId : int32_t {
  kActuator = 1,
  kAdaptiveStream = 2,
  kAutoCalibration = 3,
  kAutoExposure = 4,
  kAutoFocus = 5,
  kAutoSceneDetection = 6,
  kAutoWhiteBalance = 7,
  kBackend = 8,
  kBlurRefinement = 9,
  kBufferManagement = 10,
  kCalibrationData = 11,
  kCameraInterface = 12,
  kCameraParameterInterpolation = 13,
  kDisparityPostprocessing = 14,
  kDynamicShadingCorrection = 15,
  kElectronicImageStabilization = 16,
  kEncoderCameraOptimization = 17,
  kEntropyAwareFiltering = 18,
  kEnvironmentSensor = 19,
  kFaceDetection = 20,
  kFlash = 21,
  kGpuPower = 22,
  kIlk = 23,
  kJpegCompression = 24,
  kLocalToneMappingPostprocessingV1 = 25,
  kLocalToneMappingV1 = 26,
  kMeshWarp = 27,
  kModelSpecificData = 28,
  kMotionEstimation = 29,
  kMotionSensor = 30,
  kOpticalImageStabilization = 31,
  kPhaseDetection = 32,
  kPowerThrottling = 33,
  kRawPreprocessing = 34,
  kRawToYuv = 35,
  kOrtholine = 36,
  kSaliency = 37,
  kScaler = 38,
  kSegmentation = 39,
  kSensor = 40,
  kStatistics = 41,
  kCalmview = 42,
  kStreamInterface = 43,
  kTemporalNoiseReductionAlignment = 44,
  kTemporalNoiseReductionMerging = 45,
  kTuning = 46,
  kTuningDump = 47,
  kMulticam = 48,
  kRoiTracking = 49,
  kVideoBokeh = 50,
};

// The controller's name, e.g. "auto exposure"; empty outside 1 to 50.
ORVEX_EXPORT std::string_view ControllerIdName(ControllerId id);

// Writes the name followed by " controller" ("auto exposure controller");
// an identifier outside 1 to 50 writes only " controller".
ORVEX_EXPORT std::ostream& operator<<(std::ostream& os, ControllerId id);

// Per-frame context handed to a DyscoController.
class ORVEX_EXPORT DyscoContext {
 public:
  virtual ~DyscoContext();
  // Slot 1.
  virtual int64_t GetFrameNumber() const = 0;
};

class ORVEX_EXPORT Controller {
 public:
  virtual ~Controller();
  // Slot 1: which controller this is.
  virtual ControllerId GetControllerId() const = 0;
};

class ORVEX_EXPORT DyscoController : public Controller {
 public:
  ~DyscoController() override;
  // Slots 2 and 3, after Controller's.
  virtual Status Configure(const DyscoContext& context) = 0;
  virtual Status Process(const DyscoContext& context) = 0;
};

class ORVEX_EXPORT TuningController : public Controller {
 public:
  ~TuningController() override;
  // Slots 2 to 11, after Controller's.
  virtual Status LoadTuning(std::shared_ptr<const TuningBase> tuning) = 0;
  virtual Status UnloadTuning() = 0;
  virtual Status BeginFrame(int64_t frame_number) = 0;
  virtual Status EndFrame(int64_t frame_number) = 0;
  virtual StatusOr<std::shared_ptr<const TuningBundle>> GetTuningBundle(
      int64_t frame_number) const = 0;
  virtual StatusOr<std::shared_ptr<TuningMetadataBundle>> GetMetadataBundle(
      int64_t frame_number) const = 0;
  virtual Status SubmitTuningPoint(std::shared_ptr<TuningPoint> point) = 0;
  virtual StatusOr<std::shared_ptr<const TuningBlock>> GetTuningBlock(uint32_t block_id) const = 0;
  virtual Status FlushTuning() = 0;
  virtual std::string GetTuningVersion() const = 0;
};

class ORVEX_EXPORT TuningDumpController : public Controller {
 public:
  ~TuningDumpController() override;
  // Slots 2 and 3, after Controller's.
  virtual Status SetDumpEnabled(bool enabled) = 0;
  virtual Status Dump(int64_t frame_number, std::string_view directory) = 0;
};

}  // namespace orvex

#endif  // ORVEX_API_CAMERA_CONTROLLER_H_
