// Prints performance-data files (".cpa") in the Protocol Buffers text form.
//
//   cpa_dump /data/vendor/camera/profiler/camera-ended-2026-12-03_22-45-47.cpa

#include <google/protobuf/text_format.h>

#include <fstream>
#include <iostream>
#include <string>

#include "orvex/api/debug/camera_performance_analyzer.pb.h"

int main(int argc, char** argv) {
  if (argc < 2) {
    std::cerr << "usage: " << argv[0] << " FILE.cpa...\n";
    return 2;
  }
  int result = 0;
  for (int i = 1; i < argc; ++i) {
    std::ifstream in(argv[i], std::ios::binary);
    orvex::CameraPerformanceDataFile file;
    if (!in || !file.ParseFromIstream(&in)) {
      std::cerr << argv[i] << ": not a readable performance-data file\n";
      result = 1;
      continue;
    }
    std::string text;
    google::protobuf::TextFormat::PrintToString(file, &text);
    if (argc > 2) std::cout << "# " << argv[i] << "\n";
    std::cout << text;
  }
  return result;
}
