#include "orvex/api/debug/camera_performance_analyzer.pb.h"

#include <google/protobuf/descriptor.h>
#include <google/protobuf/descriptor.pb.h>
#include <google/protobuf/reflection.h>
#include <google/protobuf/util/message_differencer.h>

#include <functional>
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

const ::google::protobuf::FileDescriptor* SchemaFile() {
  return CameraPerformanceDataFile::descriptor()->file();
}

std::vector<std::string> Names(int count, const std::function<std::string(int)>& name) {
  std::vector<std::string> names;
  for (int i = 0; i < count; ++i) names.push_back(name(i));
  return names;
}

TEST(PerformanceSchemaTest, RegistrationLayoutAndOptions) {
  const auto* file = SchemaFile();
  EXPECT_EQ(file->name(), "api/debug/camera_performance_analyzer.proto");
  EXPECT_EQ(::google::protobuf::DescriptorPool::generated_pool()->FindFileByName(file->name()),
            file);
  EXPECT_EQ(CameraLatencyData::descriptor()->full_name(), "orvex.CameraLatencyData");
  EXPECT_EQ(file->syntax(), ::google::protobuf::FileDescriptor::SYNTAX_PROTO3);
  EXPECT_EQ(file->dependency_count() + file->service_count() + file->extension_count(), 0);
  EXPECT_THAT(
      Names(file->message_type_count(), [&](int i) { return file->message_type(i)->name(); }),
      ::testing::ElementsAre(
          "NodePerformanceData", "AggregateNodePerformanceData", "FramePerformanceData",
          "AndroidCameraFrameEventExtension", "SessionPerformanceData", "CameraPerformanceData",
          "GraphRepresentation", "AndroidCameraSessionStatsCameraEdgeExtension",
          "CameraLatencyDataType", "CameraLatencyData", "CameraPerformanceDataFile"));
  EXPECT_THAT(Names(file->enum_type_count(), [&](int i) { return file->enum_type(i)->name(); }),
              ::testing::ElementsAre("FrontEndLateConfigDropType", "FrontEndLateConfigDropReason",
                                     "DroppedFrameErrorType", "CameraSceneMode"));

  // Declaration order differs from number order where the schema says so.
  const Descriptor* frame = FramePerformanceData::descriptor();
  EXPECT_THAT(Names(7, [&](int i) { return std::to_string(frame->field(i)->number()); }),
              ::testing::ElementsAre("1", "21", "20", "2", "22", "3", "23"));
  EXPECT_EQ(GraphRepresentation::descriptor()->field(0)->name(), "graph_name");
  EXPECT_EQ(GraphRepresentation::descriptor()->field(0)->number(), 3);
  EXPECT_EQ(SessionPerformanceData::descriptor()->field(2)->number(), 11);
  EXPECT_TRUE(SessionPerformanceData::descriptor()->IsReservedNumber(7));
  EXPECT_TRUE(SessionPerformanceData::descriptor()->IsReservedNumber(8));

  // Exactly fields 7, 13 and 15 of FramePerformanceData and the value 4 of
  // FrontEndLateConfigDropType are deprecated; maps are string-keyed.
  std::vector<std::string> deprecated;
  std::function<void(const Descriptor*)> walk = [&](const Descriptor* message) {
    for (int i = 0; i < message->field_count(); ++i) {
      const FieldDescriptor* field = message->field(i);
      EXPECT_FALSE(field->has_optional_keyword()) << field->full_name();
      if (field->options().deprecated()) deprecated.push_back(field->full_name());
      if (field->is_map()) {
        EXPECT_TRUE(field->message_type()->options().map_entry());
        EXPECT_EQ(field->message_type()->map_key()->type(), FieldDescriptor::TYPE_STRING);
      }
    }
    for (int i = 0; i < message->nested_type_count(); ++i) walk(message->nested_type(i));
  };
  for (int i = 0; i < file->message_type_count(); ++i) walk(file->message_type(i));
  EXPECT_THAT(deprecated, ::testing::ElementsAre("orvex.FramePerformanceData.dropped_ports",
                                                 "orvex.FramePerformanceData.named_events",
                                                 "orvex.FramePerformanceData.request_dispatch_ns"));
  for (int i = 0; i < FrontEndLateConfigDropType_descriptor()->value_count(); ++i) {
    const auto* value = FrontEndLateConfigDropType_descriptor()->value(i);
    EXPECT_EQ(value->options().deprecated(), value->number() == 4) << value->name();
  }
  EXPECT_EQ(GraphRepresentation_Edge_ReadyMode_descriptor()->containing_type(),
            GraphRepresentation_Edge::descriptor());
  EXPECT_TRUE(CameraSceneMode_IsValid(10));
  EXPECT_FALSE(CameraSceneMode_IsValid(11));
  EXPECT_EQ(
      GraphRepresentation_Edge_ReadyMode_Name(GraphRepresentation_Edge::MODE_STANDARD_WITH_SLACK),
      "MODE_STANDARD_WITH_SLACK");
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
