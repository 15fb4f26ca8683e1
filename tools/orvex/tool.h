#ifndef ORVEX_TOOLS_ORVEX_TOOL_H_
#define ORVEX_TOOLS_ORVEX_TOOL_H_

// The orvex developer tool: subcommands that answer buffer-layout, format
// and profiling questions with the library's public interface. Each command
// is a function of its parsed arguments writing to the given streams, so
// that tests run it in-process.
//
// Exit status: 0 success; 1 a negative answer (a layout that does not
// conform, a demo frame that failed verification); 2 an error (bad usage,
// a library error, an unreadable file, output that cannot be written).

#include <iosfwd>
#include <string>
#include <string_view>
#include <vector>

#include "orvex/status/status.h"
#include "tools/orvex/args.h"

namespace orvex_tool {

inline constexpr int kExitOk = 0;
inline constexpr int kExitNegative = 1;
inline constexpr int kExitError = 2;

// Where a command writes, and what it knows of its surroundings.
class CommandContext {
 public:
  CommandContext(std::string_view command, std::ostream& out, std::ostream& err, bool terminal)
      : command_(command), out_(out), err_(err), terminal_(terminal) {}

  std::ostream& out() { return out_; }
  std::ostream& err() { return err_; }
  // True when stderr is a terminal (progress lines are wanted).
  bool terminal() const { return terminal_; }

  // Prints "orvex <command>: <message>" and the help hint on stderr;
  // returns kExitError.
  int UsageError(std::string_view message);
  // Prints the status text on stderr; returns kExitError.
  int Error(const orvex::Status& status);

 private:
  std::string_view command_;
  std::ostream& out_;
  std::ostream& err_;
  bool terminal_;
};

using CommandFunction = int (*)(const ParsedArgs& args, CommandContext& context);

struct Command {
  CommandSpec spec;
  CommandFunction run;
};

// Specs and entry points of the commands.
const Command& FormatsCommand();
const Command& LayoutCommand();
const Command& PyramidCommand();
const Command& RenderCommand();
const Command& CpaCommand();
const Command& DemoCommand();

// Runs the tool with `args` (the words after the program name).
int RunTool(const std::vector<std::string>& args, std::ostream& out, std::ostream& err,
            bool terminal = false);

// As above, writing the output to the file descriptor `out_fd` (the
// program's stdout). Output that cannot be written in full (a full disk,
// /dev/full) is an error whatever the command answered: the errno status
// "cannot write standard output: <errno text>" goes to `err` and the exit
// status is kExitError.
int RunTool(const std::vector<std::string>& args, int out_fd, std::ostream& err,
            bool terminal = false);

// The top-level usage text listing the commands.
std::string ToolUsageText();

}  // namespace orvex_tool

#endif  // ORVEX_TOOLS_ORVEX_TOOL_H_
