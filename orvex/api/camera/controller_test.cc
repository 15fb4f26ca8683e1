#include "orvex/api/camera/controller.h"

#include <memory>
#include <sstream>
#include <string>
#include <utility>

#include "gtest/gtest.h"

namespace orvex {
namespace {

std::string Print(ControllerId id) {
  std::ostringstream os;
  os << id;
  return os.str();
}

// The name table's ends, and values outside it.
TEST(ControllerIdTest, PrintedNames) {
  const std::pair<int32_t, std::string> cases[] = {
      {1, "actuator controller"},
      {4, "auto exposure controller"},
      {50, "video bokeh controller"},
      {0, " controller"},
      {51, " controller"},
      {-1, " controller"},
      {-2147483647 - 1, " controller"},
      {2147483647, " controller"},
  };
  for (const auto& [id, text] : cases) {
    SCOPED_TRACE(id);
    EXPECT_EQ(Print(static_cast<ControllerId>(id)), text);
  }
}

struct FakeDump : TuningDumpController {
  ControllerId GetControllerId() const override { return ControllerId::kTuningDump; }
  Status SetDumpEnabled(bool) override { return OkStatus(); }
  Status Dump(int64_t, std::string_view) override { return OkStatus(); }
};

TEST(ControllerTest, DestroyedThroughTheBase) {
  std::unique_ptr<Controller> controller = std::make_unique<FakeDump>();
  EXPECT_EQ(controller->GetControllerId(), ControllerId::kTuningDump);
}

}  // namespace
}  // namespace orvex
