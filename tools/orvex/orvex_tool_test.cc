// In-process tests of the orvex tool: argument parsing, output shapes and
// error paths of every command; pictures written into layouts, rendered to
// PNG and read back.

#include <fcntl.h>
#include <png.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <stop_token>
#include <string>
#include <thread>
#include <vector>

#include "absl/strings/ascii.h"
#include "absl/strings/str_split.h"
#include "cutils/properties.h"
#include "expat.h"
#include "gmock/gmock.h"
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
#include "tools/orvex/table.h"
#include "tools/orvex/tool.h"

namespace orvex_tool {
namespace {

using ::orvex::testing::IsOk;
using ::orvex::testing::StatusIs;
using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::Not;
using ::testing::StartsWith;

struct RunResult {
  int code;
  std::string out;
  std::string err;
};

RunResult RunOrvex(std::vector<std::string> args) {
  std::ostringstream out;
  std::ostringstream err;
  const int code = RunTool(args, out, err);
  return {code, out.str(), err.str()};
}

// A command line that must fail with exit status 2, nothing on stdout and
// exactly `err` on stderr.
struct ErrorCase {
  std::vector<std::string> args;
  std::string err;
};

void ExpectErrors(const std::vector<ErrorCase>& cases) {
  for (const ErrorCase& c : cases) {
    SCOPED_TRACE(::testing::PrintToString(c.args));
    RunResult result = RunOrvex(c.args);
    EXPECT_EQ(result.code, kExitError);
    EXPECT_EQ(result.out, "");
    EXPECT_EQ(result.err, c.err);
  }
}

std::string ReadFile(const std::string& path) {
  std::ifstream in(path, std::ios::binary);
  std::stringstream buffer;
  buffer << in.rdbuf();
  return buffer.str();
}

// A scratch directory removed with its files at the end of the test.
class ScratchDir {
 public:
  ScratchDir() {
    char pattern[] = "/tmp/orvex_tool_test.XXXXXX";
    if (const char* made = mkdtemp(pattern)) {
      path_ = made;
    } else {
      ADD_FAILURE() << "mkdtemp failed";
    }
  }
  ~ScratchDir() {
    std::error_code ignored;
    if (!path_.empty()) std::filesystem::remove_all(path_, ignored);
  }
  const std::string& path() const { return path_; }
  std::string File(const std::string& name) const { return path_ + "/" + name; }

