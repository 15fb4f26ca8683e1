// In-process tests of the orvex tool: argument parsing, output shapes, exit
// statuses and error paths of every command, writes that fail part way, and
// pictures written into layouts, rendered to PNG and read back.

#include <fcntl.h>
#include <png.h>
#include <signal.h>
#include <sys/resource.h>
#include <unistd.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <functional>
#include <set>
#include <sstream>
#include <stop_token>
#include <string>
#include <thread>
#include <vector>

#include "absl/strings/ascii.h"
#include "absl/strings/str_join.h"
#include "absl/strings/str_split.h"
#include "cutils/properties.h"
#include "expat.h"
#include "gmock/gmock.h"
#include "google/protobuf/text_format.h"
#include "google/protobuf/util/json_util.h"
#include "gtest/gtest.h"
#include "orvex/api/debug/camera_latency_analyzer.h"
#include "orvex/api/debug/camera_performance_analyzer.pb.h"
#include "orvex/api/memory/hal_pixel_format.h"
#include "orvex/status/status_matchers.h"
#include "tools/orvex/args.h"
#include "tools/orvex/cpa.h"
#include "tools/orvex/demo.h"
#include "tools/orvex/format_names.h"
#include "tools/orvex/json.h"
#include "tools/orvex/layout_svg.h"
#include "tools/orvex/render.h"
#include "tools/orvex/tool.h"

namespace orvex_tool {
namespace {

using ::orvex::HalPixelFormat;
using ::orvex::testing::IsOk;
using ::orvex::testing::IsOkAndHolds;
using ::orvex::testing::StatusIs;
using ::testing::AllOf;
using ::testing::ContainsRegex;
using ::testing::ElementsAre;
using ::testing::EndsWith;
using ::testing::HasSubstr;
using ::testing::Not;
using ::testing::StartsWith;
using TextMatcher = ::testing::Matcher<const std::string&>;

struct RunResult {
  int code;
  std::string out;
  std::string err;
};

RunResult RunOrvex(const std::vector<std::string>& args) {
  std::ostringstream out, err;
  const int code = RunTool(args, out, err);
  return {code, out.str(), err.str()};
}

// A command line, the exit status it must end with and what it must print.
struct Call {
  Call(std::vector<std::string> words, int status, TextMatcher stdout_text,
       TextMatcher stderr_text = "")
      : args(std::move(words)),
        code(status),
        out(std::move(stdout_text)),
        err(std::move(stderr_text)) {}
  std::vector<std::string> args;
  int code;
  TextMatcher out;
  TextMatcher err;
};

// A command line that prints nothing on stdout and `err` on stderr, exit status 2.
Call Fails(std::vector<std::string> args, TextMatcher err) {
  return Call(std::move(args), kExitError, "", std::move(err));
}

// A command line refused with the usage error `message`.
Call Misuse(std::vector<std::string> args, const std::string& message) {
  const std::string& command = args[0];
  return Fails(args, "orvex " + command + ": " + message + "\nRun 'orvex " + command +
                         " --help' for usage.\n");
}

void ExpectCalls(const std::vector<Call>& calls) {
  for (const Call& call : calls) {
    SCOPED_TRACE(::testing::PrintToString(call.args));
    const RunResult result = RunOrvex(call.args);
    EXPECT_EQ(result.code, call.code);
    EXPECT_THAT(result.out, call.out);
    EXPECT_THAT(result.err, call.err);
  }
}

std::string ReadFile(const std::string& path) {
  std::ifstream in(path, std::ios::binary);
  std::stringstream buffer;
  buffer << in.rdbuf();
  return buffer.str();
}

void WriteFile(const std::string& path, const std::string& bytes) {
  std::ofstream(path, std::ios::binary | std::ios::trunc) << bytes;
}

// A scratch directory removed with its files at the end of the test.
struct ScratchDir {
  ScratchDir() {
    char pattern[] = "/tmp/orvex_tool_test.XXXXXX";
    if (mkdtemp(pattern) != nullptr) path = pattern;
    if (path.empty()) ADD_FAILURE() << "mkdtemp failed";
  }
  ~ScratchDir() {
    std::error_code ignored;
    if (!path.empty()) std::filesystem::remove_all(path, ignored);
  }
  std::string File(const std::string& name) const { return path + "/" + name; }
  // The names of the entries.
  std::set<std::string> Names() const {
    std::set<std::string> names;
    for (const auto& entry : std::filesystem::directory_iterator(path)) {
      names.insert(entry.path().filename());
    }
    return names;
  }

