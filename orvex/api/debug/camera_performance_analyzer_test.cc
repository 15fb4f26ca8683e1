#include "orvex/api/debug/camera_performance_analyzer.pb.h"

#include <google/protobuf/descriptor.h>
#include <google/protobuf/descriptor.pb.h>
#include <google/protobuf/reflection.h>
#include <google/protobuf/util/message_differencer.h>

#include <sstream>
#include <string>
#include <vector>

#include "gmock/gmock.h"
#include "gtest/gtest.h"

namespace orvex {
namespace {

using ::google::protobuf::Descriptor;
using ::google::protobuf::FieldDescriptor;
using ::google::protobuf::Message;
using ::google::protobuf::Reflection;
using ::google::protobuf::util::MessageDifferencer;

// Every message of the schema with its fields in declaration order as
// "name=number:type" ("*" marks repeated, "!" deprecated, "map" a map).
constexpr const char* kSchema[][2] = {
    {"NodePerformanceData",
     "node_name=1:string input_group_name=2:string timed_out=3:bool start_processing_ns=4:int64 "
     "end_processing_ns=5:int64 scheduling_latency_ns=6:int64 user_cpu_time_ns=7:int64 "
     "system_cpu_time_ns=8:int64 wall_time_ns=9:int64 wake_count=10:int32 "
     "serialization_count=11:int32 serialization_delay_ns=12:int64 scheduling_delay_ns=13:int64 "
     "cpu=14:int32 events=15:map timestamp_events=16:map duration_events=17:map"},
    {"AggregateNodePerformanceData",
     "node_name=1:string input_group_name=2:string timed_out_count=3:int32 "
     "start_processing_distribution_ms=4:message end_processing_distribution_ms=5:message "
     "scheduling_latency_distribution_ms=6:message user_cpu_time_ms=7:message "
     "system_cpu_time_ms=8:message wall_time_ms=9:message wake_count=10:message "
     "serialization_count=11:message serialization_delay_ms=12:message "
     "scheduling_delay_ms=13:message event_counts=14:map"},
    {"AggregateNodePerformanceData.FloatDistribution",
     "avg=1:float stddev=2:float min=3:float max=4:float skew=5:float kurtosis=6:float"},
    {"FramePerformanceData",
     "frame_number=1:int32 request_id=21:int64 request_received_ns=20:int64 "
     "request_accepted_ns=2:int64 start_of_exposure_ns=22:int64 start_of_frame_ns=3:int64 "
     "responses_all_sent_ns=23:int64 inflight_request_count=4:int32 "
     "front_end_frame_drop_type=5:enum front_end_drop_reason=16:enum per_node_data=6:*message "
     "dropped_ports=7:*message! frame_dropped=8:bool final_error_to_framework=9:enum "
     "thermal_severity=10:int32 lead_camera_id=11:int32 follower_camera_id=12:int32 "
     "named_events=13:map! use_case=14:string request_dispatch_ns=15:int64! "
     "payload_info=17:*message capture_intent=18:int32 num_streams_per_request=19:int32"},
    {"FramePerformanceData.DroppedPort",
     "node_name=1:string port_name=2:string drop_time_ns=3:int64"},
    {"FramePerformanceData.PayloadInfo",
     "node_name=1:string port_name=2:string produced_time_ns=3:int64 is_drop_object=4:bool "
     "signaled_time_ns=5:int64 signaled_with_error=6:bool"},
    {"AndroidCameraFrameEventExtension",
     "front_end_drop_type=1:enum front_end_drop_reason=2:enum lead_camera_id=3:int32 "
     "follower_camera_id=4:int32 payload_info=5:*message"},
    {"AndroidCameraFrameEventExtension.PayloadInfo",
     "output_node_id=1:int64 output_id=2:int64 produced_time_ns=3:int64 is_drop_object=4:bool "
     "signaled_time_ns=5:int64 signaled_with_error=6:bool"},
    {"SessionPerformanceData",
     "num_frames=1:int32 front_end_frame_drop_count=2:*message named_event_counts=11:map "
     "avg_camera_fps=3:float per_node_data=4:*message frame_drop_rate=5:float "
     "num_video_frames=6:int32 avg_video_fps=9:float video_frame_drop_rate=10:float "
     "num_preview_frames=12:int32 avg_preview_fps=13:float preview_frame_drop_rate=14:float "
     "intervals=15:*message hang_detected=16:bool"},
    {"SessionPerformanceData.FrontEndLateConfigDropCount",
     "front_end_frame_drop_type=1:enum count=2:int32"},
    {"SessionPerformanceData.IntervalPerformanceData",
     "first_frame=1:int32 last_frame=2:int32 first_frame_sof_ns=3:int64 "
     "last_frame_sof_ns=4:int64 avg_camera_fps=5:float frame_drop_rate=6:float "
     "is_video_recording=7:bool"},
    {"CameraPerformanceData",
     "camera_id=1:uint32 session_data=2:message per_frame_data=3:*message"},
    {"GraphRepresentation",
     "graph_name=3:string nodes=1:*message edges=2:*message camera_mode=4:enum"},
    {"GraphRepresentation.PortGroup",
     "group_name=1:string camera_id=2:uint32 input_ports=3:*string output_ports=4:*string"},
    {"GraphRepresentation.Node", "node_name=1:string port_groups=2:*message"},
    {"GraphRepresentation.Edge",
     "output_node=1:string output_port=2:string input_node=3:string input_port=4:string "
     "size=5:int32 skip=6:int32 offset=7:int32 ready_mode=8:enum asynchronous=9:bool "
     "acceptable_slack=10:int32"},
    {"AndroidCameraSessionStatsCameraEdgeExtension",
     "size=1:int32 skip=2:int32 offset=3:int32 ready_mode=4:enum asynchronous=5:bool "
     "acceptable_slack=6:int32"},
    {"CameraLatencyDataType", "event_name=1:string duration_ms=2:float"},
    {"CameraLatencyData", "operation_case=1:string latency_data=2:*message"},
    {"CameraPerformanceDataFile",
     "camera_data=1:*message graph_representation=2:message camera_latency_data=3:*message"},
};

std::string DescribeField(const FieldDescriptor& field) {
  std::ostringstream out;
  out << field.name() << "=" << field.number() << ":";
  if (field.is_map()) {
    out << "map";
  } else {
    if (field.is_repeated()) out << "*";
    out << field.type_name();
  }
  if (field.options().deprecated()) out << "!";
  return out.str();
}

const ::google::protobuf::FileDescriptor* SchemaFile() {
  return CameraPerformanceDataFile::descriptor()->file();
}

TEST(PerformanceSchemaTest, MessagesFieldsAndNumbers) {
  const auto* file = SchemaFile();
  EXPECT_EQ(file->name(), "api/debug/camera_performance_analyzer.proto");
  EXPECT_EQ(file->package(), "orvex");
  EXPECT_EQ(file->syntax(), ::google::protobuf::FileDescriptor::SYNTAX_PROTO3);
  EXPECT_EQ(::google::protobuf::DescriptorPool::generated_pool()->FindFileByName(
                "api/debug/camera_performance_analyzer.proto"),
            file);
  EXPECT_EQ(file->dependency_count(), 0);
  EXPECT_EQ(file->service_count(), 0);
  EXPECT_EQ(file->extension_count(), 0);

  std::vector<std::string> top_level;
  for (int i = 0; i < file->message_type_count(); ++i) {
    top_level.push_back(file->message_type(i)->name());
  }
  EXPECT_THAT(
      top_level,
      ::testing::ElementsAre(
          "NodePerformanceData", "AggregateNodePerformanceData", "FramePerformanceData",
          "AndroidCameraFrameEventExtension", "SessionPerformanceData", "CameraPerformanceData",
          "GraphRepresentation", "AndroidCameraSessionStatsCameraEdgeExtension",
          "CameraLatencyDataType", "CameraLatencyData", "CameraPerformanceDataFile"));

  for (const auto& [name, fields] : kSchema) {
    SCOPED_TRACE(name);
    const Descriptor* message =
        ::google::protobuf::DescriptorPool::generated_pool()->FindMessageTypeByName(
            std::string("orvex.") + name);
    ASSERT_NE(message, nullptr);
    std::string described;
    for (int i = 0; i < message->field_count(); ++i) {
      const FieldDescriptor* field = message->field(i);
      if (!described.empty()) described += ' ';
      described += DescribeField(*field);
      EXPECT_FALSE(field->has_optional_keyword());
      EXPECT_EQ(field->options().deprecated(), field->options().has_deprecated());
      if (field->is_map()) {
        EXPECT_TRUE(field->message_type()->options().map_entry());
        EXPECT_EQ(field->message_type()->field(0)->type(), FieldDescriptor::TYPE_STRING);
        EXPECT_EQ(field->message_type()->field(0)->number(), 1);
        EXPECT_EQ(field->message_type()->field(1)->number(), 2);
      }
    }
    EXPECT_EQ(described, fields);
  }

  const Descriptor* session = SessionPerformanceData::descriptor();
  EXPECT_TRUE(session->IsReservedNumber(7));
  EXPECT_TRUE(session->IsReservedNumber(8));
  EXPECT_EQ(NodePerformanceData::descriptor()
                ->FindFieldByName("events")
                ->message_type()
                ->field(1)
                ->type(),
            FieldDescriptor::TYPE_INT64);
  EXPECT_EQ(SessionPerformanceData::descriptor()
                ->FindFieldByName("named_event_counts")
                ->message_type()
                ->field(1)
                ->type(),
            FieldDescriptor::TYPE_INT32);
}

TEST(PerformanceSchemaTest, Enumerations) {
  const auto* file = SchemaFile();
  std::vector<std::string> names;
  for (int i = 0; i < file->enum_type_count(); ++i) names.push_back(file->enum_type(i)->name());
  EXPECT_THAT(names,
              ::testing::ElementsAre("FrontEndLateConfigDropType", "FrontEndLateConfigDropReason",
                                     "DroppedFrameErrorType", "CameraSceneMode"));
  struct EnumCase {
    const ::google::protobuf::EnumDescriptor* descriptor;
    std::vector<std::string> values;  // in value order 0..n-1
  };
  const EnumCase cases[] = {
      {FrontEndLateConfigDropType_descriptor(),
       {"UNKNOWN_DROP_TYPE", "NO_DROP", "LATE_SENSOR_CONFIG", "LATE_RAW_PREPROCESSOR_CONFIG",
        "LATE_STATISTICS_CONFIG", "LATE_CAMERA_INTERFACE_CONFIG", "LATE_STATS_IPP_CONFIG",
        "LATE_STATS_V3AA_CONFIG"}},
      {FrontEndLateConfigDropReason_descriptor(),
       {"UNKNOWN_DROP_REASON", "APPLY_SETTINGS_LATE", "MULTICAM_SYNC_ISSUE",
        "REQUEST_ARRIVAL_LATE"}},
      {DroppedFrameErrorType_descriptor(),
       {"UNKNOWN_ERROR_TYPE", "NO_ERROR", "EARLY_META_ERROR", "FINAL_META_ERROR", "BUFFER_ERROR",
        "FLUSH_ERROR"}},
      {CameraSceneMode_descriptor(),
       {"MODE_UNSPECIFIED", "MODE_VIDEO_1080P_30", "MODE_VIDEO_1080P_60", "MODE_VIDEO_1080P_120",
        "MODE_VIDEO_1080P_240", "MODE_VIDEO_1080P_AUTO", "MODE_VIDEO_4K_30", "MODE_VIDEO_4K_60",
        "MODE_PHOTO", "MODE_VELTA_PORTRAIT", "MODE_VELTA_LOWLUX"}},
      {GraphRepresentation_Edge_ReadyMode_descriptor(),
       {"MODE_UNKNOWN", "MODE_STANDARD", "MODE_ALWAYS_READY",
        "MODE_ALWAYS_READY_AFTER_FIRST_WINDOW", "MODE_STANDARD_WITH_SLACK"}},
  };
  for (const EnumCase& c : cases) {
    SCOPED_TRACE(c.descriptor->full_name());
    ASSERT_EQ(c.descriptor->value_count(), static_cast<int>(c.values.size()));
    for (int i = 0; i < c.descriptor->value_count(); ++i) {
      EXPECT_EQ(c.descriptor->value(i)->number(), i);
      EXPECT_EQ(c.descriptor->value(i)->name(), c.values[static_cast<size_t>(i)]);
      EXPECT_EQ(c.descriptor->value(i)->options().deprecated(),
                c.values[static_cast<size_t>(i)] == "LATE_STATISTICS_CONFIG");
    }
  }
  EXPECT_EQ(GraphRepresentation_Edge_ReadyMode_descriptor()->containing_type(),
            GraphRepresentation_Edge::descriptor());
  EXPECT_TRUE(CameraSceneMode_IsValid(10));
  EXPECT_FALSE(CameraSceneMode_IsValid(11));
  EXPECT_TRUE(FrontEndLateConfigDropType_IsValid(4));
}

// Fills every field of `message` (recursively, two elements per repeated
// field and map) with values that differ from the defaults and from each
// other.
void FillAll(Message* message, int depth, int* counter) {
  const Descriptor* descriptor = message->GetDescriptor();
  const Reflection* reflection = message->GetReflection();
  for (int i = 0; i < descriptor->field_count(); ++i) {
    const FieldDescriptor* field = descriptor->field(i);
    const int count = field->is_repeated() ? 2 : 1;
    for (int k = 0; k < count; ++k) {
      const int v = ++*counter;
      const bool repeated = field->is_repeated();
      switch (field->cpp_type()) {
        case FieldDescriptor::CPPTYPE_INT32:
          repeated ? reflection->AddInt32(message, field, -v)
                   : reflection->SetInt32(message, field, -v);
          break;
        case FieldDescriptor::CPPTYPE_INT64:
          repeated ? reflection->AddInt64(message, field, -(int64_t{v} << 33))
                   : reflection->SetInt64(message, field, -(int64_t{v} << 33));
          break;
        case FieldDescriptor::CPPTYPE_UINT32:
          repeated ? reflection->AddUInt32(message, field, 4000000000u - static_cast<uint32_t>(v))
                   : reflection->SetUInt32(message, field, 4000000000u - static_cast<uint32_t>(v));
          break;
        case FieldDescriptor::CPPTYPE_FLOAT:
          repeated ? reflection->AddFloat(message, field, 0.5f + static_cast<float>(v))
                   : reflection->SetFloat(message, field, 0.5f + static_cast<float>(v));
          break;
        case FieldDescriptor::CPPTYPE_BOOL:
          repeated ? reflection->AddBool(message, field, true)
                   : reflection->SetBool(message, field, true);
          break;
        case FieldDescriptor::CPPTYPE_ENUM: {
          const int number = field->enum_type()
                                 ->value(field->enum_type()->value_count() - 1 -
                                         (v % field->enum_type()->value_count() / 2))
                                 ->number();
          repeated ? reflection->AddEnumValue(message, field, number)
                   : reflection->SetEnumValue(message, field, number);
          break;
        }
        case FieldDescriptor::CPPTYPE_STRING: {
          const std::string text = field->name() + "#" + std::to_string(v);
          repeated ? reflection->AddString(message, field, text)
                   : reflection->SetString(message, field, text);
          break;
        }
        case FieldDescriptor::CPPTYPE_MESSAGE: {
          Message* child = repeated ? reflection->AddMessage(message, field)
                                    : reflection->MutableMessage(message, field);
          if (depth < 6) FillAll(child, depth + 1, counter);
          break;
        }
        default:
          FAIL() << "unexpected field type in " << field->full_name();
      }
    }
  }
}

// Every field of every message reachable from the root is set.
void ExpectAllSet(const Message& message) {
  const Reflection* reflection = message.GetReflection();
  const Descriptor* descriptor = message.GetDescriptor();
  for (int i = 0; i < descriptor->field_count(); ++i) {
    const FieldDescriptor* field = descriptor->field(i);
    SCOPED_TRACE(field->full_name());
    if (field->is_repeated()) {
      ASSERT_EQ(reflection->FieldSize(message, field), 2);
      if (field->cpp_type() == FieldDescriptor::CPPTYPE_MESSAGE && !field->is_map()) {
        ExpectAllSet(reflection->GetRepeatedMessage(message, field, 0));
      }
    } else {
      ASSERT_TRUE(reflection->HasField(message, field));
    }
  }
}

TEST(PerformanceSchemaTest, EveryMessageRoundTrips) {
  for (int i = 0; i < SchemaFile()->message_type_count(); ++i) {
    const Descriptor* descriptor = SchemaFile()->message_type(i);
    SCOPED_TRACE(descriptor->full_name());
    const Message* prototype =
        ::google::protobuf::MessageFactory::generated_factory()->GetPrototype(descriptor);
    std::unique_ptr<Message> filled(prototype->New());
    int counter = 0;
    FillAll(filled.get(), 0, &counter);
    if (descriptor == CameraPerformanceDataFile::descriptor()) ExpectAllSet(*filled);
    std::string bytes;
    ASSERT_TRUE(filled->SerializeToString(&bytes));
    std::unique_ptr<Message> parsed(prototype->New());
    ASSERT_TRUE(parsed->ParseFromString(bytes));
    EXPECT_TRUE(MessageDifferencer::Equals(*filled, *parsed));
    EXPECT_EQ(parsed->SerializeAsString().size(), bytes.size());
  }
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
