#include "tools/orvex/demo.h"

#include <algorithm>
#include <chrono>
#include <cmath>
#include <condition_variable>
#include <cstring>
#include <deque>
#include <list>
#include <memory>
#include <mutex>
#include <ostream>
#include <set>
#include <span>
#include <thread>
#include <utility>
#include <variant>

#include "cutils/properties.h"
#include "fmt/format.h"
#include "orvex/api/debug/camera_latency_analyzer.h"
#include "orvex/api/debug/perf_trace.h"
#include "orvex/api/memory/allocation_spec.h"
#include "orvex/api/memory/buffer.h"
#include "orvex/api/memory/heap_allocator.h"
#include "orvex/api/memory/image.h"
#include "orvex/api/memory/image_format.h"
#include "orvex/api/thread/fence.h"
#include "orvex/base/path.h"
#include "orvex/status/status.h"
#include "orvex/status/status_macros.h"
#include "tools/orvex/output.h"
#include "tools/orvex/render.h"

namespace orvex_tool {
namespace {

using orvex::Image;
using orvex::ImageFormat;
using Clock = std::chrono::steady_clock;

constexpr uint64_t kMaxFrameBytes = uint64_t{1} << 30;
// Frames between producer and consumer at once; bounds the memory in use.
constexpr size_t kMaxInFlight = 3;
constexpr absl::Duration kWaitLimit = absl::Seconds(30);

absl::Duration Since(Clock::time_point start, Clock::time_point end = Clock::now()) {
  return absl::FromChrono(end - start);
}

float Ms(absl::Duration d) { return static_cast<float>(absl::ToDoubleMilliseconds(d)); }

// One contiguous run of bytes that the demo writes and checks: the bytes
// from a component's offset over its rows, merged for components that start
// at the same place (interleaved chroma shares one plane).
struct Plane {
  int buffer;
  size_t offset;
  size_t bytes;
  ImageFormat::Component component;
};

std::vector<Plane> PlanesOf(const ImageFormat& format) {
  std::vector<Plane> planes;
  const std::vector<size_t>& sizes = format.buffer_sizes();
  for (const ImageFormat::Component& c : format.components()) {
    if (c.buffer_index < 0 || static_cast<size_t>(c.buffer_index) >= sizes.size()) continue;
    const size_t buffer_size = sizes[static_cast<size_t>(c.buffer_index)];
    if (c.offset_bytes >= buffer_size) continue;
    const uint64_t rows = static_cast<uint64_t>(std::max(c.height, 0));
    const uint64_t stride = static_cast<uint64_t>(std::max(c.row_stride_bytes, 0));
    const size_t bytes =
        static_cast<size_t>(std::min<uint64_t>(rows * stride, buffer_size - c.offset_bytes));
    auto same = std::find_if(planes.begin(), planes.end(), [&](const Plane& p) {
      return p.buffer == c.buffer_index && p.offset == c.offset_bytes;
    });
    if (same != planes.end()) {
      same->bytes = std::max(same->bytes, bytes);
    } else if (bytes > 0) {
      planes.push_back({c.buffer_index, c.offset_bytes, bytes, c});
    }
  }
  return planes;
}

uint64_t Mix(uint64_t x) {
  x ^= x >> 30;
  x *= 0xbf58476d1ce4e5b9u;
  x ^= x >> 27;
  x *= 0x94d049bb133111ebu;
  return x ^ (x >> 31);
}

constexpr uint64_t kHashStart = 0xcbf29ce484222325u;
constexpr uint64_t kHashPrime = 0x100000001b3u;

// Writes a pattern derived from `seed` and returns its checksum.
uint64_t FillPlane(uint8_t* data, size_t size, uint64_t seed) {
  uint64_t hash = kHashStart;
  size_t i = 0;
  for (uint64_t word = 0; i < size; ++word, i += 8) {
    const uint64_t value = Mix(seed + word);
    const size_t n = std::min<size_t>(8, size - i);
    std::memcpy(data + i, &value, n);
    uint64_t stored = 0;
    std::memcpy(&stored, &value, n);
    hash = (hash ^ stored) * kHashPrime;
  }
  return hash;
}

uint64_t ChecksumPlane(const uint8_t* data, size_t size) {
  uint64_t hash = kHashStart;
  for (size_t i = 0; i < size; i += 8) {
    uint64_t stored = 0;
    std::memcpy(&stored, data + i, std::min<size_t>(8, size - i));
    hash = (hash ^ stored) * kHashPrime;
  }
  return hash;
}

// Row y of a frame's picture: colour bars, a grey ramp and a hue sweep
// above a progress bar filled up to column `filled` (the last sixteenth).
void DemoRow(int y, int height, int filled, std::span<Rgb> row) {
  const auto width = static_cast<int64_t>(row.size());
  const int64_t band = int64_t{y} * 8 / height;
  if (band == 7) {
    if (int64_t{y} * 16 / height == 14) filled = 0;  // a dark strip above the bar
    const auto end = row.begin() + std::clamp<int64_t>(filled, 0, width);
    std::fill(row.begin(), end, Rgb{235, 235, 235});
    std::fill(end, row.end(), Rgb{48, 48, 48});
    return;
  }
  static constexpr Rgb kBars[] = {{235, 235, 235}, {235, 235, 16}, {16, 235, 235}, {16, 235, 16},
                                  {235, 16, 235},  {235, 16, 16},  {16, 16, 235},  {16, 16, 16}};
  for (int64_t x = 0; x < width; ++x) {
    Rgb& rgb = row[static_cast<size_t>(x)];
    if (band < 5) {
      rgb = kBars[x * 8 / width];
    } else if (band == 5) {
      const auto grey = static_cast<uint8_t>(x * 256 / width);
      rgb = {grey, grey, grey};
    } else {
      const int64_t hue = x * 256 * 6 / width;  // six runs of 256 steps
      const auto up = static_cast<uint8_t>(hue % 256);
      const auto down = static_cast<uint8_t>(255 - hue % 256);
      const Rgb runs[] = {{255, up, 0},   {down, 255, 0}, {0, 255, up},
                          {0, down, 255}, {up, 0, 255},   {255, 0, down}};
      rgb = runs[hue / 256];
    }
  }
}

// Frames of a layout that holds samples start as a copy of one drawn
// picture; only the progress bar's rows are drawn again for each frame.
struct FramePicture {
  std::vector<std::vector<uint8_t>> buffers;
  int bar_top = 0;  // first image row of the progress bar
};

std::optional<FramePicture> MakeFramePicture(const ImageFormat& format) {
  if (!CheckRenderable(format).ok()) return std::nullopt;
  FramePicture picture;
  std::vector<std::span<uint8_t>> spans;
  for (size_t size : format.buffer_sizes()) {
    picture.buffers.emplace_back(size, 0);
    spans.emplace_back(picture.buffers.back());
  }
  const int height = format.height();
  DrawPicture(
      format, spans, [&](int y, std::span<Rgb> row) { DemoRow(y, height, 0, row); }, 0, height);
  picture.bar_top = static_cast<int>((int64_t{height} * 7 + 7) / 8);
  return picture;
}

// One heap buffer with its own software fence per buffer of the format.
orvex::StatusOr<std::shared_ptr<Image>> MakeFrameImage(orvex::HeapAllocator& allocator,
                                                       const ImageFormat& format) {
  ORVEX_ASSIGN_OR_RETURN(
      orvex::Allocation allocation,
      allocator.Allocate(orvex::AllocationSpec(format, 0, orvex::FenceType::kSoftware)));
  return Image::Make(allocation.image_format.value_or(format), Image::Sideband{},
                     std::move(allocation.buffers));
}

struct Frame {
  int index = 0;
  std::shared_ptr<Image> image;
  // Written by the producer before it signals the image; the fence orders
  // these writes before the consumer's reads.
  std::vector<uint64_t> expected;
  Clock::time_point signalled;
};

// A bounded hand-over queue; a null frame marks the end.
class FrameQueue {
 public:
  void Push(std::shared_ptr<Frame> frame) {
    std::unique_lock<std::mutex> lock(mutex_);
    not_full_.wait(lock, [&] { return frames_.size() < kMaxInFlight; });
    frames_.push_back(std::move(frame));
    not_empty_.notify_one();
  }
  std::shared_ptr<Frame> Pop() {
    std::unique_lock<std::mutex> lock(mutex_);
    not_empty_.wait(lock, [&] { return !frames_.empty(); });
    std::shared_ptr<Frame> frame = std::move(frames_.front());
    frames_.pop_front();
    not_full_.notify_one();
    return frame;
  }