  std::string path;
};

// The number of `name` elements in `xml` (only those with attribute `key`
// set to `value`, when `key` is given); -1 when `xml` is not well-formed.
int CountElements(const std::string& xml, std::string_view name, std::string_view key = "",
                  std::string_view value = "") {
  struct Query {
    std::string_view name, key, value;
    int count;
  } query{name, key, value, 0};
  XML_Parser parser = XML_ParserCreate(nullptr);
  XML_SetUserData(parser, &query);
  XML_SetStartElementHandler(parser, [](void* data, const XML_Char* element, const XML_Char** at) {
    Query& q = *static_cast<Query*>(data);
    bool match = q.key.empty();
    for (int i = 0; at[i] != nullptr; i += 2) match |= at[i] == q.key && at[i + 1] == q.value;
    if (element == q.name && match) ++q.count;
  });
  const bool parsed =
      XML_Parse(parser, xml.data(), static_cast<int>(xml.size()), /*isFinal=*/1) == XML_STATUS_OK;
  XML_ParserFree(parser);
  return parsed ? query.count : -1;
}

// Through the flags of `orvex render`: a short form, a boolean flag, and at
// least four positionals. (Commands with an exact count refuse extras and
// shortfalls in their own tests.)
TEST(ArgsTest, ParsesFlagShapesAndRefusesBadArguments) {
  const CommandSpec& spec = RenderCommand().spec;
  // The positionals, flags and help ParseArgs finds, or its error.
  const auto parse = [&](const std::vector<std::string>& args) {
    auto parsed = ParseArgs(spec, args);
    if (!parsed.ok()) return parsed.status().ToString();
    std::string text = absl::StrJoin(parsed->positionals, " ");
    for (const auto& [flag, value] : parsed->values) text += " --" + flag + "=" + value;
    return parsed->help ? text + " help" : text;
  };
  const std::pair<std::vector<std::string>, std::string> cases[] = {
      {{"--out", "o", "w", "h", "f", "x"}, "w h f x --out=o"},
      {{"w", "--out=o=p", "h", "f", "x", "y", "--demosaic"}, "w h f x y --demosaic= --out=o=p"},
      {{"w", "h", "-o", "o", "f", "x"}, "w h f x --out=o"},
      {{"w", "h", "f", "--", "--demosaic"}, "w h f --demosaic"},
      {{"-5", "-0x10", "f", "x"}, "-5 -0x10 f x"},
      {{"--help"}, " help"},  // the count of positionals is not checked
      {{"w", "h", "f", "x", "--bogus"}, "INVALID_ARGUMENT: unknown flag '--bogus'"},
      {{"w", "h", "f", "x", "-x"}, "INVALID_ARGUMENT: unknown flag '-x'"},
      {{"w", "h", "f", "x", "--out"}, "INVALID_ARGUMENT: flag '--out' needs a value (OUT.png)"},
      {{"w", "h", "f", "x", "--demosaic=1"}, "INVALID_ARGUMENT: flag '--demosaic' takes no value"},
      {{"w", "h", "f", "x", "-o", "a", "--out", "b"},
       "INVALID_ARGUMENT: flag '--out' given more than once"},
  };
  for (const auto& [args, want] : cases) {
    SCOPED_TRACE(::testing::PrintToString(args));
    EXPECT_EQ(parse(args), want);
  }
  EXPECT_THAT(UsageText(spec),
              AllOf(StartsWith("usage: orvex render WIDTH HEIGHT FORMAT FILE... [flags]\n\nturn a "
                               "raw buffer dump into a PNG\n\nflags:\n  -o, --out OUT.png   "
                               "       the PNG to write (required)\n"),
                    HasSubstr("\n  -h, --help                 print this help and exit\n\nFILE ")));
}

TEST(ArgsTest, ParsesNumbers) {
  EXPECT_THAT(ParseCode("4294967295", "FORMAT"), IsOkAndHolds(0xffffffffu));
  EXPECT_THAT(ParseSize("640X480", "--size"), IsOkAndHolds(orvex::GenericSize<int>{640, 480}));
  EXPECT_THAT(ParseInteger("10", "N", 1, 10), IsOkAndHolds(10));  // both bounds are allowed
  EXPECT_THAT(ParseLevelRange("3:3", 31), IsOkAndHolds(orvex_api::Range<int>{3, 3}));
  const std::string code = "FORMAT must be a name or a decimal or 0x-hexadecimal code, got ";
  const std::pair<orvex::Status, std::string> failures[] = {
      {ParseInteger("12abc", "N", 1, 10).status(), "N must be a whole number, got '12abc'"},
      {ParseInteger("+5", "N", 1, 10).status(), "N must be a whole number, got '+5'"},
      {ParseInteger("99999999999999999999", "N", 1, 10).status(),
       "N must be between 1 and 10, got 99999999999999999999"},
      {ParseCode("0x", "FORMAT").status(), code + "'0x'"},
      {ParseCode("0x1g", "FORMAT").status(), code + "'0x1g'"},
      {ParseCode("0x100000000", "FORMAT").status(),
       "FORMAT code does not fit in 32 bits: 0x100000000"},
      {ParseSize("640x0", "--size").status(), "height must be between 1 and 2147483647, got 0"},
      {ParseSize("x480", "--size").status(), "width must be a whole number, got ''"},
      {ParseLevelRange("3", 31).status(), "--levels must look like LOW:HIGH, got '3'"},
      {ParseLevelRange("-1:2", 31).status(), "LOW must be between 0 and 31, got -1"},
  };
  for (const auto& [status, message] : failures) {
    SCOPED_TRACE(message);
    EXPECT_THAT(status, StatusIs(orvex::StatusCode::kInvalidArgument, message));
  }
}

// What the commands' outputs do not show: escapes, negative and 64-bit numbers,
// null, an empty array.
TEST(JsonTest, PrintsEscapesAndNumbers) {
  Json doc = Json::MakeObject()
                 .Set("name", "a\"b\\c\n\r\t\x01")
                 .Set("n", int64_t{-3})
                 .Set("big", uint64_t{18446744073709551615u})
                 .Set("none", Json())
                 .Set("empty", Json::MakeArray());
  EXPECT_EQ(doc.Dump(),
            "{\n  \"name\": \"a\\\"b\\\\c\\n\\r\\t\\u0001\",\n  \"n\": -3,\n"
            "  \"big\": 18446744073709551615,\n  \"none\": null,\n  \"empty\": []\n}\n");
}

TEST(JsonDeathTest, AddingToTheWrongKindOfValueIsFatal) {
  EXPECT_DEATH(Json::MakeObject().Append(1),
               "Check failed: std::holds_alternative<Array>\\(value_\\) Append on a JSON value "
               "that is no array");
  EXPECT_DEATH(Json::MakeArray().Set("k", 1),
               "Check failed: std::holds_alternative<Object>\\(value_\\) Set on a JSON value "
               "that is no object");
}

TEST(ToolTest, UsageHelpAndUnknownCommands) {
  const std::string unknown = "orvex: unknown command 'nosuch'\n\nusage: orvex COMMAND";
  ExpectCalls({
      Fails({}, StartsWith("usage: orvex COMMAND")),
      Call({"--help"}, kExitOk,
           AllOf(StartsWith("usage: orvex COMMAND"), HasSubstr("\n  layout "))),
      Fails({"nosuch"}, StartsWith(unknown)),
      Fails({"help", "nosuch"}, StartsWith(unknown)),
  });
  for (const Command* command : {&DemoCommand(), &FormatsCommand(), &LayoutCommand(),
                                 &RenderCommand(), &PyramidCommand(), &CpaCommand()}) {
    const std::string name(command->spec.name);
    const std::string usage = UsageText(command->spec);
    ExpectCalls({
        Call({name, "--help"}, kExitOk, usage),
        Call({"help", name}, kExitOk, usage),
        Misuse({name, "--no-such-flag"}, "unknown flag '--no-such-flag'"),
    });
  }
}

// Output that cannot be written (/dev/full takes no byte) is an error whatever
// the command answered.
TEST(ToolTest, StandardOutputThatCannotBeWrittenIsAnError) {
  ScratchDir dir;
  const int file = open(dir.File("stdout").c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600);
  const int device = open("/dev/full", O_WRONLY | O_CLOEXEC);
  std::ostringstream err;
  EXPECT_EQ(RunTool({"formats", "--json"}, file, err), kExitOk);
  EXPECT_EQ(ReadFile(dir.File("stdout")), RunOrvex({"formats", "--json"}).out);
  // Output beyond the buffer, and a short negative answer.
  EXPECT_EQ(RunTool({"formats", "--json"}, device, err), kExitError);
  EXPECT_EQ(RunTool({"layout", "64", "32", "RAW10", "--conform", "0x23"}, device, err), kExitError);
  close(file);
  close(device);
  const std::string stdout_full =
      "RESOURCE_EXHAUSTED: cannot write standard output: No space left on device\n";
  EXPECT_EQ(err.str(), stdout_full + stdout_full);
}

TEST(FormatsTest, TableAndJson) {
  ExpectCalls({
      Call({"formats"}, kExitOk,
           AllOf(StartsWith(
                     "       HEX     DECIMAL  NAME                                            BPP "
                     " COMPRESSION                    64B  UNCOMPRESSED\n"
                     "       0x3           3  RGB_888                                       "
                     "    8  None                           no   same\n"),
                 HasSubstr(
                     "\n0x4000000b  1073741835  YCBCR_420_SP_M_S10B_SBWC_STRIDE_ALIGNED_64      "
                     " 10  SBWC                           yes  "
                     "YCBCR_420_SP_M_S10B_STRIDE_ALIGNED_64\n"))),
      Call(
          {"formats", "--json"}, kExitOk,
          AllOf(StartsWith("{\n  \"formats\": [\n    {\"name\": \"RGB_888\", \"code\": 3, "),
                HasSubstr("    {\"name\": \"YCBCR_420_SP_M_SBWC_L50\", \"code\": 320, \"hex\": "
                          "\"0x140\", \"bits_per_sample\": 8, \"compression\": \"Lossy SBWC Medium "
                          "Compression\", \"aligned_64\": false, \"uncompressed\": "
                          "\"YCBCR_420_888\"},\n"))),
      Misuse({"formats", "extra"}, "unexpected argument 'extra'"),
  });
}

TEST(LayoutTest, OutputAndExitStatus) {
  ScratchDir dir;
  const std::string missing = dir.File("no/x.svg");
  ExpectCalls({
      Call(
          {"layout", "4000", "3000", "0x25", "--json"}, kExitOk,
          "{\n"
          "  \"format\": \"RAW10\",\n"
          "  \"code\": 37,\n"
          "  \"width\": 4000,\n"
          "  \"height\": 3000,\n"
          "  \"buffer_sizes\": [15000000],\n"
          "  \"components\": [\n"
          "    {\"content\": \"Bayer\", \"buffer_index\": 0, \"offset_bytes\": 0, \"width\": 4000, "
          "\"height\": 3000, \"row_stride_bytes\": 5000, \"bits_per_pixel\": 10, \"pixel_stride\": "
          "1, \"pixel_phase\": 0}\n"
          "  ],\n"
          "  \"chroma_subsampling\": null,\n"
          "  \"interleaved_chroma_order\": null\n"
          "}\n"),
      // A substituted format reports the layout actually made.
      Call({"layout", "64", "32", "34", "--json", "--order", "cbcr"}, kExitOk,
           AllOf(HasSubstr("\"format\": \"YCBCR_420_888\",\n  \"code\": 35,\n"),
                 HasSubstr("\"buffer_sizes\": [2048, 1024],\n"),
                 HasSubstr("\"chroma_subsampling\": \"420\",\n  \"interleaved_chroma_order\": "
                           "\"CbCr\"\n"))),
      Call({"layout", "1920", "1080", "YCBCR_P010"}, kExitOk,
           "YCBCR_P010 (0x36 = 54), 1920 x 1080\n"
           "chroma subsampling: 420, interleaved chroma order: CbCr\n"
           "buffer 0: 6220800 bytes\n"
           "total: 6220800 bytes in 1 buffer\n"
           "\n"
           "CONTENT  BUFFER   OFFSET  WIDTH  HEIGHT  ROW STRIDE  BPP  PIXEL STRIDE  PHASE\n"
           "Luma          0        0   1920    1080        3840   16             1      0\n"
           "ChromaB       0  4147200    960     540        3840   16             2      0\n"
           "ChromaR       0  4147200    960     540        3840   16             2      1\n"),
      Call({"layout", "1920", "1080", "YCBCR_420_888", "--conform", "YCBCR_420_888"}, kExitOk,
           EndsWith("\n\nconformance to YCBCR_420_888: conforms\n")),
      Call({"layout", "4000", "3000", "RAW10", "--conform", "0x23"}, kExitNegative,
           ContainsRegex("\n\nconformance to YCBCR_420_888: INVALID_ARGUMENT: [^\n]+\n$")),
      // With --json stdout stays a pure JSON object and the verdict goes to stderr.
      Call({"layout", "2", "2", "Y10", "--json", "--conform", "Y10"}, kExitNegative,
           AllOf(StartsWith("{\n"), EndsWith("}\n")),
           ContainsRegex("^conformance to Y10: INVALID_ARGUMENT: [^\n]+\n$")),
      Fails({"layout", "64", "64", "0x1234"}, StartsWith("UNIMPLEMENTED: Unsupported")),
      Misuse({"layout", "abc", "64", "RAW10"}, "WIDTH must be a whole number, got 'abc'"),
      Misuse({"layout", "64", "-2", "RAW10"}, "HEIGHT must be between 1 and 2147483647, got -2"),
      Misuse({"layout", "64", "64", "NOPE"},
             "unknown FORMAT 'NOPE' (see 'orvex formats' for the names, or give a code)"),
      Misuse({"layout", "64", "64", "RAW10", "--order", "RGB"},
             "--order must be CbCr or CrCb, got 'RGB'"),
      Misuse({"layout", "64", "64", "RAW10", "--conform", "x"},
             "unknown --conform TARGET 'x' (see 'orvex formats' for the names, or give a code)"),
      Misuse({"layout", "64", "64"}, "expected 3 arguments (WIDTH HEIGHT FORMAT), got 2"),
      // A target that cannot be checked gets no verdict.
      Fails({"layout", "64", "64", "YCBCR_420_SP_M", "--conform", "YCBCR_420_SP_M"},
            "UNIMPLEMENTED: Unable to check if conforms to YCBCR_420_SP_M\n"),
      Fails({"layout", "64", "64", "YV12", "--conform", "0x1234"},
            "UNIMPLEMENTED: Unable to check if conforms to UnknownFormat_0x1234\n"),
      Fails({"layout", "64", "32", "YV12", "--svg", missing},
            "NOT_FOUND: cannot write " + missing + ": No such file or directory\n"),
      Fails({"layout", "64", "32", "YV12", "--svg", dir.path},
            "FAILED_PRECONDITION: cannot write " + dir.path + ": Is a directory\n"),
      Fails({"layout", "64", "32", "YV12", "--svg", "/dev/full"},
            "RESOURCE_EXHAUSTED: cannot write /dev/full: No space left on device\n"),
  });
}

TEST(LayoutTest, SvgDrawsEveryBufferAndComponentToScale) {
  ScratchDir dir;
  const std::string path = dir.File("layout.svg");
  ASSERT_EQ(RunOrvex({"layout", "1920", "1080", "YCBCR_422_I", "--svg", path}).code, kExitOk);
  const std::string svg = ReadFile(path);
  EXPECT_EQ(CountElements(svg, "rect"), 8);  // background, bar, 3 components, 3 legend keys
  EXPECT_THAT(svg, AllOf(StartsWith("<svg xmlns=\"http://www.w3.org/2000/svg\""),
                         HasSubstr(">YCBCR_422_I 1920 x 1080: 1 buffer, 4147200 bytes</text>"),
                         HasSubstr(">buffer 0: 4147200 bytes</text>")));
  // Luma, Cb and Cr share every byte of the interleaved buffer: three lanes,
  // each the full bar length.
  EXPECT_THAT(svg, HasSubstr("<rect x=\"20\" y=\"70\" width=\"720.00\" height=\"78\""));
  for (const std::string label : {"Luma", "ChromaB", "ChromaR"}) {
    EXPECT_THAT(svg, AllOf(HasSubstr(">" + label + "</text>"),
                           ContainsRegex("<text x=\"36\" y=\"[0-9]+\" font-size=\"11\">" + label +
                                         ": offset 0, 4147200 bytes")));
  }
  // Two buffers drawn to one scale: the chroma bar is half the luma bar.
  ASSERT_EQ(RunOrvex({"layout", "64", "32", "YCBCR_420_888", "--svg", path}).code, kExitOk);
  EXPECT_THAT(ReadFile(path), AllOf(HasSubstr("width=\"720.00\""), HasSubstr("width=\"360.00\""),
                                    HasSubstr(">buffer 1: 1024 bytes</text>")));
  // Planes that only touch share a lane.
  ASSERT_EQ(RunOrvex({"layout", "64", "32", "YV12", "--svg", path}).code, kExitOk);
  EXPECT_THAT(ReadFile(path), HasSubstr("width=\"720.00\" height=\"26\" fill=\"#f4f4f4\""));
  EXPECT_EQ(XmlEscape("a<b>&\"c"), "a&lt;b&gt;&amp;&quot;c");
}

TEST(PyramidTest, OutputAndExitStatus) {
  ExpectCalls({
      Call({"pyramid", "4000", "3000", "--levels", "0:2", "--alignment", "64", "--bpp", "10"},
           kExitOk,
           "LEVEL  WIDTH  HEIGHT     BYTES\n"
           "    0   4000    3000  15168000\n"
           "    1   2000    1500   3840000\n"
           "    2   1000     750    960000\n"
           "total: 19968000 bytes\n"),
      Call({"pyramid", "100", "75", "--levels=1:2", "--alignment", "64", "--bpp", "8", "--json"},
           kExitOk,
           "{\n"
           "  \"levels\": [\n"
           "    {\"level\": 1, \"width\": 50, \"height\": 38, \"bytes\": 2432},\n"
           "    {\"level\": 2, \"width\": 25, \"height\": 19, \"bytes\": 1216}\n"
           "  ],\n"
           "  \"total_bytes\": 3648\n"
           "}\n"),
      Misuse({"pyramid", "64", "64", "--alignment", "64", "--bpp", "8"},
             "--levels, --alignment and --bpp are required"),
      Misuse({"pyramid", "64", "64", "--levels", "2:1", "--alignment", "64", "--bpp", "8"},
             "--levels LOW must not exceed HIGH, got 2:1"),
      Misuse({"pyramid", "64", "64", "--levels", "0:32", "--alignment", "64", "--bpp", "8"},
             "HIGH must be between 0 and 31, got 32"),
      Misuse({"pyramid", "64", "64", "--levels", "0:1", "--alignment", "x", "--bpp", "8"},
             "--alignment must be a whole number, got 'x'"),
      Misuse({"pyramid", "0", "64", "--levels", "0:1", "--alignment", "1", "--bpp", "8"},
             "WIDTH must be between 1 and 2147483647, got 0"),
      Fails({"pyramid", "64", "64", "--levels", "0:1", "--alignment", "0", "--bpp", "8"},
            "INVALID_ARGUMENT: alignment must be >= 1, received: 0\n"),
  });
}

orvex::CameraPerformanceDataFile SampleCpa() {
  orvex::CameraPerformanceDataFile file;
  EXPECT_TRUE(google::protobuf::TextFormat::ParseFromString(
      R"(camera_latency_data { operation_case: "Camera-Open"
           latency_data { event_name: "Overall" duration_ms: 212.5 }
           latency_data { event_name: "SensorPowerUp" duration_ms: 48.0625 } }
         camera_latency_data { operation_case: "Camera-Close" }
         camera_data { camera_id: 1 per_frame_data { frame_number: 7 } per_frame_data { frame_number: 8 } }
         graph_representation { graph_name: "preview" nodes { node_name: "isp" } })",
      &file));
  return file;
}

