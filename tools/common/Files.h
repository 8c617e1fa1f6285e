#pragma once

#include <cstddef>
#include <cstdio>
#include <string>
#include <string_view>

namespace tools {

// The content of a regular file. A file that cannot be read, or is larger than `limit`, ends the
// command before anything is written.
std::string readWholeFile(const std::string& path, std::size_t limit);

// Where a command writes records: standard output, or a file that takes its name only when it is
// complete, readable by its owner only. When root replaces a file, its owner stays, except in a
// folder that users other than its owner may write.
class Output {
 public:
  // An empty path is standard output. Ends the command when the file cannot be made.
  explicit Output(std::string path);
  ~Output();  // removes what was not finished
  Output(const Output&) = delete;
  Output& operator=(const Output&) = delete;

  void write(std::string_view bytes);
  // Makes what was written lasting. Ends the command when that fails.
  void finish();

 private:
  [[noreturn]] void _fail(int errorNumber);
  std::string _path;
  std::string _temporaryPath;
  std::FILE* _file = nullptr;
};

// Tells on a terminal what a long run is at, in one line that it wipes in the end; silent when
// standard error is no terminal.
class Progress {
 public:
  Progress();
  ~Progress();
  Progress(const Progress&) = delete;
  Progress& operator=(const Progress&) = delete;
  void show(std::string_view text);
  // Before other lines are written to standard error.
  void wipe();

 private:
  bool _isTerminal;
};

}  // namespace tools
