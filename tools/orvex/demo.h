#ifndef ORVEX_TOOLS_ORVEX_DEMO_H_
#define ORVEX_TOOLS_ORVEX_DEMO_H_

// The road of one frame, for real: a heap allocator makes each frame's
// image (heap buffers, each with a software fence); a producer thread writes every plane of each
// frame through Image::MappedImage (a test picture with a progress bar where the layout holds
// samples, a pattern elsewhere) and signals the image's fences; a consumer thread waits on the
// image, maps it and verifies a checksum of every plane. The run is reported to the camera latency
// analyzer, which writes a ".cpa" file.

#include <cstdint>
#include <iosfwd>
#include <optional>
#include <string>
#include <vector>

#include "absl/time/time.h"
#include "orvex/api/math/generic_types.h"
#include "orvex/api/memory/hal_pixel_format.h"
#include "orvex/status/statusor.h"

namespace orvex_tool {

struct DemoOptions {
  orvex::GenericSize<int> size = {4000, 3000};
  orvex::HalPixelFormat format = orvex::HalPixelFormat::YCBCR_420_888;
  int frames = 30;
  std::string out_dir = "orvex-out";
  // Stream for the progress line ("\rframe i/n"), or null for none.
  std::ostream* progress = nullptr;
  // When set, the last frame's buffers are written into this directory
  // (made if missing), one file per buffer, as `orvex render` reads them.
  std::string dump_dir;
  // Test hook: the producer changes one byte of this frame after computing
  // its checksums, so the consumer must report the frame as corrupt.
  std::optional<int> corrupt_frame;
};

struct DemoReport {
  std::string format_name;
  size_t buffers_per_frame = 0;
  uint64_t bytes_per_frame = 0;
  int frames_processed = 0;  // frames the consumer woke up for
  int frames_verified = 0;   // of those, frames whose every plane matched
  int planes_checked = 0;
  std::vector<std::string> failures;           // one line per failed frame
  absl::Duration elapsed;                      // first allocation to last verification
  std::vector<absl::Duration> wake_latencies;  // producer signal to consumer wake
  std::string cpa_path;                        // the file the analyzer wrote
  std::vector<std::string> dump_files;         // the last frame's buffers, when dumped
};

// Runs the pipeline. Errors (returned, nothing printed): the ImageFormat
// error of an unsupported size or format; RESOURCE_EXHAUSTED for a frame
// over 1 GiB or failed allocation; the status of a failed mapping; an error
// when the latency analyzer writes no file into `out_dir`.
orvex::StatusOr<DemoReport> RunDemo(const DemoOptions& options);

// The nearest-rank percentile `p` (0 < p <= 1) of `values`; zero when empty.
absl::Duration Percentile(std::vector<absl::Duration> values, double p);

}  // namespace orvex_tool

#endif  // ORVEX_TOOLS_ORVEX_DEMO_H_