TEST(CpaTest, OneFile) {
  ScratchDir dir;
  const std::string sample = SampleCpa().SerializeAsString();
  WriteFile(dir.File("sample.cpa"), sample);
  WriteFile(dir.File("empty.cpa"), "");
  // --json is the Protocol Buffers printing: it parses back to the message.
  const auto parses_back = [&](const std::string& json) {
    orvex::CameraPerformanceDataFile parsed;
    return google::protobuf::util::JsonStringToMessage(json, &parsed).ok() &&
           parsed.SerializeAsString() == sample;
  };
  const std::string missing = dir.File("missing.cpa");
  std::vector<Call> calls = {
      Call({"cpa", dir.File("sample.cpa")}, kExitOk,
           "OPERATION     EVENT          DURATION (ms)\n"
           "Camera-Open   Overall              212.500\n"
           "Camera-Open   SensorPowerUp         48.062\n"
           "Camera-Close  -                          -\n"
           "latency data: 2 operations, 2 events\n"
           "camera data: 1 camera, 2 frames\n"
           "graph representation: 'preview', 1 nodes, 0 edges\n"),
      Call({"cpa", "--json", dir.File("sample.cpa")}, kExitOk,
           AllOf(::testing::Truly(parses_back), HasSubstr("\"operationCase\": \"Camera-Open\""),
                 EndsWith("}\n"))),
      // An empty file is a valid file that holds nothing.
      Call({"cpa", dir.File("empty.cpa")}, kExitOk,
           "latency data: none\ncamera data: 0 cameras, 0 frames\ngraph representation: none\n"),
      Call({"cpa", dir.File("empty.cpa"), "--json"}, kExitOk, "{}\n"),
      Fails({"cpa", missing},
            "NOT_FOUND: cannot open " + missing + ": No such file or directory\n"),
  };
  // Cut short, a bad wire type, an unended varint, text; every other one with --json.
  const std::string corrupt[] = {sample.substr(0, sample.size() - 3), std::string("\x0f", 1),
                                 std::string("\x08\xff\xff", 3), "this is not a profile\n"};
  for (size_t i = 0; i < std::size(corrupt); ++i) {
    const std::string path = dir.File(std::to_string(i) + ".cpa");
    WriteFile(path, corrupt[i]);
    calls.push_back(Fails({"cpa", path, i % 2 == 0 ? "--" : "--json"},
                          "INVALID_ARGUMENT: " + path +
                              " is not a valid .cpa file: it does not parse as a "
                              "CameraPerformanceDataFile message (" +
                              std::to_string(corrupt[i].size()) + " bytes)\n"));
  }
  ExpectCalls(calls);
}

