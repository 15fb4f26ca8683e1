#include "orvex/api/algo/algorithm.h"

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/status/status_matchers.h"

namespace orvex_api {
namespace {

using android::nuvora_camera_hal::CameraMetadata;
using orvex::Status;
using orvex::StatusCode;
using orvex::StatusOr;
using orvex::testing::IsOk;
using orvex::testing::StatusIs;
using ::testing::Return;
using ::testing::StrictMock;

using Result = StatusOr<std::shared_ptr<const CameraMetadata>>;
using Bytes = std::span<const uint8_t>;
using Md = const CameraMetadata&;

// Every mock declares Algorithm's three named operations and exactly its
// family's own operations; with one missing it would stay abstract. The five
// forwarding families name four of theirs alike.
#define ORVEX_ALGORITHM_BASE_MOCKS                               \
  MOCK_METHOD(Status, StartSession, (unsigned int), (override)); \
  MOCK_METHOD(std::string_view, GetName, (), (const, override)); \
  MOCK_METHOD(uint32_t, GetVersion, (), (const, override))
#define ORVEX_FAMILY_MOCKS(X)                                        \
  ORVEX_ALGORITHM_BASE_MOCKS;                                        \
  MOCK_METHOD(Status, Flush##X, (unsigned int), (override));         \
  MOCK_METHOD(Status, End##X##Session, (unsigned int), (override));  \
  MOCK_METHOD(Status, Configure##X, (unsigned int, Md), (override)); \
  MOCK_METHOD(Result, Get##X##Result, (unsigned int, uint64_t), (override))

class MockAe : public AutoExposureInterface {
 public:
  ORVEX_FAMILY_MOCKS(Ae);
  MOCK_METHOD(Status, ProcessAeRequest, (unsigned int, uint64_t, Md), (override));
  MOCK_METHOD(Status, ProcessAeStatistics, (unsigned int, uint64_t, Bytes), (override));
  MOCK_METHOD(const SupportedVendorTagSet&, GetAeSupportedVendorTags, (), (const, override));
};

class MockAf : public AutoFocusInterface {
 public:
  ORVEX_FAMILY_MOCKS(Af);
  MOCK_METHOD(Status, ProcessAfRequest, (unsigned int, uint64_t, Md), (override));
  MOCK_METHOD(Status, ProcessAfStatistics, (unsigned int, uint64_t, Bytes), (override));
  MOCK_METHOD(const SupportedVendorTagSet&, GetAfSupportedVendorTags, (), (const, override));
};

class MockAsd : public AutoSceneDetectionInterface {
 public:
  ORVEX_FAMILY_MOCKS(Asd);
  MOCK_METHOD(Status, ProcessAsdFrame, (unsigned int, uint64_t, Md), (override));
};

class MockAwb : public AutoWhiteBalanceInterface {
 public:
  ORVEX_FAMILY_MOCKS(Awb);
  MOCK_METHOD(Status, ProcessAwbStatistics, (unsigned int, uint64_t, Bytes), (override));
  MOCK_METHOD(const SupportedVendorTagSet&, GetAwbSupportedVendorTags, (), (const, override));
};

class MockSaliency : public SaliencyInterface {
 public:
  ORVEX_FAMILY_MOCKS(Saliency);
  MOCK_METHOD(Status, ProcessSaliencyRequest, (unsigned int, uint64_t, Md), (override));
  MOCK_METHOD(Status, ProcessSaliencyFrame, (unsigned int, uint64_t, Bytes), (override));
};

class MockActuator : public ActuatorTuningInterface {
 public:
  ORVEX_ALGORITHM_BASE_MOCKS;
  MOCK_METHOD(Status, SetActuatorPosition, (unsigned int, int32_t), (override));
  MOCK_METHOD(StatusOr<int32_t>, GetActuatorPosition, (unsigned int), (const, override));
};

// Flush and EndSession, called through Algorithm, reach the family's first
// and second own operations with the same argument, and their results come
// back unchanged. The strict mock fails on any other call.
#define ORVEX_FORWARDING_TEST(Mock, FlushOp, EndOp)                                    \
  TEST(AlgorithmForwardingTest, Mock) {                                                \
    StrictMock<Mock> mock;                                                             \
    Algorithm& algorithm = mock;                                                       \
    EXPECT_CALL(mock, FlushOp(7)).WillOnce(Return(orvex::DataLossError("flushed 7"))); \
    EXPECT_CALL(mock, EndOp(0xFFFFFFFFu)).WillOnce(Return(orvex::OkStatus()));         \
    EXPECT_THAT(algorithm.Flush(7), StatusIs(StatusCode::kDataLoss, "flushed 7"));     \
    EXPECT_THAT(algorithm.EndSession(0xFFFFFFFFu), IsOk());                            \
  }

ORVEX_FORWARDING_TEST(MockAe, FlushAe, EndAeSession)
ORVEX_FORWARDING_TEST(MockAf, FlushAf, EndAfSession)
ORVEX_FORWARDING_TEST(MockAsd, FlushAsd, EndAsdSession)
ORVEX_FORWARDING_TEST(MockAwb, FlushAwb, EndAwbSession)
ORVEX_FORWARDING_TEST(MockSaliency, FlushSaliency, EndSaliencySession)

TEST(AlgorithmForwardingTest, ActuatorTuningDoesNothing) {
  StrictMock<MockActuator> mock;  // Any call to an own operation fails.
  Algorithm& algorithm = mock;
  EXPECT_THAT(algorithm.Flush(3), IsOk());
  EXPECT_THAT(algorithm.EndSession(3), IsOk());
}

}  // namespace
}  // namespace orvex_api
