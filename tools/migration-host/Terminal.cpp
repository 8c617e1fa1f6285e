#include "tools/migration-host/Terminal.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <system_error>

#include "tools/migration-host/TextReport.h"

namespace migration_host {
namespace {

constexpr std::string_view kToLineStart = "\r\033[K";

// A file that is there already may be readable by others and must not be when the first line comes.
// A device or a pipe stays as it is.
bool makePrivateAndEmpty(int descriptor) {
  struct stat status = {};
  if (fstat(descriptor, &status) != 0) return false;
  if (!S_ISREG(status.st_mode)) return true;
  return fchmod(descriptor, S_IRUSR | S_IWUSR) == 0 && ftruncate(descriptor, 0) == 0;
}

void show(std::string_view text) { std::fwrite(text.data(), 1, text.size(), stderr); }

}  // namespace

Terminal::Terminal(bool quiet)
    : _showsLines(!quiet), _showsStages(!quiet && isatty(STDERR_FILENO) != 0) {}

Terminal::~Terminal() {
  _clearStage();
  if (_logFile != nullptr) std::fclose(_logFile);
}

std::string Terminal::openLogFile(const std::string& path) {
  const int descriptor = open(path.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC | O_NOCTTY, 0600);
  if (descriptor >= 0 && makePrivateAndEmpty(descriptor)) _logFile = fdopen(descriptor, "w");
  if (_logFile != nullptr) return {};
  const std::string reason = std::generic_category().message(errno);
  if (descriptor >= 0) close(descriptor);
  return path + " cannot be opened for the log: " + reason + "; name another file with --log.";
}

std::string Terminal::closeLogFile() {
  if (_logFile == nullptr) return {};
  const bool hadFailed = std::ferror(_logFile) != 0;
  const bool hasClosed = std::fclose(_logFile) == 0;
  _logFile = nullptr;
  return hadFailed || !hasClosed ? "The log file could not be written to its end; make room, or "
                                   "name another file with --log."
                                 : std::string();
}

void Terminal::stageBegan(std::string_view stage) {
  if (!_showsStages) return;
  _clearStage();
  _stage = printable(stage) + " ...";
  show(_stage);
}

void Terminal::logLineCame(std::string_view line) {
  if (_logFile != nullptr) {
    std::fwrite(line.data(), 1, line.size(), _logFile);
    std::fputc('\n', _logFile);
  }
  if (!_showsLines) return;
  if (!_stage.empty()) show(kToLineStart);
  show(printable(line) + "\n");
  show(_stage);
}

void Terminal::_clearStage() {
  if (!_stage.empty()) show(kToLineStart);
  _stage.clear();
}

}  // namespace migration_host
