#ifndef ORVEX_TOOLS_ORVEX_ARGS_H_
#define ORVEX_TOOLS_ORVEX_ARGS_H_

// Command-line parsing for the orvex tool: one small table-driven parser per
// subcommand, so that each command has its own flags, usage text and
// positional arguments, and parse errors come back as values the caller
// prints (nothing here exits or throws).
//
// Accepted shapes: "--name value", "--name=value", boolean "--name", a
// flag's one-letter form "-o value", "-h"/"--help", and "--" to end the flags. Flags and positional
// arguments may be mixed. An argument that starts with "-" and a digit is positional (so a negative
// number reaches the number parser and gets a clear message).

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "orvex/api/math/generic_types.h"
#include "orvex/status/statusor.h"

namespace orvex_tool {

struct FlagSpec {
  std::string_view name;        // without the leading "--"
  std::string_view value_name;  // empty for a boolean flag
  std::string_view help;
  char short_name = '\0';  // "-o" for 'o'; none when '\0'
};

struct CommandSpec {
  std::string_view name;
  std::string_view positionals;   // usage text of the positional arguments
  size_t positional_count = 0;    // exactly this many are required...
  bool more_positionals = false;  // ...or at least this many, when true
  std::string_view summary;       // one line
  std::string_view details;       // paragraphs printed after the flags
  std::vector<FlagSpec> flags;
};

struct ParsedArgs {
  bool help = false;
  std::vector<std::string> positionals;
  std::map<std::string, std::string, std::less<>> values;  // boolean flags map to ""

  bool Has(std::string_view flag) const { return values.find(flag) != values.end(); }
  std::optional<std::string> Get(std::string_view flag) const;
};

// Parses `args` (the words after the command name). INVALID_ARGUMENT for an
// unknown flag, a missing or unexpected value, a repeated flag, or the
// wrong number of positional arguments (not checked when help is asked).
orvex::StatusOr<ParsedArgs> ParseArgs(const CommandSpec& spec,
                                      const std::vector<std::string>& args);

// "usage: orvex <name> <positionals> [flags]", the summary, the flags with
// their help, and the details.
std::string UsageText(const CommandSpec& spec);

// Decimal integer in [min, max]; `what` names the value in the error.
orvex::StatusOr<int64_t> ParseInteger(std::string_view text, std::string_view what, int64_t min,
                                      int64_t max);
// Decimal or 0x-prefixed hexadecimal unsigned 32-bit number.
orvex::StatusOr<uint32_t> ParseCode(std::string_view text, std::string_view what);
// "WxH" (also "WXH") with both sides in [1, INT32_MAX].
orvex::StatusOr<orvex::GenericSize<int>> ParseSize(std::string_view text, std::string_view what);
// "LOW:HIGH" with 0 <= LOW <= HIGH <= max_level.
orvex::StatusOr<orvex_api::Range<int>> ParseLevelRange(std::string_view text, int max_level);

}  // namespace orvex_tool

#endif  // ORVEX_TOOLS_ORVEX_ARGS_H_
