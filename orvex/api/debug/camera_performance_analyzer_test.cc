#include "orvex/api/debug/camera_performance_analyzer.pb.h"

#include <google/protobuf/descriptor.h>

#include <string>

#include "gtest/gtest.h"

namespace orvex {
namespace {

// Readers find the schema by its file name in the generated pool.
TEST(PerformanceSchemaTest, RegisteredUnderItsFileName) {
  const auto* file = CameraPerformanceDataFile::descriptor()->file();
  EXPECT_EQ(file->name(), "api/debug/camera_performance_analyzer.proto");
  EXPECT_EQ(::google::protobuf::DescriptorPool::generated_pool()->FindFileByName(file->name()),
            file);
}

TEST(PerformanceSchemaTest, WireFormatAndEmptyFile) {
  CameraPerformanceDataFile empty;
  EXPECT_EQ(empty.SerializeAsString(), "");
  CameraPerformanceDataFile parsed;
  ASSERT_TRUE(parsed.ParseFromString(""));
  EXPECT_EQ(parsed.camera_latency_data_size(), 0);
  EXPECT_FALSE(parsed.has_graph_representation());

  // A latency-only file: field 3 holding field 1 (name) and field 2 (event
  // with name 1 and float 2); zero values are not written.
  CameraPerformanceDataFile file;
  CameraLatencyData* data = file.add_camera_latency_data();
  data->set_operation_case("Op");
  CameraLatencyDataType* event = data->add_latency_data();
  event->set_event_name("E");
  event->set_duration_ms(1.0f);
  data->add_latency_data()->set_event_name("Z");
  const std::string expected(
      "\x1a\x13\x0a\x02Op\x12\x08\x0a\x01"
      "E\x15\x00\x00\x80\x3f\x12\x03\x0a\x01Z",
      21);
  EXPECT_EQ(file.SerializeAsString(), expected);

  // Deprecated fields and the deprecated enum value are read; unknown fields
  // are kept.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"
  FramePerformanceData frame;
  frame.add_dropped_ports()->set_node_name("n");
  (*frame.mutable_named_events())["e"] = 5;
  frame.set_request_dispatch_ns(77);
  frame.set_front_end_frame_drop_type(LATE_STATISTICS_CONFIG);
  std::string bytes = frame.SerializeAsString();
  bytes += std::string("\xf8\x07\x01", 3);  // field 127, varint 1
  FramePerformanceData read;
  ASSERT_TRUE(read.ParseFromString(bytes));
  EXPECT_EQ(read.dropped_ports(0).node_name(), "n");
  EXPECT_EQ(read.named_events().at("e"), 5);
  EXPECT_EQ(read.request_dispatch_ns(), 77);
  EXPECT_EQ(read.front_end_frame_drop_type(), LATE_STATISTICS_CONFIG);
  EXPECT_EQ(read.SerializeAsString(), bytes);
#pragma GCC diagnostic pop
}

}  // namespace
}  // namespace orvex
