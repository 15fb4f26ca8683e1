#include "orvex/api/camera/controller.h"

#include <array>

namespace orvex {
namespace {

using namespace std::string_view_literals;

// Indexed by identifier - 1.
constexpr std::array kControllerNames = {
    "actuator"sv,
    "adaptive stream"sv,
    "auto calibration"sv,
    "auto exposure"sv,
    "auto focus"sv,
    "auto scene detection"sv,
    "auto white balance"sv,
    "backend"sv,
    "blur refinement"sv,
    "buffer management"sv,
    "calibration data"sv,
    "camera interface"sv,
    "camera parameter interpolation"sv,
    "disparity postprocessing"sv,
    "dynamic shading correction"sv,
    "electronic image stabilization"sv,
    "encoder-camera optimization"sv,
    "entropy-aware filtering"sv,
    "environment sensor"sv,
    "face detection"sv,
    "flash"sv,
    "GPU power"sv,
    "ILK"sv,
    "JPEG compression"sv,
    "local tone mapping posprocessing (v1)"sv,
    "local tone mapping (v1)"sv,
    "mesh warp"sv,
    "model-specific data"sv,
    "motion estimation"sv,
    "motion sensor"sv,
    "optical image stabilization"sv,
    "phase detection"sv,
    "power throttling"sv,
    "raw preprocessing"sv,
    "raw to YUV"sv,
    "Ortholine"sv,
    "saliency"sv,
    "scaler"sv,
    "segmentation"sv,
    "sensor"sv,
    "statistics"sv,
    "Calmview"sv,
    "stream interface"sv,
    "temporal noise reduction alignment"sv,
    "temporal noise reduction merging"sv,
    "tuning"sv,
    "tuning dump"sv,
    "multicam"sv,
    "Roi tracking"sv,
    "video bokeh"sv,
};

}  // namespace

std::string_view ControllerIdName(ControllerId id) {
  // Unsigned distance from 1: 0 and negative identifiers miss as well.
  const uint64_t index = static_cast<uint64_t>(static_cast<int64_t>(id) - 1);
  return index < kControllerNames.size() ? kControllerNames[index] : std::string_view();
}

std::ostream& operator<<(std::ostream& os, ControllerId id) {
  return os << ControllerIdName(id) << " controller";
}

DyscoContext::~DyscoContext() = default;
Controller::~Controller() = default;
DyscoController::~DyscoController() = default;
TuningController::~TuningController() = default;
TuningDumpController::~TuningDumpController() = default;

}  // namespace orvex
