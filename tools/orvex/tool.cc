#include "tools/orvex/tool.h"

#include <ostream>

#include "fmt/format.h"
#include "tools/orvex/output.h"

namespace orvex_tool {
namespace {

std::vector<const Command*> AllCommands() {
  return {&DemoCommand(),   &FormatsCommand(), &LayoutCommand(),
          &RenderCommand(), &PyramidCommand(), &CpaCommand()};
}

const Command* FindCommand(std::string_view name) {
  for (const Command* command : AllCommands()) {
    if (command->spec.name == name) return command;
  }
  return nullptr;
}

}  // namespace

int CommandContext::UsageError(std::string_view message) {
  err_ << fmt::format("orvex {}: {}\nRun 'orvex {} --help' for usage.\n", command_, message,
                      command_);
  return kExitError;
}

int CommandContext::Error(const orvex::Status& status) {
  err_ << status.ToString() << "\n";
  return kExitError;
}

std::string ToolUsageText() {
  std::string text =
      "usage: orvex COMMAND [arguments] [flags]\n\n"
      "Answers buffer-layout, pixel-format and profiling questions with liborvex_base.\n\n"
      "commands:\n";
  for (const Command* command : AllCommands()) {
    text += fmt::format("  {:<8}  {}\n", command->spec.name, command->spec.summary);
  }
  text +=
      "\nRun 'orvex COMMAND --help' for the arguments of one command.\n"
      "Exit status: 0 success, 1 a negative answer (does not conform, verification failed),\n"
      "2 an error.\n";
  return text;
}

int RunTool(const std::vector<std::string>& args, std::ostream& out, std::ostream& err,
            bool terminal) {
  if (args.empty()) {
    err << ToolUsageText();
    return kExitError;
  }
  const std::string& name = args[0];
  // "help COMMAND" asks for that command's usage.
  const bool help_for = name == "help" && args.size() > 1;
  if ((name == "-h" || name == "--help" || name == "help") && !help_for) {
    out << ToolUsageText();
    return kExitOk;
  }
  const Command* command = FindCommand(help_for ? args[1] : name);
  if (command == nullptr) {
    err << fmt::format("orvex: unknown command '{}'\n\n{}", help_for ? args[1] : name,
                       ToolUsageText());
    return kExitError;
  }
  if (help_for) {
    out << UsageText(command->spec);
    return kExitOk;
  }
  CommandContext context(command->spec.name, out, err, terminal);
  auto parsed = ParseArgs(command->spec, std::vector<std::string>(args.begin() + 1, args.end()));
  if (!parsed.ok()) return context.UsageError(parsed.status().message());
  if (parsed->help) {
    out << UsageText(command->spec);
    return kExitOk;
  }
  return command->run(*parsed, context);
}

int RunTool(const std::vector<std::string>& args, int out_fd, std::ostream& err, bool terminal) {
  FdOutputBuffer buffer(out_fd);
  std::ostream out(&buffer);
  const int code = RunTool(args, out, err, terminal);
  out.flush();
  if (buffer.error() == 0) return code;
  err << orvex::StatusFromErrno(buffer.error(), "cannot write standard output").ToString() << "\n";
  return kExitError;
}

}  // namespace orvex_tool