TEST(CpaTest, HostileInputIsBoundedAndEscaped) {
  ScratchDir dir;
  // Far over 2 GiB: refused before anything is read (sparse, no disk used).
  const std::string huge = dir.File("huge.cpa");
  WriteFile(huge, "");
  ASSERT_EQ(truncate(huge.c_str(), off_t{3} << 30), 0);
  ExpectCalls({
      Fails({"cpa", huge},
            "INVALID_ARGUMENT: " + huge +
                " is 3221225472 bytes, more than the 2147483647 a .cpa file can hold\n"),
      // A device that never ends is parsed as it is read: its first byte ends it.
      Fails({"cpa", "/dev/zero"},
            StartsWith("INVALID_ARGUMENT: /dev/zero is not a valid .cpa file")),
  });
  // A stream of valid records is cut off at the limit.
  int fds[2];
  ASSERT_EQ(pipe(fds), 0);
  std::string records;
  for (int i = 0; i < 50; ++i) records += std::string("\x1a\x00", 2);  // empty latency data
  ASSERT_EQ(write(fds[1], records.data(), records.size()), static_cast<ssize_t>(records.size()));
  close(fds[1]);
  const std::string stream = "/dev/fd/" + std::to_string(fds[0]);
  EXPECT_THAT(ReadCpaFile(stream, 64).status(),
              StatusIs(orvex::StatusCode::kInvalidArgument,
                       stream + " goes on past 64 bytes, more than a .cpa file can hold"));
  EXPECT_THAT(ReadCpaFile(stream, 200).status(), IsOk());  // the rest of it, within the limit
  close(fds[0]);

  // Names cannot drive the terminal: control characters print escaped.
  orvex::CameraPerformanceDataFile file;
  orvex::CameraLatencyData* operation = file.add_camera_latency_data();
  operation->set_operation_case("\x1b]0;owned\x07Open");
  operation->add_latency_data()->set_event_name(std::string("A\0B\xc2\x9b\\", 6));
  const std::string path = dir.File("names.cpa");
  WriteFile(path, file.SerializeAsString());
  EXPECT_THAT(ReadCpaFile(path, file.ByteSizeLong()).status(), IsOk());  // a file at the limit
  const TextMatcher escaped =
      AllOf(HasSubstr("\\x1b]0;owned\\x07Open"), HasSubstr("A\\x00B\\u009b\\\\"),
            Not(ContainsRegex("[\x1b\x07]")), Not(HasSubstr(std::string(1, '\0'))));
  ExpectCalls({Call({"cpa", path}, kExitOk, escaped), Call({"cpa", path, path}, kExitOk, escaped)});
}