 private:
  std::string path_;
};

// `text` with every run of blanks reduced to one and leading blanks dropped.
std::string Squeeze(const std::string& text) {
  std::string out;
  for (char c : text) {
    if (c == ' ' && (out.empty() || out.back() == ' ' || out.back() == '\n')) continue;
    out += c;
  }
  return out;
}

const CommandSpec& TestSpec() {
  static const CommandSpec spec = {
      .name = "test",
      .positionals = "A B",
      .positional_count = 2,
      .summary = "a test command",
      .details = "",
      .flags = {{"json", "", "json output"}, {"out", "DIR", "output directory", 'o'}}};
  return spec;
}

TEST(ArgsTest, AcceptsFlagShapes) {
  struct Case {
    std::vector<std::string> args;
    std::vector<std::string> positionals;
    std::string out;
    bool json;
  };
  const Case cases[] = {
      {{"a", "b"}, {"a", "b"}, "", false},
      {{"--out", "d", "a", "b"}, {"a", "b"}, "d", false},
      {{"a", "--out=d=e", "b", "--json"}, {"a", "b"}, "d=e", true},
      {{"a", "--", "--json"}, {"a", "--json"}, "", false},
      {{"-5", "-0x10"}, {"-5", "-0x10"}, "", false},
      {{"a", "b", "--out="}, {"a", "b"}, "", false},
      {{"a", "-o", "d", "b"}, {"a", "b"}, "d", false},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(::testing::PrintToString(c.args));
    auto parsed = ParseArgs(TestSpec(), c.args);
    ASSERT_THAT(parsed.status(), IsOk());
    EXPECT_EQ(parsed->positionals, c.positionals);
    EXPECT_EQ(parsed->Get("out").value_or(""), c.out);
    EXPECT_EQ(parsed->Has("json"), c.json);
    EXPECT_FALSE(parsed->help);
  }
}

TEST(ArgsTest, RefusesBadArguments) {
  struct Case {
    std::vector<std::string> args;
    std::string message;
  };
  const Case cases[] = {
      {{"a", "b", "--bogus"}, "unknown flag '--bogus'"},
      {{"a", "b", "-x"}, "unknown flag '-x'"},
      {{"a", "b", "--out"}, "flag '--out' needs a value (DIR)"},
      {{"a", "b", "--json=1"}, "flag '--json' takes no value"},
      {{"a", "b", "--json", "--json"}, "flag '--json' given more than once"},
      {{"a", "b", "c"}, "unexpected argument 'c'"},
      {{"a"}, "expected 2 arguments (A B), got 1"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(::testing::PrintToString(c.args));
    EXPECT_THAT(ParseArgs(TestSpec(), c.args).status(),
                StatusIs(orvex::StatusCode::kInvalidArgument, c.message));
  }
}

TEST(ArgsTest, HelpSkipsThePositionalCount) {
  auto parsed = ParseArgs(TestSpec(), {"--help"});
  ASSERT_THAT(parsed.status(), IsOk());
  EXPECT_TRUE(parsed->help);
  EXPECT_THAT(UsageText(TestSpec()),
              AllOf(StartsWith("usage: orvex test A B [flags]\n\na test command\n"),
                    HasSubstr("  -o, --out DIR  output directory\n"),
                    HasSubstr("  -h, --help     print this help and exit\n")));
}

TEST(ArgsTest, ParsesNumbers) {
  EXPECT_THAT(ParseInteger("4000", "WIDTH", 1, 10000), orvex::testing::IsOkAndHolds(4000));
  EXPECT_THAT(ParseCode("0x40000006", "FORMAT"), orvex::testing::IsOkAndHolds(0x40000006u));
  EXPECT_THAT(ParseCode("4294967295", "FORMAT"), orvex::testing::IsOkAndHolds(0xffffffffu));
  auto size = ParseSize("640X480", "--size");
  ASSERT_THAT(size.status(), IsOk());
  EXPECT_EQ(size->width, 640);
  EXPECT_EQ(size->height, 480);
  auto levels = ParseLevelRange("1:4", 31);
  ASSERT_THAT(levels.status(), IsOk());
  EXPECT_EQ(levels->lower, 1);
  EXPECT_EQ(levels->upper, 4);

  const std::pair<orvex::Status, std::string> failures[] = {
      {ParseInteger("", "WIDTH", 1, 10).status(), "WIDTH must be a whole number, got ''"},
      {ParseInteger("12abc", "WIDTH", 1, 10).status(), "WIDTH must be a whole number, got '12abc'"},
      {ParseInteger("0", "WIDTH", 1, 10).status(), "WIDTH must be between 1 and 10, got 0"},
      {ParseInteger("-3", "WIDTH", 1, 10).status(), "WIDTH must be between 1 and 10, got -3"},
      {ParseInteger("99999999999999999999", "N", 1, 10).status(),
       "N must be between 1 and 10, got 99999999999999999999"},
      {ParseInteger("+5", "N", 1, 10).status(), "N must be a whole number, got '+5'"},
      {ParseCode("0x", "FORMAT").status(),
       "FORMAT must be a name or a decimal or 0x-hexadecimal code, got '0x'"},
      {ParseCode("0x1g", "FORMAT").status(),
       "FORMAT must be a name or a decimal or 0x-hexadecimal code, got '0x1g'"},
      {ParseCode("0x100000000", "FORMAT").status(),
       "FORMAT code does not fit in 32 bits: 0x100000000"},
      {ParseSize("640", "--size").status(), "--size must look like WIDTHxHEIGHT, got '640'"},
      {ParseSize("640x0", "--size").status(), "height must be between 1 and 2147483647, got 0"},
      {ParseSize("x480", "--size").status(), "width must be a whole number, got ''"},
      {ParseLevelRange("3", 31).status(), "--levels must look like LOW:HIGH, got '3'"},
      {ParseLevelRange("3:1", 31).status(), "--levels LOW must not exceed HIGH, got 3:1"},
      {ParseLevelRange("0:32", 31).status(), "HIGH must be between 0 and 31, got 32"},
      {ParseLevelRange("-1:2", 31).status(), "LOW must be between 0 and 31, got -1"},
  };
  for (const auto& [status, message] : failures) {
    SCOPED_TRACE(message);
    EXPECT_THAT(status, StatusIs(orvex::StatusCode::kInvalidArgument, message));
  }
}

TEST(JsonTest, PrintsNestedContainersOneElementPerLine) {
  Json doc = Json::MakeObject()
                 .Set("name", "a\"b\\c\n\x01")
                 .Set("n", int64_t{-3})
                 .Set("big", uint64_t{18446744073709551615u})
                 .Set("none", Json())
                 .Set("flag", false)
                 .Set("empty", Json::MakeArray())
                 .Set("list", Json::MakeArray().Append(1).Append(2))
                 .Set("records", Json::MakeArray().Append(Json::MakeObject().Set("k", true)));
  EXPECT_EQ(doc.Dump(),
            "{\n"
            "  \"name\": \"a\\\"b\\\\c\\n\\u0001\",\n"
            "  \"n\": -3,\n"
            "  \"big\": 18446744073709551615,\n"
            "  \"none\": null,\n"
            "  \"flag\": false,\n"
            "  \"empty\": [],\n"
            "  \"list\": [1, 2],\n"
            "  \"records\": [\n"
            "    {\"k\": true}\n"
            "  ]\n"
            "}\n");
}

TEST(JsonDeathTest, AddingToTheWrongKindOfValueIsFatal) {
  EXPECT_DEATH(Json::MakeObject().Append(1),
               "Check failed: std::holds_alternative<Array>\\(value_\\) Append on a JSON value "
               "that is no array");
  EXPECT_DEATH(Json::MakeArray().Set("k", 1),
               "Check failed: std::holds_alternative<Object>\\(value_\\) Set on a JSON value "
               "that is no object");
}

TEST(TextTableTest, AlignsColumnsWithoutTrailingBlanks) {
  TextTable table({{"NAME"}, {"SIZE", TextTable::Align::kRight}, {"NOTE"}});
  table.AddRow({"luma", "12000000", ""});
  table.AddRow({"chroma", "6", "interleaved", "dropped"});
  EXPECT_EQ(table.Render(),
            "NAME        SIZE  NOTE\n"
            "luma    12000000\n"
            "chroma         6  interleaved\n");
}

TEST(ToolTest, TopLevelUsageAndUnknownCommand) {
  RunResult none = RunOrvex({});
  EXPECT_EQ(none.code, kExitError);
  EXPECT_THAT(none.err, StartsWith("usage: orvex COMMAND"));

  RunResult help = RunOrvex({"--help"});
  EXPECT_EQ(help.code, kExitOk);
  EXPECT_THAT(help.out, AllOf(HasSubstr("  formats "), HasSubstr("  layout ")));

  for (const std::vector<std::string>& args :
       {std::vector<std::string>{"nosuch"}, {"help", "nosuch"}}) {
    SCOPED_TRACE(args.size());
    RunResult unknown = RunOrvex(args);
    EXPECT_EQ(unknown.code, kExitError);
    EXPECT_EQ(unknown.out, "");
    EXPECT_THAT(unknown.err, StartsWith("orvex: unknown command 'nosuch'\n"));
  }
}

TEST(ToolTest, EveryCommandHasHelp) {
  for (const Command* command : {&DemoCommand(), &FormatsCommand(), &LayoutCommand(),
                                 &RenderCommand(), &PyramidCommand(), &CpaCommand()}) {
    const std::string name(command->spec.name);
    SCOPED_TRACE(name);
    RunResult result = RunOrvex({name, "--help"});
    EXPECT_EQ(result.code, kExitOk);
    EXPECT_THAT(result.out, StartsWith("usage: orvex " + name));
    EXPECT_EQ(RunOrvex({"help", name}).out, result.out);
    RunResult bad = RunOrvex({name, "--no-such-flag"});
    EXPECT_EQ(bad.code, kExitError);
    EXPECT_EQ(bad.err, "orvex " + name + ": unknown flag '--no-such-flag'\nRun 'orvex " + name +
                           " --help' for usage.\n");
  }
}

// The program's output goes through a file descriptor; output that cannot be
// written is an error whatever the command answered.
TEST(ToolTest, OutputToAFileDescriptor) {
  ScratchDir dir;
  const std::string saved = dir.path() + "/formats.json";
  const int file = open(saved.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600);
  std::ostringstream err;
  EXPECT_EQ(RunTool({"formats", "--json"}, file, err), kExitOk);
  close(file);
  EXPECT_EQ(ReadFile(saved), RunOrvex({"formats", "--json"}).out);

  const int full = open("/dev/full", O_WRONLY | O_CLOEXEC);
  // Output beyond the buffer, and a short negative answer (exit status 1).
  EXPECT_EQ(RunTool({"formats", "--json"}, full, err), kExitError);
  EXPECT_EQ(RunTool({"layout", "64", "32", "RAW10", "--conform", "0x23"}, full, err), kExitError);
  close(full);
  const std::string full_disk =
      "RESOURCE_EXHAUSTED: cannot write standard output: No space left on device\n";
  EXPECT_EQ(err.str(), full_disk + full_disk);
}

TEST(FormatsTest, TableAndJson) {
  RunResult table = RunOrvex({"formats"});
  ASSERT_EQ(table.code, kExitOk);
  EXPECT_EQ(std::count(table.out.begin(), table.out.end(), '\n'), 42);
  EXPECT_THAT(table.out, StartsWith("       HEX     DECIMAL  NAME "));
  // Columns line up: every name starts where the header's NAME does.
  std::vector<std::string> lines;
  std::istringstream stream(table.out);
  for (std::string line; std::getline(stream, line);) lines.push_back(line);
  const size_t name_column = lines[0].find("NAME");
  for (const std::string& line : lines) {
    EXPECT_NE(line[name_column], ' ') << line;
    EXPECT_EQ(line[name_column - 1], ' ') << line;
  }
  EXPECT_THAT(Squeeze(table.out),
              AllOf(HasSubstr("\n0x134 308 YCRCB_420_SP_M_SBWC 8 None yes same\n"),
                    HasSubstr("\n0x4000000b 1073741835 YCBCR_420_SP_M_S10B_SBWC_STRIDE_ALIGNED_64 "
                              "10 SBWC yes YCBCR_420_SP_M_S10B_STRIDE_ALIGNED_64\n"),
                    HasSubstr("\n0x141 321 YCBCR_420_SP_M_SBWC_L75 8 Lossy SBWC Low Compression "
                              "no YCBCR_420_888\n")));

  RunResult json = RunOrvex({"formats", "--json"});
  ASSERT_EQ(json.code, kExitOk);
  EXPECT_THAT(json.out,
              StartsWith("{\n  \"formats\": [\n    {\"name\": \"RGB_888\", \"code\": 3, "));
  EXPECT_THAT(json.out,
              HasSubstr("    {\"name\": \"YCBCR_420_SP_M_SBWC_L50\", \"code\": 320, \"hex\": "
                        "\"0x140\", \"bits_per_sample\": 8, \"compression\": \"Lossy SBWC Medium "
                        "Compression\", \"aligned_64\": false, \"uncompressed\": "
                        "\"YCBCR_420_888\"},\n"));

  EXPECT_EQ(RunOrvex({"formats", "extra"}).code, kExitError);
}

TEST(LayoutTest, JsonHasTheExactShape) {
  RunResult result = RunOrvex({"layout", "64", "32", "yv12", "--json"});
  ASSERT_EQ(result.code, kExitOk) << result.err;
  EXPECT_EQ(result.out,
            "{\n"
            "  \"format\": \"YV12\",\n"
            "  \"code\": 842094169,\n"
            "  \"width\": 64,\n"
            "  \"height\": 32,\n"
            "  \"buffer_sizes\": [3072],\n"
            "  \"components\": [\n"
            "    {\"content\": \"Luma\", \"buffer_index\": 0, \"offset_bytes\": 0, \"width\": 64, "
            "\"height\": 32, \"row_stride_bytes\": 64, \"bits_per_pixel\": 8, \"pixel_stride\": "
            "1, \"pixel_phase\": 0},\n"
            "    {\"content\": \"ChromaR\", \"buffer_index\": 0, \"offset_bytes\": 2048, "
            "\"width\": 32, \"height\": 16, \"row_stride_bytes\": 32, \"bits_per_pixel\": 8, "
            "\"pixel_stride\": 1, \"pixel_phase\": 0},\n"
            "    {\"content\": \"ChromaB\", \"buffer_index\": 0, \"offset_bytes\": 2560, "
            "\"width\": 32, \"height\": 16, \"row_stride_bytes\": 32, \"bits_per_pixel\": 8, "
            "\"pixel_stride\": 1, \"pixel_phase\": 0}\n"
            "  ],\n"
            "  \"chroma_subsampling\": \"420\",\n"
            "  \"interleaved_chroma_order\": null\n"
            "}\n");
  EXPECT_EQ(result.err, "");

  // Substituted formats report the layout actually made; RAW has no chroma.
  RunResult impl = RunOrvex({"layout", "64", "32", "34", "--json", "--order", "cbcr"});
  ASSERT_EQ(impl.code, kExitOk) << impl.err;
  EXPECT_THAT(impl.out, AllOf(HasSubstr("\"format\": \"YCBCR_420_888\",\n  \"code\": 35,\n"),
                              HasSubstr("\"buffer_sizes\": [2048, 1024],\n"),
                              HasSubstr("\"interleaved_chroma_order\": \"CbCr\"\n")));
  RunResult raw = RunOrvex({"layout", "4000", "3000", "0x25", "--json"});
  EXPECT_THAT(raw.out,
              AllOf(HasSubstr("\"chroma_subsampling\": null,\n"),
                    HasSubstr("\"content\": \"Bayer\""), HasSubstr("\"row_stride_bytes\": 5000")));
}

TEST(LayoutTest, TextShowsSizesAndComponents) {
  RunResult result = RunOrvex({"layout", "1920", "1080", "YCBCR_P010"});
  ASSERT_EQ(result.code, kExitOk);
  EXPECT_EQ(result.out,
            "YCBCR_P010 (0x36 = 54), 1920 x 1080\n"
            "chroma subsampling: 420, interleaved chroma order: CbCr\n"
            "buffer 0: 6220800 bytes\n"
            "total: 6220800 bytes in 1 buffer\n"
            "\n"
            "CONTENT  BUFFER   OFFSET  WIDTH  HEIGHT  ROW STRIDE  BPP  PIXEL STRIDE  PHASE\n"
            "Luma          0        0   1920    1080        3840   16             1      0\n"
            "ChromaB       0  4147200    960     540        3840   16             2      0\n"
            "ChromaR       0  4147200    960     540        3840   16             2      1\n");
}

TEST(LayoutTest, ConformanceVerdictAndExitStatus) {
  RunResult yes =
      RunOrvex({"layout", "1920", "1080", "YCBCR_420_888", "--conform", "YCBCR_420_888"});
  EXPECT_EQ(yes.code, kExitOk);
  EXPECT_THAT(yes.out, HasSubstr("\n\nconformance to YCBCR_420_888: conforms\n"));

  RunResult no = RunOrvex({"layout", "4000", "3000", "RAW10", "--conform", "0x23"});
  EXPECT_EQ(no.code, kExitNegative);
  EXPECT_THAT(no.out, HasSubstr("conformance to YCBCR_420_888: INVALID_ARGUMENT: component bits "
                                "per pixel: 10 != expected bits per pixel: 8; ImageFormat does "
                                "not conform to YCBCR_420_888. \n"));

  // With --json stdout stays a pure JSON object.
  RunResult json = RunOrvex({"layout", "2", "2", "Y10", "--json", "--conform", "Y10"});
  EXPECT_EQ(json.code, kExitNegative);
  EXPECT_THAT(json.out, AllOf(StartsWith("{\n"), testing::EndsWith("}\n")));
  EXPECT_EQ(json.err,
            "conformance to Y10: INVALID_ARGUMENT: ImageFormat does not conform to Y10. stride "
            "must be multiple of 10\n");
}

TEST(LayoutTest, ErrorsGoToStderrWithExitTwo) {
  ExpectErrors({
      {{"layout", "64", "64", "0x1234"},
       "UNIMPLEMENTED: Unsupported HalPixelFormat: UnknownFormat_0x1234, unable to make "
       "ImageFormat.\n"},
      {{"layout", "abc", "64", "RAW10"},
       "orvex layout: WIDTH must be a whole number, got 'abc'\nRun 'orvex layout --help' for "
       "usage.\n"},
      {{"layout", "64", "-2", "RAW10"},
       "orvex layout: HEIGHT must be between 1 and 2147483647, got -2\nRun 'orvex layout "
       "--help' for usage.\n"},
      {{"layout", "64", "64", "NOPE"},
       "orvex layout: unknown FORMAT 'NOPE' (see 'orvex formats' for the names, or give a "
       "code)\nRun 'orvex layout --help' for usage.\n"},
      {{"layout", "64", "64", "RAW10", "--order", "RGB"},
       "orvex layout: --order must be CbCr or CrCb, got 'RGB'\nRun 'orvex layout --help' for "
       "usage.\n"},
      {{"layout", "64", "64", "RAW10", "--conform", "x"},
       "orvex layout: unknown --conform TARGET 'x' (see 'orvex formats' for the names, or give "
       "a code)\nRun 'orvex layout --help' for usage.\n"},
      {{"layout", "64", "64"},
       "orvex layout: expected 3 arguments (WIDTH HEIGHT FORMAT), got 2\nRun 'orvex layout "
       "--help' for usage.\n"},
      // A target that cannot be checked gets no verdict.
      {{"layout", "64", "64", "YCBCR_420_SP_M", "--conform", "YCBCR_420_SP_M"},
       "UNIMPLEMENTED: Unable to check if conforms to YCBCR_420_SP_M\n"},
      {{"layout", "64", "64", "YV12", "--conform", "0x1234"},
       "UNIMPLEMENTED: Unable to check if conforms to UnknownFormat_0x1234\n"},
  });
}

TEST(LayoutTest, SvgDrawsEveryBufferAndComponent) {
  ScratchDir dir;
  const std::string path = dir.path() + "/layout.svg";
  RunResult result = RunOrvex({"layout", "1920", "1080", "YCBCR_422_I", "--svg", path});
  ASSERT_EQ(result.code, kExitOk) << result.err;
  const std::string svg = ReadFile(path);
  EXPECT_THAT(svg,
              AllOf(StartsWith("<svg xmlns=\"http://www.w3.org/2000/svg\""),
                    HasSubstr(">YCBCR_422_I 1920 x 1080: 1 buffer, 4147200 bytes</text>"),
                    HasSubstr(">buffer 0: 4147200 bytes</text>"), testing::EndsWith("</svg>\n")));
  // Luma, Cb and Cr share every byte of the interleaved buffer: three lanes,
  // each the full bar length.
  EXPECT_THAT(svg, HasSubstr("<rect x=\"20\" y=\"70\" width=\"720.00\" height=\"78\""));
  for (const char* label : {"Luma", "ChromaB", "ChromaR"}) {
    EXPECT_THAT(svg, HasSubstr(std::string(">") + label + "</text>")) << label;
    EXPECT_THAT(svg, HasSubstr(std::string(">") + label + ": offset 0, 4147200 bytes")) << label;
  }

  // Two buffers drawn to one scale: the chroma bar is half the luma bar.
  ASSERT_EQ(RunOrvex({"layout", "64", "32", "YCBCR_420_888", "--svg", path}).code, kExitOk);
  const std::string two = ReadFile(path);
  EXPECT_THAT(two, AllOf(HasSubstr("width=\"720.00\""), HasSubstr("width=\"360.00\""),
                         HasSubstr(">buffer 1: 1024 bytes</text>")));

  EXPECT_EQ(XmlEscape("a<b>&\"c"), "a&lt;b&gt;&amp;&quot;c");

  const std::string missing = dir.path() + "/no/x.svg";
  ExpectErrors({
      {{"layout", "64", "32", "YV12", "--svg", missing},
       "NOT_FOUND: cannot write " + missing + ": No such file or directory\n"},
      {{"layout", "64", "32", "YV12", "--svg", dir.path()},
       "FAILED_PRECONDITION: cannot write " + dir.path() + ": Is a directory\n"},
      {{"layout", "64", "32", "YV12", "--svg", "/dev/full"},
       "RESOURCE_EXHAUSTED: cannot write /dev/full: No space left on device\n"},
  });
}

// Sets the soft limit of the file size, keeping the hard one; a write beyond
// it fails with EFBIG instead of raising SIGXFSZ.
void LimitFileSize(rlim_t bytes) {
  signal(SIGXFSZ, SIG_IGN);
  struct rlimit limit;
  getrlimit(RLIMIT_FSIZE, &limit);
  limit.rlim_cur = bytes;
  setrlimit(RLIMIT_FSIZE, &limit);
}

// In a child process, where a file-size limit makes the write fail part way:
// the earlier file stays as it was and no partial file is left.
TEST(LayoutDeathTest, FailedSvgWriteLeavesTheOldFile) {
  ScratchDir dir;
  const std::string path = dir.path() + "/layout.svg";
  std::ofstream(path) << "old";
  EXPECT_EXIT(
      {
        LimitFileSize(100);
        RunResult result = RunOrvex({"layout", "64", "32", "YV12", "--svg", path});
        LimitFileSize(RLIM_INFINITY);  // for the report
        fprintf(stderr, "%d %s", result.code, result.err.c_str());
        _exit(0);
      },
      ::testing::ExitedWithCode(0), "2 OUT_OF_RANGE: cannot write .*/layout.svg: File too large");
  EXPECT_EQ(ReadFile(path), "old");
  EXPECT_EQ(std::distance(std::filesystem::directory_iterator(dir.path()), {}), 1);
}

}  // namespace
}  // namespace orvex_tool

namespace orvex_tool {
namespace {

TEST(PyramidTest, TextAndJson) {
  const std::vector<std::string> args = {"pyramid",     "4000", "3000",  "--levels", "0:2",
                                         "--alignment", "64",   "--bpp", "10"};
  RunResult text = RunOrvex(args);
  ASSERT_EQ(text.code, kExitOk) << text.err;
  EXPECT_EQ(text.out,
            "LEVEL  WIDTH  HEIGHT     BYTES\n"
            "    0   4000    3000  15168000\n"
            "    1   2000    1500   3840000\n"
            "    2   1000     750    960000\n"
            "total: 19968000 bytes\n");

  std::vector<std::string> json_args = {"pyramid", "100",   "75", "--levels=1:2", "--alignment",
                                        "64",      "--bpp", "8",  "--json"};
  RunResult json = RunOrvex(json_args);
  ASSERT_EQ(json.code, kExitOk) << json.err;
  EXPECT_EQ(json.out,
            "{\n"
            "  \"levels\": [\n"
            "    {\"level\": 1, \"width\": 50, \"height\": 38, \"bytes\": 2432},\n"
            "    {\"level\": 2, \"width\": 25, \"height\": 19, \"bytes\": 1216}\n"
            "  ],\n"
            "  \"total_bytes\": 3648\n"
            "}\n");
}

TEST(PyramidTest, Errors) {
  const std::string hint = "\nRun 'orvex pyramid --help' for usage.\n";
  ExpectErrors({
      {{"pyramid", "64", "64", "--alignment", "64", "--bpp", "8"},
       "orvex pyramid: --levels, --alignment and --bpp are required" + hint},
      {{"pyramid", "64", "64", "--levels", "2:1", "--alignment", "64", "--bpp", "8"},
       "orvex pyramid: --levels LOW must not exceed HIGH, got 2:1" + hint},
      {{"pyramid", "64", "64", "--levels", "0:32", "--alignment", "64", "--bpp", "8"},
       "orvex pyramid: HIGH must be between 0 and 31, got 32" + hint},
      {{"pyramid", "64", "64", "--levels", "0:1", "--alignment", "x", "--bpp", "8"},
       "orvex pyramid: --alignment must be a whole number, got 'x'" + hint},
      {{"pyramid", "0", "64", "--levels", "0:1", "--alignment", "1", "--bpp", "8"},
       "orvex pyramid: WIDTH must be between 1 and 2147483647, got 0" + hint},
      {{"pyramid", "64", "64", "--levels", "0:1", "--alignment", "0", "--bpp", "8"},
       "INVALID_ARGUMENT: alignment must be >= 1, received: 0\n"},
      {{"pyramid", "64", "64", "--levels", "0:1", "--alignment", "1", "--bpp", "-8"},
       "INVALID_ARGUMENT: bits per pixel must be >= 0, received: -8\n"},
      // Sizes beyond 32 bits are refused, never wrapped.
      {{"pyramid", "65536", "65536", "--levels", "1:2", "--alignment", "64", "--bpp", "13"},
       "INVALID_ARGUMENT: total buffer size of levels [1, 2] for a 65536x65536 image does not "
       "fit in 32 bits\n"},
      {{"pyramid", "2147483647", "2", "--levels", "0:0", "--alignment", "2147483647", "--bpp",
        "16"},
       "INVALID_ARGUMENT: buffer size of level 0 for a 2147483647x2 image does not fit in 32 "
       "bits\n"},
  });
}

void WriteFile(const std::string& path, const std::string& bytes) {
  std::ofstream out(path, std::ios::binary | std::ios::trunc);
  out << bytes;
}

orvex::CameraPerformanceDataFile SampleCpa() {
  orvex::CameraPerformanceDataFile file;
  orvex::CameraLatencyData* open = file.add_camera_latency_data();
  open->set_operation_case("Camera-Open");
  orvex::CameraLatencyDataType* overall = open->add_latency_data();
  overall->set_event_name("Overall");
  overall->set_duration_ms(212.5f);
  orvex::CameraLatencyDataType* sensor = open->add_latency_data();
  sensor->set_event_name("SensorPowerUp");
  sensor->set_duration_ms(48.0625f);
  file.add_camera_latency_data()->set_operation_case("Camera-Close");
  orvex::CameraPerformanceData* camera = file.add_camera_data();
  camera->set_camera_id(1);
  camera->add_per_frame_data()->set_frame_number(7);
  camera->add_per_frame_data()->set_frame_number(8);
  file.mutable_graph_representation()->set_graph_name("preview");
  file.mutable_graph_representation()->add_nodes()->set_node_name("isp");
  return file;
}

TEST(CpaTest, SummaryOfAFullFile) {
  ScratchDir dir;
  const std::string path = dir.path() + "/sample.cpa";
  WriteFile(path, SampleCpa().SerializeAsString());
  RunResult result = RunOrvex({"cpa", path});
  ASSERT_EQ(result.code, kExitOk) << result.err;
  EXPECT_EQ(result.out,
            "OPERATION     EVENT          DURATION (ms)\n"
            "Camera-Open   Overall              212.500\n"
            "Camera-Open   SensorPowerUp         48.062\n"
            "Camera-Close  -                          -\n"
            "latency data: 2 operations, 2 events\n"
            "camera data: 1 camera, 2 frames\n"
            "graph representation: 'preview', 1 nodes, 0 edges\n");
}

TEST(CpaTest, EmptyFileIsValid) {
  ScratchDir dir;
  const std::string path = dir.path() + "/empty.cpa";
  WriteFile(path, "");
  RunResult result = RunOrvex({"cpa", path});
  EXPECT_EQ(result.code, kExitOk);
  EXPECT_EQ(result.out,
            "latency data: none\ncamera data: 0 cameras, 0 frames\ngraph representation: none\n");
  RunResult json = RunOrvex({"cpa", path, "--json"});
  EXPECT_EQ(json.code, kExitOk);
  EXPECT_EQ(json.out, "{}\n");
}

TEST(CpaTest, JsonIsTheProtocolBuffersPrinting) {
  ScratchDir dir;
  const std::string path = dir.path() + "/sample.cpa";
  WriteFile(path, SampleCpa().SerializeAsString());
  RunResult result = RunOrvex({"cpa", "--json", path});
  ASSERT_EQ(result.code, kExitOk) << result.err;
  // The printing parses back to the same message.
  orvex::CameraPerformanceDataFile parsed;
  ASSERT_TRUE(google::protobuf::util::JsonStringToMessage(result.out, &parsed).ok());
  EXPECT_EQ(parsed.SerializeAsString(), SampleCpa().SerializeAsString());
  EXPECT_THAT(result.out, AllOf(HasSubstr("\"operationCase\": \"Camera-Open\""),
                                HasSubstr("\"durationMs\": 212.5"), testing::EndsWith("}\n")));
}

TEST(CpaTest, UnreadableAndCorruptFilesAreErrors) {
  ScratchDir dir;
  const std::string missing = dir.path() + "/missing.cpa";
  RunResult absent = RunOrvex({"cpa", missing});
  EXPECT_EQ(absent.code, kExitError);
  EXPECT_EQ(absent.err, "NOT_FOUND: cannot open " + missing + ": No such file or directory\n");

  struct Case {
    std::string name;
    std::string bytes;
  };
  std::string truncated = SampleCpa().SerializeAsString();
  truncated.resize(truncated.size() - 3);
  const Case cases[] = {
      {"truncated", truncated},
      {"bad wire type", std::string("\x0f", 1)},
      {"unterminated varint", std::string("\x08\xff\xff", 3)},
      {"text", "this is not a profile\n"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.name);
    const std::string path = dir.path() + "/corrupt.cpa";
    WriteFile(path, c.bytes);
    for (bool json : {false, true}) {
      RunResult result = json ? RunOrvex({"cpa", path, "--json"}) : RunOrvex({"cpa", path});
      EXPECT_EQ(result.code, kExitError);
      EXPECT_EQ(result.out, "");
      EXPECT_EQ(result.err, "INVALID_ARGUMENT: " + path +
                                " is not a valid .cpa file: it does not parse as a "
                                "CameraPerformanceDataFile message (" +
                                std::to_string(c.bytes.size()) + " bytes)\n");
    }
  }
}

TEST(CpaTest, HostileInputIsBoundedAndEscaped) {
  ScratchDir dir;
  // Far over 2 GiB: refused before anything is read (sparse, no disk used).
  const std::string huge = dir.path() + "/huge.cpa";
  WriteFile(huge, "");
  ASSERT_EQ(truncate(huge.c_str(), off_t{3} << 30), 0);
  ExpectErrors({{{"cpa", huge},
                 "INVALID_ARGUMENT: " + huge +
                     " is 3221225472 bytes, more than the 2147483647 a .cpa file can hold\n"}});
  // A device that never ends is parsed as it is read: its first byte ends it.
  RunResult zero = RunOrvex({"cpa", "/dev/zero"});
  EXPECT_EQ(zero.code, kExitError);
  EXPECT_THAT(zero.err, StartsWith("INVALID_ARGUMENT: /dev/zero is not a valid .cpa file"));
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
  const std::string path = dir.path() + "/names.cpa";
  WriteFile(path, file.SerializeAsString());
  for (const std::vector<std::string>& args :
       {std::vector<std::string>{"cpa", path}, std::vector<std::string>{"cpa", path, path}}) {
    SCOPED_TRACE(args.size());
    RunResult result = RunOrvex(args);
    EXPECT_EQ(result.code, kExitOk) << result.err;
    EXPECT_THAT(result.out,
                AllOf(HasSubstr("\\x1b]0;owned\\x07Open"), HasSubstr("A\\x00B\\u009b\\\\")));
    EXPECT_EQ(result.out.find_first_of(std::string("\x1b\x07\0", 3)), std::string::npos);
  }
}

// Counts the points of a chart; false when it is not well-formed XML.
bool CountPoints(const std::string& svg, int& points, int& slow) {
  struct Counts {
    int& points;
    int& slow;
  } counts{points, slow};
  XML_Parser parser = XML_ParserCreate(nullptr);
  XML_SetUserData(parser, &counts);
  XML_SetStartElementHandler(parser, [](void* data, const XML_Char* name, const XML_Char** attrs) {
    if (std::string_view(name) != "circle") return;
    auto* c = static_cast<Counts*>(data);
    ++c->points;
    for (int i = 0; attrs[i] != nullptr; i += 2) {
      if (std::string_view(attrs[i]) == "fill" && std::string_view(attrs[i + 1]) == "#c0392b") {
        ++c->slow;
      }
    }
  });
  const bool parsed =
      XML_Parse(parser, svg.data(), static_cast<int>(svg.size()), /*isFinal=*/1) == XML_STATUS_OK;
  XML_ParserFree(parser);
  return parsed;
}

TEST(CpaTest, ManySessionsWrittenByTheAnalyzer) {
  ScratchDir dir;
  orvex::CameraLatencyAnalyzer& analyzer = orvex::CameraLatencyAnalyzer::GetAnalyzer();
  analyzer.SetOutputDirectory(dir.path());
  ASSERT_EQ(property_set(orvex::kCameraPerformanceAnalyzerWriteToDiskProperty, "true"), 0);
  for (float open_ms : {100.0f, 350.0f, 200.0f}) {
    analyzer.InjectEvent("Camera-Open", {{"Overall", open_ms}, {"SensorPowerUp", 40.0f}});
    analyzer.InjectEvent("Camera-Close", {{"Overall", 50.0f}});
  }
  const std::string bad = dir.path() + "/bad.cpa";
  WriteFile(bad, "this is not a profile\n");
  const std::string svg = dir.path() + "/chart.svg";

  RunResult text = RunOrvex({"cpa", dir.path(), "--svg", svg});
  EXPECT_EQ(text.code, kExitError);
  EXPECT_EQ(text.err, "skipped: INVALID_ARGUMENT: " + bad +
                          " is not a valid .cpa file: it does not parse as a "
                          "CameraPerformanceDataFile message (22 bytes)\n");
  EXPECT_THAT(text.out,
              AllOf(StartsWith("3 sessions, "),
                    HasSubstr("\nCamera-Open (3 sessions, threshold 300 ms: 1 over)\n"
                              "EVENT          COUNT  MIN (ms)  MEDIAN (ms)  P90 (ms)  MAX (ms)\n"
                              "Overall            3   100.000      200.000   350.000   350.000\n"
                              "SensorPowerUp      3    40.000       40.000    40.000    40.000\n"),
                    HasSubstr("\nCamera-Close (3 sessions, threshold 250 ms: 0 over)\n")));
  // Sessions in time order: only the second one was slow.
  EXPECT_THAT(text.out, testing::ContainsRegex("\nsessions in time order:\nTIME +FILE +OPERATIONS "
                                               "+OVER THRESHOLD\n[^\n]+  2  -\n[^\n]+  2  "
                                               "Camera-Open\n[^\n]+  2  -\n$"));
  int points = 0, slow = 0;
  EXPECT_TRUE(CountPoints(ReadFile(svg), points, slow));
  EXPECT_EQ(points, 6);  // a point per session for each of the two operations
  EXPECT_EQ(slow, 1);

  RunResult json = RunOrvex({"cpa", dir.path() + "/", "--json"});
  EXPECT_EQ(json.code, kExitError);
  EXPECT_THAT(json.out, HasSubstr("{\"event\": \"Overall\", \"count\": 3, \"min_ms\": 100, "
                                  "\"median_ms\": 200, \"p90_ms\": 350, \"max_ms\": 350}"));
}

}  // namespace
}  // namespace orvex_tool

namespace orvex_tool {
namespace {

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
    orvex::HalPixelFormat format;
    int planes;  // distinct runs of bytes written and checked per frame
  };
  const Case cases[] = {
      {orvex::HalPixelFormat::YCBCR_420_888, 2},  // luma + interleaved chroma
      {orvex::HalPixelFormat::YCBCR_P010, 2},     // one buffer, two planes
      {orvex::HalPixelFormat::YV12, 3},
      {orvex::HalPixelFormat::YCBCR_422_I, 1},
      {orvex::HalPixelFormat::RAW10, 1},
      {orvex::HalPixelFormat::BLOB, 1},
      {orvex::HalPixelFormat::YCBCR_420_SP_M_SBWC, 4},  // headers and payloads
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(orvex::FormatToString(c.format));
    DemoOptions options;
    options.size = {64, 32};
    options.format = c.format;
    options.frames = 5;
    options.out_dir = dir.path();
    auto report = RunDemo(options);
    ASSERT_THAT(report.status(), IsOk());
    EXPECT_EQ(report->frames_processed, 5);
    EXPECT_EQ(report->frames_verified, 5);
    EXPECT_EQ(report->planes_checked, 5 * c.planes);
    EXPECT_THAT(report->failures, ElementsAre());
    EXPECT_EQ(report->wake_latencies.size(), 5u);
    EXPECT_THAT(report->cpa_path, StartsWith(dir.path() + "/camera-ended-"));
  }
}

TEST(DemoTest, CorruptedFrameFailsVerification) {
  ScratchDir dir;
  DemoOptions options;
  options.size = {64, 32};
  options.format = orvex::HalPixelFormat::YV12;
  options.frames = 4;
  options.out_dir = dir.path();
  options.corrupt_frame = 2;
  auto report = RunDemo(options);
  ASSERT_THAT(report.status(), IsOk());
  EXPECT_EQ(report->frames_processed, 4);
  EXPECT_EQ(report->frames_verified, 3);
  EXPECT_THAT(report->failures,
              ElementsAre("frame 2: plane 2 (ChromaB, buffer 0, offset 2560, 512 bytes) checksum "
                          "mismatch"));
}

TEST(DemoTest, CommandReportsAndWritesAReadableProfile) {
  ScratchDir dir;
  const std::string out = dir.path() + "/nested/out";
  RunResult result =
      RunOrvex({"demo", "--size", "64x32", "--frames", "3", "--format", "yv12", "--out", out});
  ASSERT_EQ(result.code, kExitOk) << result.err;
  EXPECT_EQ(result.err, "");
  EXPECT_THAT(result.out,
              testing::MatchesRegex(
                  "orvex demo: 3 frames of YV12 64x32 \\(1 buffer, 3072 bytes per frame\\)\n"
                  "frames processed: 3\n"
                  "verification: passed \\(3 of 3 frames, 9 plane checksums\\)\n"
                  "throughput: [0-9.]+ frames/s, [0-9.]+ MB/s \\([0-9.]+ s in all\\)\n"
                  "signal-to-wake latency: median [0-9.]+ ms, p99 [0-9.]+ ms\n"
                  "latency profile: (.*/camera-ended-[0-9_-]+\\.cpa)\n"
                  "  read it back with: orvex cpa .*\\.cpa\n"));
  const std::string marker = "latency profile: ";
  const size_t at = result.out.find(marker) + marker.size();
  const std::string cpa = result.out.substr(at, result.out.find('\n', at) - at);
  EXPECT_THAT(cpa, StartsWith(out + "/camera-ended-"));

  RunResult read = RunOrvex({"cpa", cpa});
  ASSERT_EQ(read.code, kExitOk) << read.err;
  EXPECT_THAT(read.out, AllOf(testing::ContainsRegex("\nDemo-Open +Overall +[0-9.]+\n"),
                              testing::ContainsRegex("\nDemo-Process +WakeLatencyP99 +[0-9.]+\n"),
                              testing::ContainsRegex("\nDemo-Close +Overall +[0-9.]+\n"),
                              HasSubstr("latency data: 3 operations, 9 events\n")));
}

TEST(DemoTest, TraceRecordsFramesAndFenceWaits) {
  ScratchDir dir;
  const std::string trace = dir.path() + "/trace.json";
  RunResult result =
      RunOrvex({"demo", "--size", "64x32", "--frames", "2", "--out", dir.path(), "--trace", trace});
  ASSERT_EQ(result.code, kExitOk) << result.err;
  EXPECT_THAT(result.out, HasSubstr("trace: " + trace + " (open it in the Perfetto UI"));
  const std::string json = ReadFile(trace);
  EXPECT_THAT(json, AllOf(StartsWith("["), HasSubstr("\"orvex demo: produce frame\""),
                          HasSubstr("\"orvex demo: consume frame\""),
                          HasSubstr("\"orvex demo: frames verified\"")));

  // A trace cut short is an error and is not recommended; the run is reported.
  RunResult full = RunOrvex(
      {"demo", "--size", "64x32", "--frames", "1", "--out", dir.path(), "--trace", "/dev/full"});
  EXPECT_EQ(full.code, kExitError);
  EXPECT_THAT(full.out, AllOf(HasSubstr("verification: passed"), Not(HasSubstr("trace:"))));
  EXPECT_EQ(full.err,
            "RESOURCE_EXHAUSTED: cannot write the trace /dev/full: No space left on device\n");
}

// In a child process, where a file-size limit fails the demo's own profile
// while other .cpa files keep appearing in the directory: the demo fails and
// names none of them.
TEST(DemoDeathTest, NamesOnlyTheProfileItWrote) {
  ScratchDir dir;
  EXPECT_EXIT(
      {
        LimitFileSize(16);
        std::string errors;
        {
          std::jthread other([&](std::stop_token stop) {
            for (int i = 0; !stop.stop_requested(); ++i) {
              WriteFile(dir.path() + "/other-" + std::to_string(i) + ".cpa", "");
            }
          });
          for (int run = 0; run < 5; ++run) {
            errors +=
                RunOrvex({"demo", "--size", "64x32", "--frames", "1", "--out", dir.path()}).err;
          }
        }
        LimitFileSize(RLIM_INFINITY);
        fprintf(stderr, "%s", errors.c_str());
        _exit(0);
      },
      ::testing::ExitedWithCode(0),
      "(INTERNAL: the latency analyzer wrote no \\.cpa file into [^\n]*\n){5}$");
}

TEST(DemoTest, Errors) {
  ScratchDir dir;
  const std::string file = dir.path() + "/plain-file";
  WriteFile(file, "x");
  const std::string hint = "\nRun 'orvex demo --help' for usage.\n";
  ExpectErrors({
      {{"demo", "--size", "64"}, "orvex demo: --size must look like WIDTHxHEIGHT, got '64'" + hint},
      {{"demo", "--frames", "0"},
       "orvex demo: --frames must be between 1 and 100000, got 0" + hint},
      {{"demo", "--format", "nope"},
       "orvex demo: unknown --format 'nope' (see 'orvex formats' for the names, or give a code)" +
           hint},
      {{"demo", "--out="}, "orvex demo: --out must name a directory" + hint},
      {{"demo", "extra"}, "orvex demo: unexpected argument 'extra'" + hint},
      {{"demo", "--format", "RGB_888", "--out", dir.path()},
       "UNIMPLEMENTED: Unsupported HalPixelFormat: RGB_888, unable to make ImageFormat.\n"},
      {{"demo", "--size", "30000x30000", "--out", dir.path()},
       "RESOURCE_EXHAUSTED: a 30000x30000 YCBCR_420_888 frame takes 1350000000 bytes; the demo "
       "allows at most 1073741824 per frame\n"},
      {{"demo", "--size", "64x32", "--frames", "1", "--out", file + "/sub"},
       "INTERNAL: the latency analyzer wrote no .cpa file into " + file +
           "/sub (see its [CPA] log line)\n"},
      {{"demo", "--size", "64x32", "--trace", dir.path() + "/no/trace.json"},
       "NOT_FOUND: cannot trace into " + dir.path() +
           "/no/trace.json: No such file or directory\n"},
  });
}

using orvex::HalPixelFormat;

// The PNG at `path` as RGB; an empty picture when it does not read.
Picture ReadPng(const std::string& path) {
  png_image image = {};
  image.version = PNG_IMAGE_VERSION;
  Picture picture;
  if (png_image_begin_read_from_file(&image, path.c_str()) == 0) return picture;
  image.format = PNG_FORMAT_RGB;
  picture.pixels.resize(PNG_IMAGE_SIZE(image));
  if (png_image_finish_read(&image, nullptr, picture.pixels.data(), 0, nullptr) == 0) {
    return {};
  }
  picture.width = static_cast<int>(image.width);
  picture.height = static_cast<int>(image.height);
  return picture;
}

Rgb At(const Picture& p, int x, int y) {
  const size_t i = (static_cast<size_t>(y) * p.width + x) * 3;
  return {p.pixels[i], p.pixels[i + 1], p.pixels[i + 2]};
}

bool Near(Rgb a, Rgb b, int tolerance) {
  return std::abs(a.r - b.r) <= tolerance && std::abs(a.g - b.g) <= tolerance &&
         std::abs(a.b - b.b) <= tolerance;
}

struct Pixel {
  int x, y;
  Rgb rgb;
};

// Colours constant over 2x2 blocks, so that subsampled chroma keeps them.
Rgb BlockColor(int x, int y) {
  static constexpr Rgb kPalette[] = {{200, 30, 40}, {20, 180, 60},   {30, 50, 210}, {240, 240, 20},
                                     {90, 90, 90},  {250, 250, 250}, {10, 10, 10},  {120, 40, 200}};
  return kPalette[(x / 2 + 3 * (y / 2)) % 8];
}

// Writes `buffers` as the dump files: one per buffer, or back to back in one.
std::vector<std::string> WriteDump(const ScratchDir& scratch,
                                   const std::vector<std::string>& buffers, bool one_file) {
  if (one_file) {
    std::string all;
    for (const std::string& b : buffers) all += b;
    WriteFile(scratch.File("dump.raw"), all);
    return {scratch.File("dump.raw")};
  }
  std::vector<std::string> files;
  for (size_t i = 0; i < buffers.size(); ++i) {
    files.push_back(scratch.File("buffer" + std::to_string(i) + ".raw"));
    WriteFile(files.back(), buffers[i]);
  }
  return files;
}

// Renders `buffers` with `flags`; the picture read back from the PNG.
Picture Render(const ScratchDir& scratch, const orvex::ImageFormat& format,
               const std::vector<std::string>& buffers, const std::vector<std::string>& flags,
               bool one_file) {
  std::vector<std::string> args = {"render", std::to_string(format.width()),
                                   std::to_string(format.height()),
                                   orvex::FormatToString(format.format())};
  for (const std::string& file : WriteDump(scratch, buffers, one_file)) args.push_back(file);
  args.insert(args.end(), {"-o", scratch.File("out.png")});
  args.insert(args.end(), flags.begin(), flags.end());
  const RunResult result = RunOrvex(args);
  EXPECT_EQ(result.code, kExitOk) << result.err;
  return ReadPng(scratch.File("out.png"));
}

TEST(RenderTest, PicturesRoundTripThroughEveryFamily) {
  using orvex::ColorFilterArrangement;
  enum class Shows { kColor, kLuma, kMosaic, kDemosaic };
  struct Case {
    HalPixelFormat format;
    int width, height;
    Shows shows;
    std::vector<std::string> flags = {};
    ColorFilterArrangement cfa = ColorFilterArrangement::kRggb;
  };
  const Case cases[] = {
      {HalPixelFormat::YCBCR_420_888, 6, 6, Shows::kColor},  // chroma 3x3
      {HalPixelFormat::YCBCR_420_888, 8, 4, Shows::kColor, {"--order", "CbCr"}},
      {HalPixelFormat::YCBCR_420_888_STRIDE_ALIGNED_64, 20, 4, Shows::kColor},  // row padding
      {HalPixelFormat::YCBCR_P010, 8, 4, Shows::kColor},
      {HalPixelFormat::YCBCR_420_SP_M_S10B, 12, 4, Shows::kColor},
      {HalPixelFormat::YV12, 8, 6, Shows::kColor},
      {HalPixelFormat::YCBCR_422_I, 6, 5, Shows::kColor},  // odd height
      {HalPixelFormat::Y8, 6, 4, Shows::kLuma},
      {HalPixelFormat::Y16, 6, 4, Shows::kLuma},
      {HalPixelFormat::Y10, 6, 4, Shows::kLuma},  // a row ends inside a packed group
      {HalPixelFormat::RAW10, 8, 3, Shows::kMosaic},
      {HalPixelFormat::RAW12, 8, 2, Shows::kMosaic},
      {HalPixelFormat::RAW16, 6, 4, Shows::kMosaic, {}, ColorFilterArrangement::kBggr},
      {HalPixelFormat::RAW10,
       8,
       5,
       Shows::kDemosaic,
       {"--demosaic", "--cfa", "grbg"},
       ColorFilterArrangement::kGrbg},
  };
  int run = 0;
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
    for (size_t size : format->buffer_sizes()) buffers.emplace_back(size, '\x5a');
    for (std::string& b : buffers)
      spans.emplace_back(reinterpret_cast<uint8_t*>(b.data()), b.size());
    DrawPicture(
        *format, spans,
        [](int y, std::span<Rgb> row) {
          for (size_t x = 0; x < row.size(); ++x) row[x] = BlockColor(static_cast<int>(x), y);
        },
        0, c.height, c.cfa);
    ScratchDir scratch;
    const Picture picture = Render(scratch, *format, buffers, c.flags, ++run % 2 == 0);
    const bool half = c.shows == Shows::kDemosaic;
    ASSERT_EQ(picture.width, half ? c.width / 2 : c.width);
    ASSERT_EQ(picture.height, half ? c.height / 2 : c.height);
    const std::string sites = absl::AsciiStrToUpper(orvex::ColorFilterArrangementToString(c.cfa));
    int wrong = 0;
    for (int y = 0; y < picture.height; ++y) {
      for (int x = 0; x < picture.width; ++x) {
        Rgb want = BlockColor(half ? 2 * x : x, half ? 2 * y : y);
        int tolerance = 0;
        if (c.shows == Shows::kColor) tolerance = 3;  // 8-bit YUV rounding
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
        const Rgb got = At(picture, x, y);
        if (!Near(got, want, tolerance) && wrong++ == 0) {
          ADD_FAILURE() << "pixel " << x << "," << y << ": got " << int{got.r} << " " << int{got.g}
                        << " " << int{got.b} << ", want " << int{want.r} << " " << int{want.g}
                        << " " << int{want.b};
        }
      }
    }
    EXPECT_EQ(wrong, 0);
  }
}

