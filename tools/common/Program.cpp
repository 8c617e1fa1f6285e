#include "tools/common/Program.h"

#include <fmt/format.h>

#include <csignal>
#include <cstdio>
#include <exception>
#include <string>

#include "tools/common/Text.h"

namespace tools {
namespace {

std::string& programName() {
  static std::string name;
  return name;
}

ExitCode parse(CLI::App& app, const ExitCode& outcome, int argumentCount, char** arguments) {
  try {
    app.parse(argumentCount, arguments);
    return outcome;
  } catch (const CLI::ParseError& stop) {
    // --help and --version stop the parsing too, with code 0.
    return app.exit(stop) == 0 ? ExitCode::done : ExitCode::wrongUsage;
  } catch (const CommandFailure& failure) {
    printMessage(failure.what());
    return failure.code();
  } catch (const std::exception& failure) {
    printMessage(fmt::format("unexpected failure: {}", failure.what()));
    return ExitCode::unexpectedFailure;
  }
}

}  // namespace

int runProgram(CLI::App& app, const ExitCode& outcome, int argumentCount, char** arguments) {
  programName() = app.get_name();
  std::signal(SIGPIPE, SIG_IGN);  // a closed pipe is a failed write like any other
  ExitCode code = parse(app, outcome, argumentCount, arguments);
  if (std::fflush(stdout) != 0 && code == ExitCode::done) {
    printMessage("cannot write standard output; what was printed is incomplete");
    code = ExitCode::unexpectedFailure;
  }
  return static_cast<int>(code);
}

std::string messageLine(std::string_view text) {
  return programName() + ": " + forTerminal(text) + '\n';
}

void printMessage(std::string_view text) {
  const std::string line = messageLine(text);
  std::fwrite(line.data(), 1, line.size(), stderr);
}

}  // namespace tools