TEST(CpaTest, ManySessionsWrittenByTheAnalyzer) {
  ScratchDir dir;
  orvex::CameraLatencyAnalyzer& analyzer = orvex::CameraLatencyAnalyzer::GetAnalyzer();
  analyzer.SetOutputDirectory(dir.path);
  ASSERT_EQ(property_set(orvex::kCameraPerformanceAnalyzerWriteToDiskProperty, "true"), 0);
  for (float open_ms : {100.0f, 350.0f, 200.0f}) {
    analyzer.InjectEvent("Camera-Open", {{"Overall", open_ms}, {"SensorPowerUp", 40.0f}});
    analyzer.InjectEvent("Camera-Close", {{"Overall", 50.0f}});
  }
  const std::string bad = dir.File("bad.cpa");
  WriteFile(bad, "this is not a profile\n");
  const std::string svg = dir.File("chart.svg");
  const std::string skipped = "skipped: INVALID_ARGUMENT: " + bad +
                              " is not a valid .cpa file: it does not parse as a "
                              "CameraPerformanceDataFile message (22 bytes)\n";
  ExpectCalls({
      Call({"cpa", dir.path, "--svg", svg}, kExitError,
           AllOf(StartsWith("3 sessions, "),
                 HasSubstr("\nCamera-Open (3 sessions, threshold 300 ms: 1 over)\n"
                           "EVENT          COUNT  MIN (ms)  MEDIAN (ms)  P90 (ms)  MAX (ms)\n"
                           "Overall            3   100.000      200.000   350.000   350.000\n"
                           "SensorPowerUp      3    40.000       40.000    40.000    40.000\n"),
                 HasSubstr("\nCamera-Close (3 sessions, threshold 250 ms: 0 over)\n"),
                 // Sessions in time order: only the second one was slow.
                 ContainsRegex("\nsessions in time order:\nTIME +FILE +OPERATIONS +OVER THRESHOLD\n"
                               "[^\n]+  2  -\n[^\n]+  2  Camera-Open\n[^\n]+  2  -\n$")),
           skipped),
      Call({"cpa", dir.path, "--svg", "/dev/full"}, kExitError, StartsWith("3 sessions, "),
           skipped + "RESOURCE_EXHAUSTED: cannot write /dev/full: No space left on device\n"),
      Call({"cpa", dir.path + "/", "--json"}, kExitError,
           HasSubstr("{\"event\": \"Overall\", \"count\": 3, \"min_ms\": 100, \"median_ms\": 200, "
                     "\"p90_ms\": 350, \"max_ms\": 350}"),
           skipped),
  });
  // A point per session for each of the two operations; one over the threshold.
  const std::string chart = ReadFile(svg);
  EXPECT_EQ(CountElements(chart, "circle"), 6);
  EXPECT_EQ(CountElements(chart, "circle", "fill", "#c0392b"), 1);
  EXPECT_THAT(chart, HasSubstr(">Camera-Open: Overall per session (threshold 300 ms, 1 of 3 at or "
                               "over)</text>"));
}

// Runs `body` in a child process whose writes may not take a file past 16
// bytes (such a write fails with EFBIG) and prints what it returns on stderr,
// which must match `pattern`.
void ExpectUnderFileSizeLimit(const std::function<std::string()>& body,
                              const std::string& pattern) {
  EXPECT_EXIT(
      {
        signal(SIGXFSZ, SIG_IGN);
        struct rlimit limit;
        getrlimit(RLIMIT_FSIZE, &limit);
        const rlim_t soft = limit.rlim_cur;
        limit.rlim_cur = 16;
        setrlimit(RLIMIT_FSIZE, &limit);
        const std::string report = body();
        limit.rlim_cur = soft;  // stderr is a file too
        setrlimit(RLIMIT_FSIZE, &limit);
        fprintf(stderr, "%s", report.c_str());
        _exit(0);
      },
      ::testing::ExitedWithCode(0), pattern);
}

// In a child process, where a file-size limit makes the write of each
// command's file fail part way: the earlier file stays as it was and no
// partial file is left.
TEST(FaultDeathTest, WriteCutShortLeavesTheOldFile) {
  ScratchDir dir;
  WriteFile(dir.File("grey.raw"), std::string(64 * 32, '\x80'));
  WriteFile(dir.File("one.cpa"), SampleCpa().SerializeAsString());
  const std::string out = dir.File("out");
  const std::vector<std::string> commands[] = {
      {"layout", "64", "32", "YV12", "--svg", out},
      {"render", "64", "32", "Y8", dir.File("grey.raw"), "-o", out},
      {"cpa", dir.File("one.cpa"), "--svg", out},
  };
  for (const std::vector<std::string>& args : commands) {
    SCOPED_TRACE(args[0]);
    WriteFile(out, "old");
    ExpectUnderFileSizeLimit(
        [&] {
          const RunResult result = RunOrvex(args);
          return std::to_string(result.code) + " " + result.err;
        },
        "2 OUT_OF_RANGE: cannot write .*/out: File too large\n$");
    EXPECT_EQ(ReadFile(out), "old");
    EXPECT_THAT(dir.Names(), ElementsAre("grey.raw", "one.cpa", "out"));
  }
}

// The PNG at `path` read as RGB, with `channels` telling whether the file
// holds colour; an empty picture when it does not read.
Picture ReadPng(const std::string& path) {
  png_image image = {};
  image.version = PNG_IMAGE_VERSION;
  Picture picture;
  if (png_image_begin_read_from_file(&image, path.c_str()) == 0) return picture;
  picture.channels = (image.format & PNG_FORMAT_FLAG_COLOR) != 0 ? 3 : 1;
  image.format = PNG_FORMAT_RGB;
  picture.pixels.resize(PNG_IMAGE_SIZE(image));
  if (png_image_finish_read(&image, nullptr, picture.pixels.data(), 0, nullptr) == 0) return {};
  picture.width = static_cast<int>(image.width);
  picture.height = static_cast<int>(image.height);
  return picture;
}

// Whether the pixel at x, y of `picture` (read by ReadPng) is within
// `tolerance` of `want` in every channel.
::testing::AssertionResult PixelNear(const Picture& picture, int x, int y, Rgb want,
                                     int tolerance) {
  const uint8_t* got = &picture.pixels[(static_cast<size_t>(y) * picture.width + x) * 3];
  if (std::abs(got[0] - want.r) <= tolerance && std::abs(got[1] - want.g) <= tolerance &&
      std::abs(got[2] - want.b) <= tolerance) {
    return ::testing::AssertionSuccess();
  }
  return ::testing::AssertionFailure()
         << "pixel " << x << "," << y << ": got " << +got[0] << " " << +got[1] << " " << +got[2]
         << ", want " << +want.r << " " << +want.g << " " << +want.b;
}