// Bytes written by hand: sample packing, byte order, chroma order, range and
// matrix, independent of the picture writer.
TEST(RenderTest, KnownBytesGiveKnownColours) {
  struct Patch {
    size_t buffer;
    size_t offset;
    std::string bytes;
  };
  struct Case {
    std::string name;
    HalPixelFormat format;
    int width, height;
    std::vector<std::string> flags;
    std::vector<Patch> patches;
    std::vector<Pixel> want;
  };
  const std::string y76 = "\x4c\x4c";
  const Case cases[] = {
      {"NV21 red",
       HalPixelFormat::YCBCR_420_888,
       2,
       2,
       {},
       {{0, 0, y76}, {0, 16, y76}, {1, 0, "\xff\x55"}},
       {{1, 1, {254, 0, 0}}}},
      {"CbCr order",
       HalPixelFormat::YCBCR_420_888,
       2,
       2,
       {"--order", "cbcr"},
       {{0, 0, y76}, {0, 16, y76}, {1, 0, "\xff\x55"}},
       {{0, 0, {16, 63, 255}}}},
      {"limited range",
       HalPixelFormat::YCBCR_420_888,
       2,
       2,
       {"--range", "limited"},
       {{0, 0, "\xeb\x10"}, {1, 0, "\x80\x80"}},
       {{0, 0, {255, 255, 255}}, {1, 0, {0, 0, 0}}}},
      {"BT.709",
       HalPixelFormat::YCBCR_420_888,
       2,
       2,
       {"--matrix", "BT709"},
       {{0, 0, "\x80"}, {1, 0, "\xc8\x80"}},
       {{0, 0, {241, 94, 128}}}},
      {"P010 words",
       HalPixelFormat::YCBCR_P010,
       2,
       2,
       {},
       {{0, 0, "\xc0\xff"}, {0, 32, std::string("\x00\x80\x00\x80", 4)}},
       {{0, 0, {255, 255, 255}}}},
      {"Y16 word",
       HalPixelFormat::Y16,
       2,
       2,
       {},
       {{0, 0, std::string("\xff\x80", 2)}},
       {{0, 0, {128, 128, 128}}}},
      {"RAW10 group",
       HalPixelFormat::RAW10,
       4,
       1,
       {},
       {{0, 0, "\x10\x20\x30\x40\xff"}},
       {{0, 0, {16, 16, 16}}, {3, 0, {64, 64, 64}}}},
      {"RAW12 groups",
       HalPixelFormat::RAW12,
       4,
       1,
       {},
       {{0, 0, "\x10\x20\xff\x30\x40\xff"}},
       {{2, 0, {48, 48, 48}}, {3, 0, {64, 64, 64}}}},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.name);
    auto format = orvex::ImageFormat::Make(c.width, c.height, c.format);
    ASSERT_TRUE(format.ok()) << format.status();
    std::vector<std::string> buffers;
    for (size_t size : format->buffer_sizes()) buffers.emplace_back(size, '\0');
    for (const Patch& p : c.patches) buffers[p.buffer].replace(p.offset, p.bytes.size(), p.bytes);
    ScratchDir scratch;
    const Picture picture = Render(scratch, *format, buffers, c.flags, false);
    ASSERT_EQ(picture.width, c.width);
    for (const Pixel& p : c.want) {
      const Rgb got = At(picture, p.x, p.y);
      EXPECT_TRUE(Near(got, p.rgb, 1))
          << p.x << "," << p.y << ": " << int{got.r} << " " << int{got.g} << " " << int{got.b};
    }
  }
}

