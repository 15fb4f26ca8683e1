#ifndef ORVEX_API_ALGO_ALGORITHM_H_
#define ORVEX_API_ALGO_ALGORITHM_H_

// The interfaces through which the camera stack drives its algorithms: the
// common base Algorithm and one derived interface per algorithm family.
//
// Slot order (declaration order below): Algorithm has its virtual destructor,
// then StartSession, Flush, EndSession, GetName, GetVersion. Each family
// interface keeps those five slots and appends its own pure operations in
// the order declared. The five 3A/saliency interfaces implement Flush and
// EndSession by forwarding to their first and second own operations (for
// example AutoExposureInterface::Flush(id) returns FlushAe(id)), so an
// algorithm implements its family's pair and inherits Flush and EndSession,
// or overrides them directly. ActuatorTuningInterface's Flush and
// EndSession do nothing and return OK.
//
// Session identifiers are chosen by the camera stack. Thread safety is that
// of the implementations.

#include <cstdint>
#include <memory>
#include <span>
#include <string_view>

#include "camera/CameraMetadata.h"
#include "orvex/api/algo/supported_vendor_tags.h"
#include "orvex/base/export.h"
#include "orvex/status/status.h"
#include "orvex/status/statusor.h"

namespace orvex_api {

class ORVEX_EXPORT Algorithm {
 public:
  virtual ~Algorithm();

  virtual orvex::Status StartSession(unsigned int session_id) = 0;
  // Drops the session's pending work.
  virtual orvex::Status Flush(unsigned int session_id) = 0;
  virtual orvex::Status EndSession(unsigned int session_id) = 0;
  virtual std::string_view GetName() const = 0;
  virtual uint32_t GetVersion() const = 0;
};

class ORVEX_EXPORT AutoExposureInterface : public Algorithm {
 public:
  ~AutoExposureInterface() override;
  // FlushAe(session_id) and EndAeSession(session_id).
  orvex::Status Flush(unsigned int session_id) override;
  orvex::Status EndSession(unsigned int session_id) override;

  virtual orvex::Status FlushAe(unsigned int session_id) = 0;
  virtual orvex::Status EndAeSession(unsigned int session_id) = 0;
  virtual orvex::Status ConfigureAe(
      unsigned int session_id,
      const android::nuvora_camera_hal::CameraMetadata& static_metadata) = 0;
  virtual orvex::Status ProcessAeRequest(
      unsigned int session_id, uint64_t frame_number,
      const android::nuvora_camera_hal::CameraMetadata& request) = 0;
  virtual orvex::Status ProcessAeStatistics(unsigned int session_id, uint64_t frame_number,
                                            std::span<const uint8_t> statistics) = 0;
  virtual orvex::StatusOr<std::shared_ptr<const android::nuvora_camera_hal::CameraMetadata>>
  GetAeResult(unsigned int session_id, uint64_t frame_number) = 0;
  virtual const SupportedVendorTagSet& GetAeSupportedVendorTags() const = 0;
};

class ORVEX_EXPORT AutoFocusInterface : public Algorithm {
 public:
  ~AutoFocusInterface() override;
  // FlushAf(session_id) and EndAfSession(session_id).
  orvex::Status Flush(unsigned int session_id) override;
  orvex::Status EndSession(unsigned int session_id) override;

  virtual orvex::Status FlushAf(unsigned int session_id) = 0;
  virtual orvex::Status EndAfSession(unsigned int session_id) = 0;
  virtual orvex::Status ConfigureAf(
      unsigned int session_id,
      const android::nuvora_camera_hal::CameraMetadata& static_metadata) = 0;
  virtual orvex::Status ProcessAfRequest(
      unsigned int session_id, uint64_t frame_number,
      const android::nuvora_camera_hal::CameraMetadata& request) = 0;
  virtual orvex::Status ProcessAfStatistics(unsigned int session_id, uint64_t frame_number,
                                            std::span<const uint8_t> statistics) = 0;
  virtual orvex::StatusOr<std::shared_ptr<const android::nuvora_camera_hal::CameraMetadata>>
  GetAfResult(unsigned int session_id, uint64_t frame_number) = 0;
  virtual const SupportedVendorTagSet& GetAfSupportedVendorTags() const = 0;
};

class ORVEX_EXPORT AutoSceneDetectionInterface : public Algorithm {
 public:
  ~AutoSceneDetectionInterface() override;
  // FlushAsd(session_id) and EndAsdSession(session_id).
  orvex::Status Flush(unsigned int session_id) override;
  orvex::Status EndSession(unsigned int session_id) override;

