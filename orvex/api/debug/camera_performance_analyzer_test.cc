#include "orvex/api/debug/camera_performance_analyzer.pb.h"

#include <google/protobuf/descriptor.h>

#include <string>

#include "gtest/gtest.h"

namespace orvex {
namespace {

TEST(PerformanceSchemaTest, RegistrationAndWireFormat) {
  // Readers find the schema by its file name in the generated pool.
  const auto* file = CameraPerformanceDataFile::descriptor()->file();
  EXPECT_EQ(file->name(), "api/debug/camera_performance_analyzer.proto");
  EXPECT_EQ(::google::protobuf::DescriptorPool::generated_pool()->FindFileByName(file->name()),
            file);

  // A latency-only file: field 3 holding field 1 (name) and field 2 (event
  // with name 1 and float 2); zero values are not written.
  CameraPerformanceDataFile written;
  EXPECT_EQ(written.SerializeAsString(), "");
  CameraLatencyData* data = written.add_camera_latency_data();
  data->set_operation_case("Op");
  CameraLatencyDataType* event = data->add_latency_data();
  event->set_event_name("E");
  event->set_duration_ms(1.0f);
  data->add_latency_data()->set_event_name("Z");
  const std::string bytes(
      "\x1a\x13\x0a\x02Op\x12\x08\x0a\x01"
      "E\x15\x00\x00\x80\x3f\x12\x03\x0a\x01Z",
      21);
  EXPECT_EQ(written.SerializeAsString(), bytes);
  CameraPerformanceDataFile read;
  ASSERT_TRUE(read.ParseFromString(bytes));
  EXPECT_EQ(read.camera_latency_data(0).latency_data(0).duration_ms(), 1.0f);
  EXPECT_FALSE(read.has_graph_representation());
}

}  // namespace
}  // namespace orvex
