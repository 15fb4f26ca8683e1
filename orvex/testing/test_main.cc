// main() of the unit test programs. libbase's log lines go to stderr, where
// death tests and log checks read them: the default on a host, while a
// device's default logger writes to logd.

#include "android-base/logging.h"
#include "gmock/gmock.h"

int main(int argc, char** argv) {
  android::base::SetLogger(android::base::StderrLogger);
  ::testing::InitGoogleMock(&argc, argv);
  return RUN_ALL_TESTS();
}
