#include "tools/common/Installation.h"

#include <filesystem>
#include <system_error>

namespace tools {
namespace {

std::string installedFolder(const char* name) {
  std::error_code error;
  const std::filesystem::path program = std::filesystem::read_symlink("/proc/self/exe", error);
  return (program.parent_path() / DATA_FROM_PROGRAMS / name).lexically_normal().string();
}

}  // namespace

std::string installedMigrators() { return installedFolder("migrators"); }

std::string installedAccountResources() {
  return installedFolder("migrators/QuillnetAccountRemoval.migrator");
}

std::string installedAccountServices() { return installedFolder("services"); }

}  // namespace tools
