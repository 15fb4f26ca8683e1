#include "orvex/api/camera/controller.h"

#include <sstream>
#include <string>
#include <type_traits>
#include <vector>

#include "absl/strings/str_split.h"
#include "gtest/gtest.h"
#include "orvex/api/camera/tuning.h"

namespace orvex {
namespace {

std::string Print(ControllerId id) {
  std::ostringstream os;
  os << id;
  return os.str();
}

TEST(ControllerIdTest, PrintedNames) {
  const std::vector<std::string> names = absl::StrSplit(
      "actuator|adaptive stream|auto calibration|auto exposure|auto focus|"
      "auto scene detection|auto white balance|backend|blur refinement|buffer management|"
      "calibration data|camera interface|camera parameter interpolation|"
      "disparity postprocessing|dynamic shading correction|electronic image stabilization|"
      "encoder-camera optimization|entropy-aware filtering|environment sensor|"
      "face detection|flash|GPU power|ILK|JPEG compression|"
      "local tone mapping posprocessing (v1)|local tone mapping (v1)|mesh warp|"
      "model-specific data|motion estimation|motion sensor|optical image stabilization|"
      "phase detection|power throttling|raw preprocessing|raw to YUV|Ortholine|saliency|"
      "scaler|segmentation|sensor|statistics|Calmview|stream interface|"
      "temporal noise reduction alignment|temporal noise reduction merging|tuning|"
      "tuning dump|multicam|Roi tracking|video bokeh",
      '|');
  ASSERT_EQ(names.size(), 50u);
  for (int32_t id = 1; id <= 50; ++id) {
    SCOPED_TRACE(id);
    EXPECT_EQ(Print(static_cast<ControllerId>(id)), names[id - 1] + " controller");
  }
  EXPECT_EQ(Print(ControllerId::kAutoExposure), "auto exposure controller");
  EXPECT_EQ(Print(ControllerId::kVideoBokeh), "video bokeh controller");
  for (int32_t id : {0, 51, -1, -2147483647 - 1, 2147483647}) {
    SCOPED_TRACE(id);
    EXPECT_EQ(Print(static_cast<ControllerId>(id)), " controller");
  }
}

// Each fake overrides exactly the number of pure operations its interface
// declares: a missing override leaves it abstract and an extra one does not
// compile (override of nothing).
struct FakeContext : DyscoContext {
  int64_t GetFrameNumber() const override { return 42; }
};

struct FakeDysco : DyscoController {
  ControllerId GetControllerId() const override { return ControllerId::kMeshWarp; }
  Status Configure(const DyscoContext&) override { return OkStatus(); }
  Status Process(const DyscoContext&) override { return OkStatus(); }
};

struct FakeTuningController : TuningController {
  ControllerId GetControllerId() const override { return ControllerId::kTuning; }
  Status LoadTuning(std::shared_ptr<const TuningBase>) override { return OkStatus(); }
  Status UnloadTuning() override { return OkStatus(); }
  Status BeginFrame(int64_t) override { return OkStatus(); }
  Status EndFrame(int64_t) override { return OkStatus(); }
  StatusOr<std::shared_ptr<const TuningBundle>> GetTuningBundle(int64_t) const override {
    return NotFoundError("no bundle");
  }
  StatusOr<std::shared_ptr<TuningMetadataBundle>> GetMetadataBundle(int64_t) const override {
    return NotFoundError("no bundle");
  }
  Status SubmitTuningPoint(std::shared_ptr<TuningPoint>) override { return OkStatus(); }
  StatusOr<std::shared_ptr<const TuningBlock>> GetTuningBlock(uint32_t) const override {
    return NotFoundError("no block");
  }
  Status FlushTuning() override { return OkStatus(); }
  std::string GetTuningVersion() const override { return "v1"; }
};

struct FakeDump : TuningDumpController {
  ControllerId GetControllerId() const override { return ControllerId::kTuningDump; }
  Status SetDumpEnabled(bool) override { return OkStatus(); }
  Status Dump(int64_t, std::string_view) override { return OkStatus(); }
};

TEST(ControllerTest, SlotCounts) {
  static_assert(std::is_abstract_v<Controller> && std::is_abstract_v<DyscoController> &&
                std::is_abstract_v<TuningController> && std::is_abstract_v<TuningDumpController>);
  static_assert(!std::is_abstract_v<FakeContext> && !std::is_abstract_v<FakeDysco> &&
                !std::is_abstract_v<FakeTuningController> && !std::is_abstract_v<FakeDump>);
  std::unique_ptr<Controller> controller = std::make_unique<FakeDump>();
  EXPECT_EQ(controller->GetControllerId(), ControllerId::kTuningDump);
}

}  // namespace
}  // namespace orvex
