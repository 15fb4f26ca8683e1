#include "tools/orvex/args.h"

#include <algorithm>
#include <charconv>
#include <limits>
#include <system_error>

#include "fmt/format.h"
#include "orvex/status/status.h"
#include "orvex/status/status_macros.h"

namespace orvex_tool {
namespace {

const FlagSpec* FindFlag(const CommandSpec& spec, std::string_view name) {
  for (const FlagSpec& flag : spec.flags) {
    if (flag.name == name) return &flag;
    if (name.size() == 1 && flag.short_name != '\0' && name[0] == flag.short_name) return &flag;
  }
  return nullptr;
}

bool LooksLikeFlag(std::string_view arg) {
  if (arg.size() < 2 || arg[0] != '-') return false;
  // "-5" and "-0x10" are (negative) numbers, left to the number parsers.
  return !(arg[1] >= '0' && arg[1] <= '9');
}

}  // namespace

std::optional<std::string> ParsedArgs::Get(std::string_view flag) const {
  auto it = values.find(flag);
  if (it == values.end()) return std::nullopt;
  return it->second;
}

orvex::StatusOr<ParsedArgs> ParseArgs(const CommandSpec& spec,
                                      const std::vector<std::string>& args) {
  ParsedArgs parsed;
  bool flags_ended = false;
  for (size_t i = 0; i < args.size(); ++i) {
    const std::string& arg = args[i];
    if (flags_ended || !LooksLikeFlag(arg)) {
      parsed.positionals.push_back(arg);
      continue;
    }
    if (arg == "--") {
      flags_ended = true;
      continue;
    }
    if (arg == "-h" || arg == "--help") {
      parsed.help = true;
      continue;
    }
    const bool short_form = arg.rfind("--", 0) != 0;
    if (short_form && (arg.size() != 2 || FindFlag(spec, arg.substr(1)) == nullptr)) {
      return orvex::InvalidArgumentError(fmt::format("unknown flag '{}'", arg));
    }
    std::string_view body = std::string_view(arg).substr(short_form ? 1 : 2);
    std::optional<std::string> inline_value;
    if (size_t eq = body.find('='); eq != std::string_view::npos) {
      inline_value = std::string(body.substr(eq + 1));
      body = body.substr(0, eq);
    }
    const FlagSpec* flag = FindFlag(spec, body);
    if (flag == nullptr) {
      return orvex::InvalidArgumentError(fmt::format("unknown flag '--{}'", body));
    }
    if (parsed.Has(flag->name)) {
      return orvex::InvalidArgumentError(
          fmt::format("flag '--{}' given more than once", flag->name));
    }
    std::string value;
    if (flag->value_name.empty()) {
      if (inline_value.has_value()) {
        return orvex::InvalidArgumentError(fmt::format("flag '--{}' takes no value", flag->name));
      }
    } else if (inline_value.has_value()) {
      value = *inline_value;
    } else if (i + 1 < args.size()) {
      value = args[++i];
    } else {
      return orvex::InvalidArgumentError(
          fmt::format("flag '--{}' needs a value ({})", flag->name, flag->value_name));
    }
    parsed.values.emplace(std::string(flag->name), std::move(value));
  }
  const size_t given = parsed.positionals.size();
  if (!parsed.help && given != spec.positional_count &&
      !(spec.more_positionals && given > spec.positional_count)) {
    if (given > spec.positional_count) {
      return orvex::InvalidArgumentError(
          fmt::format("unexpected argument '{}'", parsed.positionals[spec.positional_count]));
    }
    return orvex::InvalidArgumentError(fmt::format(
        "expected {}{} argument{} ({}), got {}", spec.more_positionals ? "at least " : "",
        spec.positional_count, spec.positional_count == 1 ? "" : "s", spec.positionals, given));
  }
  return parsed;
}

std::string UsageText(const CommandSpec& spec) {
  std::string text = fmt::format("usage: orvex {}", spec.name);
  if (!spec.positionals.empty()) text += fmt::format(" {}", spec.positionals);
  text += " [flags]\n\n";
  text += fmt::format("{}\n", spec.summary);
  size_t width = std::string_view("-h, --help").size();
  std::vector<std::string> names;
  for (const FlagSpec& flag : spec.flags) {
    std::string name = flag.short_name == '\0'
                           ? fmt::format("--{}", flag.name)
                           : fmt::format("-{}, --{}", flag.short_name, flag.name);
    if (!flag.value_name.empty()) name += fmt::format(" {}", flag.value_name);
    width = std::max(width, name.size());
    names.push_back(std::move(name));
  }
  text += "\nflags:\n";
  for (size_t i = 0; i < spec.flags.size(); ++i) {
    text += fmt::format("  {:<{}}  {}\n", names[i], width, spec.flags[i].help);
  }
  text += fmt::format("  {:<{}}  {}\n", "-h, --help", width, "print this help and exit");
  if (!spec.details.empty()) text += fmt::format("\n{}\n", spec.details);
  return text;
}

orvex::StatusOr<int64_t> ParseInteger(std::string_view text, std::string_view what, int64_t min,
                                      int64_t max) {
  int64_t value = 0;
  const char* end = text.data() + text.size();
  auto [ptr, ec] = std::from_chars(text.data(), end, value, 10);
  if (text.empty() || ec == std::errc::invalid_argument || ptr != end) {
    return orvex::InvalidArgumentError(
        fmt::format("{} must be a whole number, got '{}'", what, text));
  }
  if (ec == std::errc::result_out_of_range || value < min || value > max) {
    return orvex::InvalidArgumentError(
        fmt::format("{} must be between {} and {}, got {}", what, min, max, text));
  }
  return value;
}

orvex::StatusOr<uint32_t> ParseCode(std::string_view text, std::string_view what) {
  int base = 10;
  std::string_view digits = text;
  if (digits.size() > 2 && digits[0] == '0' && (digits[1] == 'x' || digits[1] == 'X')) {
    base = 16;
    digits.remove_prefix(2);
  }
  uint32_t value = 0;
  const char* end = digits.data() + digits.size();
  auto [ptr, ec] = std::from_chars(digits.data(), end, value, base);
  if (digits.empty() || ec == std::errc::invalid_argument || ptr != end) {
    return orvex::InvalidArgumentError(
        fmt::format("{} must be a name or a decimal or 0x-hexadecimal code, got '{}'", what, text));
  }
  if (ec == std::errc::result_out_of_range) {
    return orvex::InvalidArgumentError(
        fmt::format("{} code does not fit in 32 bits: {}", what, text));
  }
  return value;
}

orvex::StatusOr<orvex::GenericSize<int>> ParseSize(std::string_view text, std::string_view what) {
  size_t x = text.find_first_of("xX");
  if (x == std::string_view::npos) {
    return orvex::InvalidArgumentError(
        fmt::format("{} must look like WIDTHxHEIGHT, got '{}'", what, text));
  }
  constexpr int64_t kMax = std::numeric_limits<int>::max();
  ORVEX_ASSIGN_OR_RETURN(int64_t width, ParseInteger(text.substr(0, x), "width", 1, kMax));
  ORVEX_ASSIGN_OR_RETURN(int64_t height, ParseInteger(text.substr(x + 1), "height", 1, kMax));
  return orvex::GenericSize<int>{static_cast<int>(width), static_cast<int>(height)};
}

orvex::StatusOr<orvex_api::Range<int>> ParseLevelRange(std::string_view text, int max_level) {
  size_t colon = text.find(':');
  if (colon == std::string_view::npos) {
    return orvex::InvalidArgumentError(
        fmt::format("--levels must look like LOW:HIGH, got '{}'", text));
  }
  ORVEX_ASSIGN_OR_RETURN(int64_t low, ParseInteger(text.substr(0, colon), "LOW", 0, max_level));
  ORVEX_ASSIGN_OR_RETURN(int64_t high, ParseInteger(text.substr(colon + 1), "HIGH", 0, max_level));
  if (low > high) {
    return orvex::InvalidArgumentError(
        fmt::format("--levels LOW must not exceed HIGH, got {}:{}", low, high));
  }
  return orvex_api::Range<int>{static_cast<int>(low), static_cast<int>(high)};
}

}  // namespace orvex_tool
