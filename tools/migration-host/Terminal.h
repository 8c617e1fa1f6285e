#pragma once

#include <cstdio>
#include <memory>
#include <string>
#include <string_view>

#include "host/MigrationHost.h"

namespace migration_host {

// Shows a run while it goes on: log lines on the standard error and in the log file, and on a
// terminal the present stage below them. Quiet shows neither, but still fills the log file.
class Terminal : public host::RunListener {
 public:
  explicit Terminal(bool quiet);
  ~Terminal() override;
  Terminal(const Terminal&) = delete;
  Terminal& operator=(const Terminal&) = delete;

  // Opens the log file and empties it, readable by its owner only from then on. Empty on success,
  // else why not; a file that is there has then kept its content.
  std::string openLogFile(const std::string& path);
  // Closes it. Empty when everything was written, else why not.
  std::string closeLogFile();

  // The run is over: takes the last stage off the terminal.
  void stageEnded() { _clearStage(); }
  void stageBegan(std::string_view stage) override;
  void logLineCame(std::string_view line) override;

 private:
  void _clearStage();

  bool _showsLines;
  bool _showsStages;
  std::string _stage;
  std::FILE* _logFile = nullptr;
};

}  // namespace migration_host
