// The orvex developer tool. See tool.h for the commands and exit status.

#include <unistd.h>

#include <iostream>
#include <string>
#include <vector>

#include "tools/orvex/tool.h"

int main(int argc, char** argv) {
  std::vector<std::string> args(argv + 1, argv + argc);
  return orvex_tool::RunTool(args, STDOUT_FILENO, std::cerr, isatty(STDERR_FILENO) == 1);
}
