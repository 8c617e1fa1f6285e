#pragma once

#include <CLI/CLI.hpp>
#include <string>
#include <string_view>

#include "tools/common/ExitCode.h"

namespace tools {

// What every tool does around its commands: parses the command line into `app`, whose callbacks do
// the work and set `outcome`, and makes one message and an exit code of every failure. Returns the
// program's exit code.
int runProgram(CLI::App& app, const ExitCode& outcome, int argumentCount, char** arguments);

// A line for standard error: the program's name and the text, whose control characters are escaped.
std::string messageLine(std::string_view text);
void printMessage(std::string_view text);

}  // namespace tools
