// A short tour of the error model: errors as values, composition with
// StatusBuilder, propagation macros, errno mapping and debug text.

#include <errno.h>

#include <cstdio>
#include <string>

#include "orvex/status/printable.h"
#include "orvex/status/status.h"
#include "orvex/status/status_builder.h"
#include "orvex/status/status_macros.h"
#include "orvex/status/statusor.h"

namespace {

class Frame : public orvex::Printable {
 public:
  Frame(int width, int height) : width_(width), height_(height) {}
  std::string DebugStr() const override {
    return orvex::BuildOrvexDebugStrWithStrings(
        "Frame", {{"width", std::to_string(width_)}, {"height", std::to_string(height_)}});
  }
  int width() const { return width_; }
  int height() const { return height_; }

 private:
  int width_;
  int height_;
};

orvex::StatusOr<int> BytesFor(const Frame& frame) {
  if (frame.width() <= 0 || frame.height() <= 0) {
    return orvex::InvalidArgumentErrorBuilder(ORVEX_LOC) << "bad frame " << frame;
  }
  return frame.width() * frame.height() * 3 / 2;
}

orvex::Status Describe(const Frame& frame) {
  ORVEX_ASSIGN_OR_RETURN(int bytes, BytesFor(frame));
  std::printf("%s needs %d bytes\n", frame.DebugStr().c_str(), bytes);
  return orvex::OkStatus();
}

}  // namespace

int main() {
  orvex::Status ok = Describe(Frame(4000, 3000));
  std::printf("first frame: %s\n", ok.ToString().c_str());

  orvex::Status bad = Describe(Frame(-1, 3000));
  std::printf("second frame: %s\n", bad.ToString().c_str());

  orvex::Status from_errno = orvex::StatusFromErrno(ENOENT, "open /dev/video0");
  std::printf("errno mapping: %s\n", from_errno.ToString().c_str());

  orvex::Status annotated = orvex::Annotate(from_errno, "while starting the camera");
  std::printf("annotated: %s\n", annotated.ToString().c_str());

  const bool as_expected = ok.ok() && orvex::IsInvalidArgument(bad) && orvex::IsNotFound(annotated);
  std::printf("%s\n", as_expected ? "error model: all results as expected" : "UNEXPECTED RESULT");
  return as_expected ? 0 : 1;
}