TEST(RenderTest, RefusesBadInputAndLeavesNoPng) {
  ScratchDir scratch;
  const std::string short_dump = scratch.File("short.raw");
  const std::string long_dump = scratch.File("long.raw");
  WriteFile(short_dump, std::string(3000, '\0'));
  WriteFile(long_dump, std::string(3073, '\0'));
  const std::string dump = scratch.File("ok.raw");  // YV12 or YCBCR_420_888 64x32
  WriteFile(dump, std::string(3072, '\0'));
  const std::string out = scratch.File("out.png");
  const std::string usage = "\nRun 'orvex render --help' for usage.\n";
  std::vector<ErrorCase> cases = {
      {{"64", "32", "YV12", short_dump, "-o", out},
       "INVALID_ARGUMENT: " + short_dump +
           ": expected 3072 bytes (buffer 0 of YV12 64x32), found 3000\n"},
      {{"64", "32", "YCBCR_420_888", long_dump, "-o", out},
       "INVALID_ARGUMENT: " + long_dump +
           ": expected 3072 bytes (the 2 buffers of YCBCR_420_888 64x32 back to back: 2048 + "
           "1024), found 3073\n"},
      {{"64", "32", "YCBCR_420_888", "/dev/zero", "-o", out},
       "INVALID_ARGUMENT: /dev/zero: expected 3072 bytes (the 2 buffers of YCBCR_420_888 64x32 "
       "back to back: 2048 + 1024), found more\n"},
      {{"64", "32", "YCBCR_420_888", short_dump, short_dump, short_dump, "-o", out},
       "INVALID_ARGUMENT: YCBCR_420_888 64x32 has 2 buffers: give one file per buffer, or one "
       "file with the buffers back to back; got 3 files\n"},
      {{"64", "32", "Y8", scratch.File("none.raw"), "-o", out},
       "NOT_FOUND: cannot open " + scratch.File("none.raw") + ": No such file or directory\n"},
      {{"64", "32", "YCBCR_420_SP_M_SBWC", short_dump, "-o", out},
       "UNIMPLEMENTED: YCBCR_420_SP_M_SBWC is an SBWC-compressed layout and render has no SBWC "
       "decoder for its payload; dump the image uncompressed (YCBCR_420_888) and render that\n"},
      {{"64", "32", "YCBCR_420_888_AFBC_EXTRAWIDEBLK", short_dump, "-o", out},
       "UNIMPLEMENTED: YCBCR_420_888_AFBC_EXTRAWIDEBLK is an AFBC-compressed layout and render "
       "has no AFBC decoder for its payload\n"},
      {{"64", "32", "BLOB", short_dump, "-o", out},
       "UNIMPLEMENTED: BLOB holds no samples render can show (it needs luma and chroma, luma "
       "alone, or a Bayer mosaic): a BLOB is encoded data, not samples\n"},
      {{"64", "32", "YV12", dump, "-o", out, "--demosaic"},
       "INVALID_ARGUMENT: --demosaic needs a Bayer layout; YV12 is none\n"},
      {{"64", "32", "YV12", dump, "-o", scratch.File("no/out.png")},
       "NOT_FOUND: cannot write " + scratch.File("no/out.png") + ": No such file or directory\n"},
      {{"64", "32", "YV12", long_dump}, "orvex render: -o OUT.png is required" + usage},
      {{"64", "32", "YV12", long_dump, "-o", out, "--range", "tv"},
       "orvex render: --range must be full or limited, got 'tv'" + usage},
      {{"64", "32", "YV12", "-o", out},
       "orvex render: expected at least 4 arguments (WIDTH HEIGHT FORMAT FILE...), got 3" + usage},
  };
  for (ErrorCase& c : cases) c.args.insert(c.args.begin(), "render");
  ExpectErrors(cases);
  // Nothing but the inputs is left: no PNG, no temporary file.
  std::vector<std::string> left;
  for (const auto& entry : std::filesystem::directory_iterator(scratch.path())) {
    left.push_back(entry.path().filename().string());
  }
  EXPECT_THAT(left, ::testing::UnorderedElementsAre("short.raw", "long.raw", "ok.raw"));
}