TEST(DemoTest, PercentileIsNearestRank) {
  std::vector<absl::Duration> values;
  for (int i = 100; i >= 1; --i) values.push_back(absl::Milliseconds(i));
  EXPECT_EQ(Percentile({}, 0.5), absl::ZeroDuration());
  EXPECT_EQ(Percentile({absl::Seconds(3)}, 0.99), absl::Seconds(3));
  EXPECT_EQ(Percentile(values, 0.5), absl::Milliseconds(50));
  EXPECT_EQ(Percentile(values, 0.99), absl::Milliseconds(99));
  EXPECT_EQ(Percentile(values, 1.0), absl::Milliseconds(100));
}

TEST(DemoTest, EveryPlaneOfEveryLayoutFamilyIsVerified) {
  ScratchDir dir;
  struct Case {
    HalPixelFormat format;
    int planes;  // distinct runs of bytes written and checked per frame
    std::optional<int> corrupt = std::nullopt;
    std::vector<std::string> failures = {};
  };
  const Case cases[] = {
      {HalPixelFormat::YCBCR_420_888, 2},  // luma + interleaved chroma
      {HalPixelFormat::YCBCR_P010, 2},     // one buffer, two planes
      {HalPixelFormat::YV12, 3},
      {HalPixelFormat::YCBCR_422_I, 1},
      {HalPixelFormat::RAW10, 1},
      {HalPixelFormat::BLOB, 1},
      {HalPixelFormat::YCBCR_420_SP_M_SBWC, 4},  // headers and payloads
      {HalPixelFormat::YV12,
       3,
       2,
       {"frame 2: plane 2 (ChromaB, buffer 0, offset 2560, 512 bytes) checksum mismatch"}},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(orvex::FormatToString(c.format));
    // 5 frames of 64x32 into `dir`, no progress, no dump.
    auto report = RunDemo({{64, 32}, c.format, 5, dir.path, nullptr, "", c.corrupt});
    ASSERT_THAT(report.status(), IsOk());
    EXPECT_EQ(report->frames_processed, 5);
    EXPECT_EQ(report->frames_verified, 5 - static_cast<int>(c.failures.size()));
    EXPECT_EQ(report->planes_checked, 5 * c.planes);
    EXPECT_EQ(report->failures, c.failures);
    EXPECT_EQ(report->wake_latencies.size(), 5u);
    EXPECT_THAT(report->cpa_path, StartsWith(dir.path + "/camera-ended-"));
  }
}

// The command end to end: its report, the profile read back with `orvex cpa`,
// the trace, and the last frame rendered as the report suggests.
TEST(DemoTest, CommandReportsProfileTraceAndLastFrame) {
  ScratchDir dir;
  const std::string out = dir.File("nested/out");
  const std::string trace = dir.File("trace.json");
  RunResult result = RunOrvex({"demo", "--size", "64x32", "--frames", "3", "--format", "yv12",
                               "--out", out, "--trace", trace, "--dump", dir.File("dump")});
  ASSERT_EQ(result.code, kExitOk) << result.err;
  EXPECT_EQ(result.err, "");
  EXPECT_THAT(result.out,
              ::testing::MatchesRegex(
                  "orvex demo: 3 frames of YV12 64x32 \\(1 buffer, 3072 bytes per frame\\)\n"
                  "frames processed: 3\n"
                  "verification: passed \\(3 of 3 frames, 9 plane checksums\\)\n"
                  "throughput: [0-9.]+ frames/s, [0-9.]+ MB/s \\([0-9.]+ s in all\\)\n"
                  "signal-to-wake latency: median [0-9.]+ ms, p99 [0-9.]+ ms\n"
                  "latency profile: .*/camera-ended-[0-9_-]+\\.cpa\n"
                  "  read it back with: orvex cpa .*\\.cpa\n"
                  "last frame: .*/dump/frame-2-buffer-0.raw\n"
                  "  render it with: orvex render 64 32 YV12 .*/dump/frame-2-buffer-0.raw -o "
                  ".*/dump/last-frame.png\n"
                  "trace: .*/trace.json \\(open it in the Perfetto UI, [^\n]*\\)\n"));
  // The argument after `marker` up to the end of its line.
  const auto after = [&](const std::string& marker) {
    const size_t at = result.out.find(marker) + marker.size();
    return result.out.substr(at, result.out.find('\n', at) - at);
  };
  const std::string cpa = after("latency profile: ");
  EXPECT_THAT(cpa, StartsWith(out + "/camera-ended-"));
  ExpectCalls({Call({"cpa", cpa}, kExitOk,
                    AllOf(ContainsRegex("\nDemo-Open +Overall +[0-9.]+\n"),
                          ContainsRegex("\nDemo-Process +WakeLatencyP99 +[0-9.]+\n"),
                          ContainsRegex("\nDemo-Close +Overall +[0-9.]+\n"),
                          HasSubstr("latency data: 3 operations, 9 events\n")))});
  EXPECT_THAT(ReadFile(trace), AllOf(StartsWith("["), HasSubstr("\"orvex demo: produce frame\""),
                                     HasSubstr("\"orvex demo: consume frame\""),
                                     HasSubstr("\"SoftwareFence WaitForDone\""),
                                     HasSubstr("\"orvex demo: frames verified\"")));

  const std::vector<std::string> render = absl::StrSplit(after("render it with: orvex "), ' ');
  ASSERT_EQ(RunOrvex(render).code, kExitOk);
  const Picture picture = ReadPng(render.back());
  ASSERT_EQ(picture.width, 64);
  ASSERT_EQ(picture.height, 32);
  EXPECT_TRUE(PixelNear(picture, 0, 0, {235, 235, 235}, 3));    // white bar
  EXPECT_TRUE(PixelNear(picture, 44, 10, {235, 16, 16}, 3));    // red bar
  EXPECT_TRUE(PixelNear(picture, 63, 31, {235, 235, 235}, 3));  // progress bar, last frame: full
}

// In a child process, where a file-size limit fails the demo's own profile
// while other .cpa files keep appearing in the directory: the demo fails and
// names none of them.
TEST(DemoDeathTest, NamesOnlyTheProfileItWrote) {
  ScratchDir dir;
  ExpectUnderFileSizeLimit(
      [&] {
        std::jthread other([&](std::stop_token stop) {
          for (int i = 0; !stop.stop_requested(); ++i) {
            WriteFile(dir.File("other-" + std::to_string(i) + ".cpa"), "");
          }
        });
        std::string errors;
        for (int run = 0; run < 5; ++run) {
          errors += RunOrvex({"demo", "--size", "64x32", "--frames", "1", "--out", dir.path}).err;
        }
        return errors;
      },
      "(INTERNAL: the latency analyzer wrote no \\.cpa file into [^\n]*\n){5}$");
}

