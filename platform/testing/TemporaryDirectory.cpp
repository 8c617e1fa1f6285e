#include "platform/testing/TemporaryDirectory.h"

#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <system_error>

namespace platform {

TemporaryDirectory::TemporaryDirectory()
    : _path(std::filesystem::canonical(std::filesystem::temp_directory_path()) / "test-XXXXXX") {
  if (::mkdtemp(_path.data()) == nullptr)
    throw std::system_error(errno, std::generic_category(), "cannot make " + _path);
}

TemporaryDirectory::~TemporaryDirectory() {
  std::error_code ignored;  // what a test made unremovable stays
  std::filesystem::remove_all(_path, ignored);
}

}  // namespace platform
