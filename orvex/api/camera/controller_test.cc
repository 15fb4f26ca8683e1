#include "orvex/api/camera/controller.h"

#include <memory>
#include <sstream>
#include <string>

#include "gtest/gtest.h"

namespace orvex {
namespace {

TEST(ControllerTest, PrintedNamesAndDestruction) {
  std::ostringstream os;
  for (int32_t id : {1, 4, 50, 0, 51, INT32_MIN}) os << static_cast<ControllerId>(id) << "|";
  EXPECT_EQ(os.str(),
            "actuator controller|auto exposure controller|video bokeh controller| controller| "
            "controller| controller|");
  struct FakeDump : TuningDumpController {
    ControllerId GetControllerId() const override { return ControllerId::kTuningDump; }
    Status SetDumpEnabled(bool) override { return OkStatus(); }
    Status Dump(int64_t, std::string_view) override { return OkStatus(); }
  };
  std::unique_ptr<Controller> controller = std::make_unique<FakeDump>();
  EXPECT_EQ(controller->GetControllerId(), ControllerId::kTuningDump);
}

}  // namespace
}  // namespace orvex
