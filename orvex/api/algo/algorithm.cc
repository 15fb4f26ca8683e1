#include "orvex/api/algo/algorithm.h"

namespace orvex_api {

Algorithm::~Algorithm() = default;

AutoExposureInterface::~AutoExposureInterface() = default;
orvex::Status AutoExposureInterface::Flush(unsigned int session_id) { return FlushAe(session_id); }
orvex::Status AutoExposureInterface::EndSession(unsigned int session_id) {
  return EndAeSession(session_id);
}

AutoFocusInterface::~AutoFocusInterface() = default;
orvex::Status AutoFocusInterface::Flush(unsigned int session_id) { return FlushAf(session_id); }
orvex::Status AutoFocusInterface::EndSession(unsigned int session_id) {
  return EndAfSession(session_id);
}

AutoSceneDetectionInterface::~AutoSceneDetectionInterface() = default;
orvex::Status AutoSceneDetectionInterface::Flush(unsigned int session_id) {
  return FlushAsd(session_id);
}
orvex::Status AutoSceneDetectionInterface::EndSession(unsigned int session_id) {
  return EndAsdSession(session_id);
}

AutoWhiteBalanceInterface::~AutoWhiteBalanceInterface() = default;
orvex::Status AutoWhiteBalanceInterface::Flush(unsigned int session_id) {
  return FlushAwb(session_id);
}
orvex::Status AutoWhiteBalanceInterface::EndSession(unsigned int session_id) {
  return EndAwbSession(session_id);
}

SaliencyInterface::~SaliencyInterface() = default;
orvex::Status SaliencyInterface::Flush(unsigned int session_id) {
  return FlushSaliency(session_id);
}
orvex::Status SaliencyInterface::EndSession(unsigned int session_id) {
  return EndSaliencySession(session_id);
}

ActuatorTuningInterface::~ActuatorTuningInterface() = default;
orvex::Status ActuatorTuningInterface::Flush(unsigned int /*session_id*/) {
  return orvex::OkStatus();
}
orvex::Status ActuatorTuningInterface::EndSession(unsigned int /*session_id*/) {
  return orvex::OkStatus();
}

}  // namespace orvex_api