TEST(DemoTest, Errors) {
  ScratchDir dir;
  const std::string file = dir.File("plain-file");
  WriteFile(file, "x");
  ExpectCalls({
      Misuse({"demo", "--size", "64"}, "--size must look like WIDTHxHEIGHT, got '64'"),
      Misuse({"demo", "--frames", "0"}, "--frames must be between 1 and 100000, got 0"),
      Misuse({"demo", "--format", "nope"},
             "unknown --format 'nope' (see 'orvex formats' for the names, or give a code)"),
      Misuse({"demo", "--out="}, "--out must name a directory"),
      Misuse({"demo", "--dump="}, "--dump must name a directory"),
      Misuse({"demo", "extra"}, "unexpected argument 'extra'"),
      // A trace cut short is not recommended; the run is reported.
      Call({"demo", "--size", "64x32", "--frames", "1", "--out", dir.path, "--trace", "/dev/full"},
           kExitError, AllOf(HasSubstr("verification: passed"), Not(HasSubstr("trace:"))),
           "RESOURCE_EXHAUSTED: cannot write the trace /dev/full: No space left on device\n"),
      Fails({"demo", "--format", "RGB_888", "--out", dir.path},
            StartsWith("UNIMPLEMENTED: Unsupported")),
      Fails(
          {"demo", "--size", "30000x30000", "--out", dir.path},
          "RESOURCE_EXHAUSTED: a 30000x30000 YCBCR_420_888 frame takes 1350000000 bytes; the demo "
          "allows at most 1073741824 per frame\n"),
      Fails({"demo", "--size", "64x32", "--frames", "1", "--out", file + "/sub"},
            "INTERNAL: the latency analyzer wrote no .cpa file into " + file +
                "/sub (see its [CPA] log line)\n"),
      Fails({"demo", "--size", "64x32", "--trace", dir.File("no/trace.json")},
            "NOT_FOUND: cannot trace into " + dir.File("no/trace.json") +
                ": No such file or directory\n"),
  });
}

// Writes `buffers` as a dump (one file per buffer, or back to back in one),
// renders it with `flags` and reads the PNG back.
Picture RenderDump(const orvex::ImageFormat& format, const std::vector<std::string>& buffers,
                   const std::vector<std::string>& flags, bool one_file) {
  ScratchDir scratch;
  std::vector<std::string> args = {"render", std::to_string(format.width()),
                                   std::to_string(format.height()),
                                   orvex::FormatToString(format.format())};
  for (size_t i = 0; i < buffers.size(); ++i) {
    if (one_file && i > 0) break;
    args.push_back(scratch.File(std::to_string(i) + ".raw"));
    WriteFile(args.back(), one_file ? absl::StrJoin(buffers, "") : buffers[i]);
  }
  const std::string png = scratch.File("out.png");
  args.insert(args.end(), {"-o", png});
  args.insert(args.end(), flags.begin(), flags.end());
  const RunResult result = RunOrvex(args);
  EXPECT_EQ(result.code, kExitOk) << result.err;
  const Picture picture = ReadPng(png);
  EXPECT_EQ(result.out, png + ": " + std::to_string(picture.width) + "x" +
                            std::to_string(picture.height) +
                            (picture.channels == 1 ? " grey\n" : " RGB\n"));
  return picture;
}

// Colours constant over 2x2 blocks, so that subsampled chroma keeps them.
Rgb BlockColor(int x, int y) {
  static constexpr Rgb kPalette[] = {{200, 30, 40}, {20, 180, 60},   {30, 50, 210}, {240, 240, 20},
                                     {90, 90, 90},  {250, 250, 250}, {10, 10, 10},  {120, 40, 200}};
  return kPalette[(x / 2 + 3 * (y / 2)) % 8];
}

TEST(RenderTest, PicturesRoundTripThroughEveryFamily) {
  using F = HalPixelFormat;
  using Cfa = orvex::ColorFilterArrangement;
  enum class Shows { kColor, kLuma, kMosaic, kDemosaic };
  struct Case {
    F format;
    int width, height;
    Shows shows;
    std::vector<std::string> flags = {};
    Cfa cfa = Cfa::kRggb;
  };
  const Case cases[] = {
      {F::YCBCR_420_888, 6, 6, Shows::kColor},  // chroma 3x3
      {F::YCBCR_420_888, 8, 4, Shows::kColor, {"--order", "CbCr"}},
      {F::YCBCR_420_888_STRIDE_ALIGNED_64, 20, 4, Shows::kColor},  // row padding
      {F::YCBCR_P010, 8, 4, Shows::kColor},
      {F::YCBCR_420_SP_M_S10B, 12, 4, Shows::kColor},
      {F::YV12, 8, 6, Shows::kColor},
      {F::YCBCR_422_I, 6, 5, Shows::kColor},  // odd height
      {F::Y8, 6, 4, Shows::kLuma},
      {F::Y16, 6, 4, Shows::kLuma},
      {F::Y10, 6, 4, Shows::kLuma},  // a row ends inside a packed group
      {F::RAW10, 8, 3, Shows::kMosaic},
      {F::RAW12, 8, 2, Shows::kMosaic},
      {F::RAW16, 6, 4, Shows::kMosaic, {}, Cfa::kBggr},
      {F::RAW10, 8, 5, Shows::kDemosaic, {"--demosaic", "--cfa", "grbg"}, Cfa::kGrbg},
  };
  const RowColors blocks = [](int y, std::span<Rgb> row) {
    for (size_t x = 0; x < row.size(); ++x) row[x] = BlockColor(static_cast<int>(x), y);
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(orvex::FormatToString(c.format) + " " + std::to_string(c.width) + "x" +
                 std::to_string(c.height));
    using Order = orvex::ImageFormat::InterleavedChromaOrder;
    const bool cbcr = !c.flags.empty() && c.flags[0] == "--order";
    auto format = orvex::ImageFormat::Make(c.width, c.height, c.format,
                                           cbcr ? std::optional(Order::kCbCr) : std::nullopt);
    ASSERT_TRUE(format.ok()) << format.status();
    // Bytes outside the samples hold garbage that must not show.
    std::vector<std::string> buffers;
    std::vector<std::span<uint8_t>> spans;
    for (size_t size : format->buffer_sizes()) {
      spans.emplace_back(reinterpret_cast<uint8_t*>(buffers.emplace_back(size, '\x5a').data()),
                         size);
    }
    DrawPicture(*format, spans, blocks, 0, c.height, c.cfa);
    const Picture picture = RenderDump(*format, buffers, c.flags, (&c - cases) % 2 == 1);
    const bool half = c.shows == Shows::kDemosaic;
    ASSERT_EQ(picture.width, half ? c.width / 2 : c.width);
    ASSERT_EQ(picture.height, half ? c.height / 2 : c.height);
    EXPECT_EQ(picture.channels, c.shows == Shows::kLuma || c.shows == Shows::kMosaic ? 1 : 3);
    const std::string sites = absl::AsciiStrToUpper(orvex::ColorFilterArrangementToString(c.cfa));
    for (int y = 0; y < picture.height; ++y) {
      for (int x = 0; x < picture.width; ++x) {
        Rgb want = BlockColor(half ? 2 * x : x, half ? 2 * y : y);
        int tolerance = c.shows == Shows::kColor ? 3 : 0;  // 8-bit YUV rounding
        if (c.shows == Shows::kLuma) {
          const auto luma =
              static_cast<uint8_t>(std::lround(0.299 * want.r + 0.587 * want.g + 0.114 * want.b));
          want = {luma, luma, luma};
          tolerance = 1;
        }
        if (c.shows == Shows::kMosaic) {
          const char site = sites[(y % 2) * 2 + x % 2];
          const uint8_t v = site == 'R' ? want.r : site == 'B' ? want.b : want.g;
          want = {v, v, v};
        }
        ASSERT_TRUE(PixelNear(picture, x, y, want, tolerance));
      }
    }
  }
}