TEST(RenderTest, DemoFrameRendersAsColourBars) {
  ScratchDir scratch;
  const RunResult demo = RunOrvex({"demo", "--size", "64x32", "--frames", "2", "--out",
                                   scratch.path(), "--dump", scratch.File("dump")});
  ASSERT_EQ(demo.code, kExitOk) << demo.err;
  const std::string& out = demo.out;
  const std::string marker = "render it with: orvex ";
  const size_t at = out.find(marker);
  ASSERT_NE(at, std::string::npos) << out;
  std::vector<std::string> args =
      absl::StrSplit(out.substr(at + marker.size(), out.find('\n', at) - at - marker.size()), ' ');
  const RunResult render = RunOrvex(args);
  ASSERT_EQ(render.code, kExitOk) << render.err;
  const Picture picture = ReadPng(args.back());
  ASSERT_EQ(picture.width, 64);
  ASSERT_EQ(picture.height, 32);
  const Pixel want[] = {{0, 0, {235, 235, 235}},     // white bar
                        {44, 10, {235, 16, 16}},     // red bar
                        {63, 31, {235, 235, 235}}};  // progress bar, last frame: full
  for (const auto& [x, y, rgb] : want) {
    EXPECT_TRUE(Near(At(picture, x, y), rgb, 3)) << x << "," << y;
  }
}

}  // namespace
}  // namespace orvex_tool
