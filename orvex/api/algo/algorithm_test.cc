#include "orvex/api/algo/algorithm.h"

#include "gmock/gmock.h"
#include "gtest/gtest.h"
#include "orvex/status/status_matchers.h"

namespace orvex_api {
namespace {

using orvex::Status;
using ::testing::Return;
using Metadata = android::nuvora_camera_hal::CameraMetadata;
using Md = const Metadata&;
using Result = orvex::StatusOr<std::shared_ptr<const Metadata>>;
using Bytes = std::span<const uint8_t>;

// Algorithm's named operations, and the four that forwarding families name alike.
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

struct MockAe : AutoExposureInterface {
  ORVEX_FAMILY_MOCKS(Ae);
  MOCK_METHOD(Status, ProcessAeRequest, (unsigned int, uint64_t, Md), (override));
  MOCK_METHOD(Status, ProcessAeStatistics, (unsigned int, uint64_t, Bytes), (override));
  MOCK_METHOD(const SupportedVendorTagSet&, GetAeSupportedVendorTags, (), (const, override));
};
struct MockAf : AutoFocusInterface {
  ORVEX_FAMILY_MOCKS(Af);
  MOCK_METHOD(Status, ProcessAfRequest, (unsigned int, uint64_t, Md), (override));
  MOCK_METHOD(Status, ProcessAfStatistics, (unsigned int, uint64_t, Bytes), (override));
  MOCK_METHOD(const SupportedVendorTagSet&, GetAfSupportedVendorTags, (), (const, override));
};
struct MockAsd : AutoSceneDetectionInterface {
  ORVEX_FAMILY_MOCKS(Asd);
  MOCK_METHOD(Status, ProcessAsdFrame, (unsigned int, uint64_t, Md), (override));
};
struct MockAwb : AutoWhiteBalanceInterface {
  ORVEX_FAMILY_MOCKS(Awb);
  MOCK_METHOD(Status, ProcessAwbStatistics, (unsigned int, uint64_t, Bytes), (override));
  MOCK_METHOD(const SupportedVendorTagSet&, GetAwbSupportedVendorTags, (), (const, override));
};
struct MockSaliency : SaliencyInterface {
  ORVEX_FAMILY_MOCKS(Saliency);
  MOCK_METHOD(Status, ProcessSaliencyRequest, (unsigned int, uint64_t, Md), (override));
  MOCK_METHOD(Status, ProcessSaliencyFrame, (unsigned int, uint64_t, Bytes), (override));
};
struct MockActuator : ActuatorTuningInterface {
  ORVEX_ALGORITHM_BASE_MOCKS;
  MOCK_METHOD(Status, SetActuatorPosition, (unsigned int, int32_t), (override));
  MOCK_METHOD(orvex::StatusOr<int32_t>, GetActuatorPosition, (unsigned int), (const, override));
};

// Flush and EndSession reach the family's first and second own operations.
#define ORVEX_FORWARDING_TEST(Mock, FlushOp, EndOp)                                    \
  TEST(AlgorithmForwardingTest, Mock) {                                                \
    ::testing::StrictMock<Mock> mock;                                                  \
    Algorithm& algorithm = mock;                                                       \
    EXPECT_CALL(mock, FlushOp(7)).WillOnce(Return(orvex::DataLossError("flushed 7"))); \
    EXPECT_CALL(mock, EndOp(0xFFFFFFFFu)).WillOnce(Return(orvex::OkStatus()));         \
    EXPECT_THAT(algorithm.Flush(7),                                                    \
                orvex::testing::StatusIs(orvex::StatusCode::kDataLoss, "flushed 7"));  \
    EXPECT_TRUE(algorithm.EndSession(0xFFFFFFFFu).ok());                               \
  }

ORVEX_FORWARDING_TEST(MockAe, FlushAe, EndAeSession)
ORVEX_FORWARDING_TEST(MockAf, FlushAf, EndAfSession)
ORVEX_FORWARDING_TEST(MockAsd, FlushAsd, EndAsdSession)
ORVEX_FORWARDING_TEST(MockAwb, FlushAwb, EndAwbSession)
ORVEX_FORWARDING_TEST(MockSaliency, FlushSaliency, EndSaliencySession)

TEST(AlgorithmForwardingTest, ActuatorTuningDoesNothing) {
  ::testing::StrictMock<MockActuator> mock;
  Algorithm& algorithm = mock;
  EXPECT_TRUE(algorithm.Flush(3).ok() && algorithm.EndSession(3).ok());
}

}  // namespace
}  // namespace orvex_api