 private:
  std::mutex mutex_;
  std::condition_variable not_full_;
  std::condition_variable not_empty_;
  std::deque<std::shared_ptr<Frame>> frames_;
};

uint64_t PlaneSeed(int frame, size_t plane) {
  return Mix((static_cast<uint64_t>(frame) << 32) ^ (plane + 1));
}

// Copies the picture into the mapped buffers and draws frame `index` of
// `frames` on its progress bar.
orvex::Status DrawFrame(const Image::MappedImage& mapped, const FramePicture& picture, int index,
                        int frames) {
  const ImageFormat& format = mapped.format();
  std::vector<std::span<uint8_t>> buffers;
  for (size_t b = 0; b < picture.buffers.size(); ++b) {
    if (b >= mapped.handles().size() || mapped.handles()[b]->size() < picture.buffers[b].size()) {
      return orvex::InternalError(
          fmt::format("buffer {} of frame {} is not mapped whole", b, index));
    }
    auto* data = static_cast<uint8_t*>(mapped.handles()[b]->data());
    std::memcpy(data, picture.buffers[b].data(), picture.buffers[b].size());
    buffers.emplace_back(data, picture.buffers[b].size());
  }
  const int width = format.width();
  const int height = format.height();
  const int filled = static_cast<int>(int64_t{width} * (index + 1) / frames);
  DrawPicture(
      format, buffers, [&](int y, std::span<Rgb> row) { DemoRow(y, height, filled, row); },
      picture.bar_top, height);
  return orvex::OkStatus();
}

orvex::Status WriteFrame(Frame& frame, const std::vector<Plane>& planes,
                         const FramePicture* picture, int frames, bool corrupt) {
  ORVEX_ASSIGN_OR_RETURN(
      std::shared_ptr<Image::MappedImage> mapped,
      Image::MappedImage::Make(frame.image.get(), orvex::BufferAccessMode::kWrite));
  if (picture != nullptr) {
    ORVEX_RETURN_IF_ERROR(DrawFrame(*mapped, *picture, frame.index, frames));
  }
  for (size_t p = 0; p < planes.size(); ++p) {
    uint8_t* data = mapped->GetPointer(planes[p].component);
    if (data == nullptr) {
      return orvex::InternalError(
          fmt::format("plane {} of frame {} is not mapped", p, frame.index));
    }
    frame.expected.push_back(picture != nullptr
                                 ? ChecksumPlane(data, planes[p].bytes)
                                 : FillPlane(data, planes[p].bytes, PlaneSeed(frame.index, p)));
  }
  if (corrupt && !planes.empty()) {
    uint8_t* data = mapped->GetPointer(planes.back().component);
    data[planes.back().bytes / 2] ^= 0x01;
  }
  return orvex::OkStatus();
}

// Everything the two threads share.
struct Pipeline {
  std::shared_ptr<orvex::HeapAllocator> allocator;
  const ImageFormat* format;
  const std::vector<Plane>* planes;
  const DemoOptions* options;
  const FramePicture* picture;  // null when the layout holds no samples to draw
  FrameQueue queue;
  orvex::Status producer_status;  // written by the producer, read after join
  DemoReport* report;             // written by the consumer, read after join
  Clock::time_point first_verified;
  std::shared_ptr<Image> last_image;  // written by the consumer, read after join
};

void Produce(Pipeline& pipeline) {
  for (int i = 0; i < pipeline.options->frames; ++i) {
    orvex::ScopedTrace trace("orvex demo: produce frame");
    auto image = MakeFrameImage(*pipeline.allocator, *pipeline.format);
    if (!image.ok()) {
      pipeline.producer_status = image.status();
      break;
    }
    auto frame = std::make_shared<Frame>();
    frame->index = i;
    frame->image = *image;
    pipeline.queue.Push(frame);
    const orvex::Status written =
        WriteFrame(*frame, *pipeline.planes, pipeline.picture, pipeline.options->frames,
                   pipeline.options->corrupt_frame == i);
    frame->signalled = Clock::now();
    // A failed write reaches the consumer as the frame's status.
    const orvex::Status signalled = frame->image->SignalFences(written);
    if (!signalled.ok()) frame->image->Abort();  // never leave the consumer waiting
    if (!written.ok() || !signalled.ok()) {
      pipeline.producer_status = written.ok() ? signalled : written;
      break;
    }
  }
  pipeline.queue.Push(nullptr);
}

void Consume(Pipeline& pipeline) {
  DemoReport& report = *pipeline.report;
  const std::vector<Plane>& planes = *pipeline.planes;
  while (std::shared_ptr<Frame> frame = pipeline.queue.Pop()) {
    orvex::ScopedTrace trace("orvex demo: consume frame");
    pipeline.last_image = frame->image;
    const orvex::FenceWaitResult result = frame->image->WaitForDone(kWaitLimit);
    const Clock::time_point woke = Clock::now();
    ++report.frames_processed;
    if (std::holds_alternative<orvex_api::FenceNotDone>(result)) {
      report.failures.push_back(fmt::format("frame {}: not signalled within {}", frame->index,
                                            absl::FormatDuration(kWaitLimit)));
      continue;
    }
    if (const orvex::Status& status = std::get<orvex::Status>(result); !status.ok()) {
      report.failures.push_back(fmt::format("frame {}: {}", frame->index, status.ToString()));
      continue;
    }
    report.wake_latencies.push_back(Since(frame->signalled, woke));
    auto mapped = Image::MappedImage::Make(frame->image.get(), orvex::BufferAccessMode::kRead);
    if (!mapped.ok()) {
      report.failures.push_back(
          fmt::format("frame {}: {}", frame->index, mapped.status().ToString()));
      continue;
    }
    bool good = true;
    for (size_t p = 0; p < planes.size(); ++p) {
      const Image::MappedImage& view = **mapped;
      const uint8_t* data = view.GetPointer(planes[p].component);
      const uint64_t sum = data == nullptr ? 0 : ChecksumPlane(data, planes[p].bytes);
      ++report.planes_checked;
      if (data == nullptr || p >= frame->expected.size() || sum != frame->expected[p]) {
        good = false;
        report.failures.push_back(fmt::format(
            "frame {}: plane {} ({}, buffer {}, offset {}, {} bytes) checksum mismatch",
            frame->index, p, ImageFormat::ComponentContentToString(planes[p].component.content),
            planes[p].buffer, planes[p].offset, planes[p].bytes));
      }
    }
    if (good && report.frames_verified++ == 0) pipeline.first_verified = woke;
    orvex::ScopedTrace::TraceInt("orvex demo: frames verified", report.frames_verified);
    if (pipeline.options->progress != nullptr) {
      *pipeline.options->progress << fmt::format("\rframe {}/{}", frame->index + 1,
                                                 pipeline.options->frames)
                                  << std::flush;
    }
  }
  if (pipeline.options->progress != nullptr)
    *pipeline.options->progress << "\r\033[K" << std::flush;
}

// Reports the run to the latency analyzer and has it write the file at the
// closing operation; returns the file's path.
orvex::StatusOr<std::string> WriteLatencyProfile(const DemoOptions& options,
                                                 std::list<std::pair<std::string, float>> open,
                                                 std::list<std::pair<std::string, float>> process,
                                                 Clock::time_point close_start) {
  orvex::CameraLatencyAnalyzer& analyzer = orvex::CameraLatencyAnalyzer::GetAnalyzer();
  analyzer.SetOutputDirectory(options.out_dir);
  // What "setprop" does on a device: ask for a file at every close.
  if (property_set(orvex::kCameraPerformanceAnalyzerWriteToDiskProperty, "true") != 0) {
    return orvex::InternalError(
        fmt::format("cannot set {}", orvex::kCameraPerformanceAnalyzerWriteToDiskProperty));
  }
  analyzer.InjectEvent("Demo-Open", std::move(open));
  analyzer.InjectEvent("Demo-Process", std::move(process));
  const float close_ms = Ms(Since(close_start));
  // The analyzer names the file this close wrote: a listing of the directory
  // could pick up another process's file, or one when ours failed.
  std::string written;
  analyzer.InjectEvent("Demo-Close", {{"Overall", close_ms}}, &written);
  if (!written.empty()) return written;
  return orvex::InternalError(fmt::format(
      "the latency analyzer wrote no .cpa file into {} (see its [CPA] log line)", options.out_dir));
}

// Writes each buffer of `image` to "frame-<index>-buffer-<b>.raw" in `dir`.
orvex::StatusOr<std::vector<std::string>> DumpFrame(const Image& image, int index,
                                                    const std::string& dir) {
  ORVEX_RETURN_IF_ERROR(orvex::RecursivelyCreateDir(dir));
  ORVEX_ASSIGN_OR_RETURN(std::shared_ptr<Image::MappedImage> mapped,
                         Image::MappedImage::Make(&image, orvex::BufferAccessMode::kRead));
  const std::vector<size_t>& sizes = image.GetFormat().buffer_sizes();
  std::vector<std::string> files;
  for (size_t b = 0; b < sizes.size() && b < mapped->handles().size(); ++b) {
    const auto& handle = mapped->handles()[b];
    const std::string path = orvex::JoinPath(dir, fmt::format("frame-{}-buffer-{}.raw", index, b));
    ORVEX_RETURN_IF_ERROR(
        WriteFileAtomically(path, std::string_view(static_cast<const char*>(handle->data()),
                                                   std::min<uint64_t>(handle->size(), sizes[b]))));
    files.push_back(path);
  }
  return files;
}

}  // namespace

absl::Duration Percentile(std::vector<absl::Duration> values, double p) {
  if (values.empty()) return absl::ZeroDuration();
  std::sort(values.begin(), values.end());
  const double rank = std::ceil(p * static_cast<double>(values.size()));
  const size_t index = rank < 1 ? 0 : static_cast<size_t>(rank) - 1;
  return values[std::min(index, values.size() - 1)];
}

orvex::StatusOr<DemoReport> RunDemo(const DemoOptions& options) {
  const Clock::time_point start = Clock::now();
  ORVEX_ASSIGN_OR_RETURN(
      ImageFormat format,
      ImageFormat::Make(options.size.width, options.size.height, options.format));
  const absl::Duration make_format = Since(start);
  DemoReport report;
  report.format_name = orvex::FormatToString(format.format());
  report.buffers_per_frame = format.buffer_sizes().size();
  for (size_t size : format.buffer_sizes()) report.bytes_per_frame += size;
  if (report.bytes_per_frame > kMaxFrameBytes) {
    return orvex::ResourceExhaustedError(fmt::format(
        "a {}x{} {} frame takes {} bytes; the demo allows at most {} per frame", options.size.width,
        options.size.height, report.format_name, report.bytes_per_frame, kMaxFrameBytes));
  }
  const std::vector<Plane> planes = PlanesOf(format);
  // Drawing the picture is the demo's own set-up, not part of opening.
  const Clock::time_point picture_start = Clock::now();
  const std::optional<FramePicture> picture = MakeFramePicture(format);
  const absl::Duration draw_picture = Since(picture_start);

  Pipeline pipeline{
      .allocator = std::make_shared<orvex::HeapAllocator>(orvex::FenceType::kSoftware),
      .format = &format,
      .planes = &planes,
      .options = &options,
      .picture = picture.has_value() ? &*picture : nullptr,
      .queue = {},
      .producer_status = orvex::OkStatus(),
      .report = &report,
      .first_verified = {},
      .last_image = nullptr};
  const Clock::time_point threads_start = Clock::now();
  std::thread consumer(Consume, std::ref(pipeline));
  std::thread producer(Produce, std::ref(pipeline));
  const absl::Duration open_overall = Since(start) - draw_picture;
  const absl::Duration start_threads = Since(threads_start);
  producer.join();
  consumer.join();
  const Clock::time_point done = Clock::now();
  report.elapsed = Since(threads_start, done);
  ORVEX_RETURN_IF_ERROR(pipeline.producer_status);
  if (!options.dump_dir.empty() && pipeline.last_image != nullptr) {
    ORVEX_ASSIGN_OR_RETURN(
        report.dump_files,
        DumpFrame(*pipeline.last_image, report.frames_processed - 1, options.dump_dir));
  }

  const int frames = std::max(report.frames_processed, 1);
  std::list<std::pair<std::string, float>> process = {
      {"FirstFrame",
       report.frames_verified > 0 ? Ms(Since(threads_start, pipeline.first_verified)) : 0.0f},
      {"FrameAverage", Ms(report.elapsed / frames)},
      {"WakeLatencyMedian", Ms(Percentile(report.wake_latencies, 0.5))},
      {"WakeLatencyP99", Ms(Percentile(report.wake_latencies, 0.99))},
      {"Overall", Ms(report.elapsed)}};
  ORVEX_ASSIGN_OR_RETURN(report.cpa_path, WriteLatencyProfile(options,
                                                              {{"MakeFormat", Ms(make_format)},
                                                               {"StartThreads", Ms(start_threads)},
                                                               {"Overall", Ms(open_overall)}},
                                                              std::move(process), done));
  return report;
}

}  // namespace orvex_tool
