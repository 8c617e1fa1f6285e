#include "platform/posix/ProcessClassRegistry.h"

#include <dlfcn.h>

#include <utility>

#include "platform/DataClassMigrator.h"
#include "platform/posix/CodeBundleInformation.h"

namespace platform {
namespace {

class LoadedCodeBundle : public CodeBundle {
 public:
  explicit LoadedCodeBundle(std::optional<std::string> principalClass)
      : _principalClass(std::move(principalClass)) {}
  std::optional<std::string> principalClassName() const override { return _principalClass; }

 private:
  std::optional<std::string> _principalClass;
};

}  // namespace

RuntimeClass* ProcessClassRegistry::classNamed(std::string_view name) {
  return registeredClass(name);
}

CodeBundlePtr ProcessClassRegistry::loadCodeBundle(const std::string& path) {
  const ReadCodeBundleInformation read = readCodeBundleInformation(path);
  if (!read.information) return nullptr;
  if (read.information->platformInterfaceVersion != kPlatformInterfaceVersion) return nullptr;
  if (loadLibrary(read.information->executablePath)) return nullptr;
  return std::make_shared<LoadedCodeBundle>(read.information->principalClass);
}

std::optional<std::string> ProcessClassRegistry::loadLibrary(const std::string& path) {
  // To the loader an empty path is the program itself.
  if (path.empty() || path.find('\0') != std::string::npos) return "not the path of a library";
  const std::string file = path.find('/') == std::string::npos ? "./" + path : path;
  if (::dlopen(file.c_str(), RTLD_NOW | RTLD_LOCAL) != nullptr) return std::nullopt;
  const char* reason = ::dlerror();
  return reason == nullptr ? file + ": cannot be loaded" : std::string(reason);
}

}  // namespace platform
