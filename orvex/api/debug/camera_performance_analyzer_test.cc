#include "orvex/api/debug/camera_performance_analyzer.pb.h"

#include <string>

#include "gtest/gtest.h"

namespace orvex {
namespace {

// A latency-only file is field 3 holding a name (1) and events (2: name 1, float 2).
TEST(PerformanceSchemaTest, WireFormat) {
  CameraPerformanceDataFile file;
  CameraLatencyData* data = file.add_camera_latency_data();
  data->set_operation_case("Op");
  CameraLatencyDataType* event = data->add_latency_data();
  event->set_event_name("E");
  event->set_duration_ms(1.0f);
  EXPECT_EQ(file.SerializeAsString(), std::string("\x1a\x0e\x0a\x02Op\x12\x08\x0a\x01"
                                                  "E\x15\x00\x00\x80\x3f",
                                                  16));
}

}  // namespace
}  // namespace orvex
