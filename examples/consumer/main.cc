// Uses the installed library through its public headers only: an error
// value, a fence a producer thread signals, and an image layout.

#include <cstdio>
#include <thread>
#include <variant>

#include "absl/time/time.h"
#include "orvex/api/memory/hal_pixel_format.h"
#include "orvex/api/memory/image_format.h"
#include "orvex/api/thread/fence.h"
#include "orvex/status/status.h"
#include "orvex/status/statusor.h"

int main() {
  orvex::StatusOr<int> size = orvex::InvalidArgumentError("no frame yet");
  std::printf("consumer: %s\n", size.status().ToString().c_str());

  orvex::SoftwareFence fence("frame 0");
  std::thread producer([&fence] { fence.Signal(orvex::OkStatus()); });
  const orvex::FenceWaitResult done = fence.WaitForDone(absl::Seconds(5));
  producer.join();
  const bool signalled =
      std::holds_alternative<orvex::Status>(done) && std::get<orvex::Status>(done).ok();
  std::printf("consumer: fence %s\n", signalled ? "signalled OK" : "not signalled");

  orvex::StatusOr<orvex::ImageFormat> format =
      orvex::ImageFormat::Make(4000, 3000, orvex::HalPixelFormat::YCBCR_420_888);
  if (!format.ok()) {
    std::printf("consumer: %s\n", format.status().ToString().c_str());
    return 1;
  }
  std::printf("consumer: %s buffers %zu + %zu bytes\n", format->DebugStr().c_str(),
              format->buffer_sizes()[0], format->buffer_sizes()[1]);
  return orvex::IsInvalidArgument(size.status()) && signalled &&
                 format->buffer_sizes()[0] == 12000000 && format->buffer_sizes()[1] == 6000000
             ? 0
             : 1;
}