// Bytes written by hand: sample packing, byte order, chroma order, range and
// matrix, independent of the picture writer.
TEST(RenderTest, KnownBytesGiveKnownColours) {
  using Patch = std::tuple<size_t, size_t, std::string>;  // buffer, offset, bytes
  using Pixel = std::tuple<int, int, Rgb>;                // x, y, colour
  const auto check = [](HalPixelFormat f, int width, int height, std::vector<std::string> flags,
                        std::vector<Patch> patches, std::vector<Pixel> want) {
    SCOPED_TRACE(orvex::FormatToString(f) + " " + absl::StrJoin(flags, " "));
    auto format = orvex::ImageFormat::Make(width, height, f);
    ASSERT_TRUE(format.ok()) << format.status();
    std::vector<std::string> buffers;
    for (size_t size : format->buffer_sizes()) buffers.emplace_back(size, '\0');
    for (const auto& [buffer, offset, bytes] : patches)
      buffers[buffer].replace(offset, bytes.size(), bytes);
    const Picture picture = RenderDump(*format, buffers, flags, false);
    ASSERT_EQ(picture.width, width);
    for (const auto& [x, y, rgb] : want) EXPECT_TRUE(PixelNear(picture, x, y, rgb, 1));
  };
  using F = HalPixelFormat;
  const std::string y76 = "\x4c\x4c";
  const std::string nv21_red = "\xff\x55";
  check(F::YCBCR_420_888, 2, 2, {}, {{0, 0, y76}, {0, 16, y76}, {1, 0, nv21_red}},
        {{1, 1, {254, 0, 0}}});
  check(F::YCBCR_420_888, 2, 2, {"--order", "cbcr"}, {{0, 0, y76}, {0, 16, y76}, {1, 0, nv21_red}},
        {{0, 0, {16, 63, 255}}});
  check(F::YCBCR_420_888, 2, 2, {"--range", "limited"}, {{0, 0, "\xeb\x10"}, {1, 0, "\x80\x80"}},
        {{0, 0, {255, 255, 255}}, {1, 0, {0, 0, 0}}});
  check(F::YCBCR_420_888, 2, 2, {"--matrix", "BT709"}, {{0, 0, "\x80"}, {1, 0, "\xc8\x80"}},
        {{0, 0, {241, 94, 128}}});
  check(F::YCBCR_P010, 2, 2, {}, {{0, 0, "\xc0\xff"}, {0, 32, std::string("\x00\x80\x00\x80", 4)}},
        {{0, 0, {255, 255, 255}}});
  check(F::Y16, 2, 2, {}, {{0, 0, std::string("\xff\x80", 2)}}, {{0, 0, {128, 128, 128}}});
  check(F::RAW10, 4, 1, {}, {{0, 0, "\x10\x20\x30\x40\xff"}},
        {{0, 0, {16, 16, 16}}, {3, 0, {64, 64, 64}}});
  check(F::RAW12, 4, 1, {}, {{0, 0, "\x10\x20\xff\x30\x40\xff"}},
        {{2, 0, {48, 48, 48}}, {3, 0, {64, 64, 64}}});
}

TEST(RenderTest, RefusesBadInputAndLeavesNoPng) {
  ScratchDir scratch;
  const std::string short_dump = scratch.File("short.raw");
  const std::string long_dump = scratch.File("long.raw");
  const std::string dump = scratch.File("ok.raw");  // YV12 or YCBCR_420_888 64x32, Y8 64x48
  WriteFile(short_dump, std::string(3000, '\0'));
  WriteFile(long_dump, std::string(3073, '\0'));
  WriteFile(dump, std::string(3072, '\0'));
  const std::string out = scratch.File("out.png");
  const std::string back_to_back =
      ": expected 3072 bytes (the 2 buffers of YCBCR_420_888 64x32 back to back: 2048 + 1024), "
      "found ";
  ExpectCalls({
      Fails({"render", "64", "32", "YV12", short_dump, "-o", out},
            "INVALID_ARGUMENT: " + short_dump +
                ": expected 3072 bytes (buffer 0 of YV12 64x32), found 3000\n"),
      Fails({"render", "64", "32", "YCBCR_420_888", long_dump, "-o", out},
            "INVALID_ARGUMENT: " + long_dump + back_to_back + "3073\n"),
      Fails({"render", "64", "32", "YCBCR_420_888", "/dev/zero", "-o", out},
            "INVALID_ARGUMENT: /dev/zero" + back_to_back + "more\n"),
      Fails({"render", "64", "32", "YCBCR_420_888", short_dump, short_dump, short_dump, "-o", out},
            "INVALID_ARGUMENT: YCBCR_420_888 64x32 has 2 buffers: give one file per buffer, or one "
            "file with the buffers back to back; got 3 files\n"),
      Fails({"render", "64", "32", "Y8", scratch.File("none.raw"), "-o", out},
            "NOT_FOUND: cannot open " + scratch.File("none.raw") + ": No such file or directory\n"),
      Fails(
          {"render", "64", "32", "YCBCR_420_SP_M_SBWC", short_dump, "-o", out},
          "UNIMPLEMENTED: YCBCR_420_SP_M_SBWC is an SBWC-compressed layout and render has no SBWC "
          "decoder for its payload; dump the image uncompressed (YCBCR_420_888) and render that\n"),
      Fails(
          {"render", "64", "32", "YCBCR_420_888_AFBC_EXTRAWIDEBLK", short_dump, "-o", out},
          "UNIMPLEMENTED: YCBCR_420_888_AFBC_EXTRAWIDEBLK is an AFBC-compressed layout and render "
          "has no AFBC decoder for its payload\n"),
      Fails({"render", "64", "32", "BLOB", short_dump, "-o", out},
            "UNIMPLEMENTED: BLOB holds no samples render can show (it needs luma and chroma, luma "
            "alone, or a Bayer mosaic): a BLOB is encoded data, not samples\n"),
      Fails({"render", "64", "48", "Y8", dump, "-o", "/dev/full"},
            "RESOURCE_EXHAUSTED: cannot write /dev/full: No space left on device\n"),
      Fails({"render", "64", "32", "YV12", dump, "-o", out, "--demosaic"},
            "INVALID_ARGUMENT: --demosaic needs a Bayer layout; YV12 is none\n"),
      Fails(
          {"render", "20000", "20000", "Y8", dump, "-o", out},
          "RESOURCE_EXHAUSTED: a 20000x20000 Y8 image takes 400000000 bytes; render reads at most "
          "1073741824 bytes and makes pictures of at most 268435456 pixels\n"),
      Misuse({"render", "64", "32", "YV12", long_dump}, "-o OUT.png is required"),
      Misuse({"render", "64", "32", "YV12", dump, "-o", out, "--range", "tv"},
             "--range must be full or limited, got 'tv'"),
      Misuse({"render", "64", "32", "YV12", dump, "-o", out, "--matrix", "bt2020"},
             "--matrix must be bt601 or bt709, got 'bt2020'"),
      Misuse({"render", "64", "32", "RAW10", dump, "-o", out, "--cfa", "RGBG"},
             "--cfa must be RGGB, GRBG, GBRG or BGGR, got 'RGBG'"),
      Misuse({"render", "64", "32", "YV12", "-o", out},
             "expected at least 4 arguments (WIDTH HEIGHT FORMAT FILE...), got 3"),
  });
  // Nothing but the inputs is left: no PNG, no temporary file.
  EXPECT_THAT(scratch.Names(), ElementsAre("long.raw", "ok.raw", "short.raw"));
}

}  // namespace
}  // namespace orvex_tool
