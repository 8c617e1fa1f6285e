#pragma once

#include <string>

namespace platform {

// A new directory for one test, removed with all that is in it.
class TemporaryDirectory {
 public:
  TemporaryDirectory();
  ~TemporaryDirectory();
  TemporaryDirectory(const TemporaryDirectory&) = delete;
  TemporaryDirectory& operator=(const TemporaryDirectory&) = delete;

  // Absolute, without links and without a "/" at its end.
  const std::string& path() const { return _path; }

 private:
  std::string _path;
};

}  // namespace platform