  virtual orvex::Status FlushAsd(unsigned int session_id) = 0;
  virtual orvex::Status EndAsdSession(unsigned int session_id) = 0;
  virtual orvex::Status ConfigureAsd(
      unsigned int session_id,
      const android::nuvora_camera_hal::CameraMetadata& static_metadata) = 0;
  virtual orvex::Status ProcessAsdFrame(
      unsigned int session_id, uint64_t frame_number,
      const android::nuvora_camera_hal::CameraMetadata& frame_metadata) = 0;
  virtual orvex::StatusOr<std::shared_ptr<const android::nuvora_camera_hal::CameraMetadata>>
  GetAsdResult(unsigned int session_id, uint64_t frame_number) = 0;
};

class ORVEX_EXPORT AutoWhiteBalanceInterface : public Algorithm {
 public:
  ~AutoWhiteBalanceInterface() override;
  // FlushAwb(session_id) and EndAwbSession(session_id).
  orvex::Status Flush(unsigned int session_id) override;
  orvex::Status EndSession(unsigned int session_id) override;

  virtual orvex::Status FlushAwb(unsigned int session_id) = 0;
  virtual orvex::Status EndAwbSession(unsigned int session_id) = 0;
  virtual orvex::Status ConfigureAwb(
      unsigned int session_id,
      const android::nuvora_camera_hal::CameraMetadata& static_metadata) = 0;
  virtual orvex::Status ProcessAwbStatistics(unsigned int session_id, uint64_t frame_number,
                                             std::span<const uint8_t> statistics) = 0;
  virtual orvex::StatusOr<std::shared_ptr<const android::nuvora_camera_hal::CameraMetadata>>
  GetAwbResult(unsigned int session_id, uint64_t frame_number) = 0;
  virtual const SupportedVendorTagSet& GetAwbSupportedVendorTags() const = 0;
};

class ORVEX_EXPORT SaliencyInterface : public Algorithm {
 public:
  ~SaliencyInterface() override;
  // FlushSaliency(session_id) and EndSaliencySession(session_id).
  orvex::Status Flush(unsigned int session_id) override;
  orvex::Status EndSession(unsigned int session_id) override;

  virtual orvex::Status FlushSaliency(unsigned int session_id) = 0;
  virtual orvex::Status EndSaliencySession(unsigned int session_id) = 0;
  virtual orvex::Status ConfigureSaliency(
      unsigned int session_id,
      const android::nuvora_camera_hal::CameraMetadata& static_metadata) = 0;
  virtual orvex::Status ProcessSaliencyRequest(
      unsigned int session_id, uint64_t frame_number,
      const android::nuvora_camera_hal::CameraMetadata& request) = 0;
  virtual orvex::Status ProcessSaliencyFrame(unsigned int session_id, uint64_t frame_number,
                                             std::span<const uint8_t> frame) = 0;
  virtual orvex::StatusOr<std::shared_ptr<const android::nuvora_camera_hal::CameraMetadata>>
  GetSaliencyResult(unsigned int session_id, uint64_t frame_number) = 0;
};

class ORVEX_EXPORT ActuatorTuningInterface : public Algorithm {
 public:
  ~ActuatorTuningInterface() override;
  // Do nothing; return OK.
  orvex::Status Flush(unsigned int session_id) override;
  orvex::Status EndSession(unsigned int session_id) override;

  virtual orvex::Status SetActuatorPosition(unsigned int session_id, int32_t position) = 0;
  virtual orvex::StatusOr<int32_t> GetActuatorPosition(unsigned int session_id) const = 0;
};

}  // namespace orvex_api

#endif  // ORVEX_API_ALGO_ALGORITHM_H_
