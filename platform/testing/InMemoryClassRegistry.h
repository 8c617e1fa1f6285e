#pragma once

#include <map>
#include <string>
#include <vector>

#include "platform/ClassRegistry.h"
#include "platform/testing/FakeService.h"

namespace platform {

// Classes and code as a test lists them. The classes that the process has registered are found too,
// after those in `classes`.
class InMemoryClassRegistry : public ClassRegistry, public FakeService {
 public:
  struct Code {
    std::vector<RuntimeClass*> classes;             // known once the code is loaded
    std::optional<std::string> principalClassName;  // of a bundle
  };
  std::map<std::string, RuntimeClass*, std::less<>> classes;
  std::map<std::string, Code, std::less<>> bundles;    // what can be loaded, by path
  std::map<std::string, Code, std::less<>> libraries;  // the same

  RuntimeClass* classNamed(std::string_view name) override;
  CodeBundlePtr loadCodeBundle(const std::string& path) override;
  std::optional<std::string> loadLibrary(const std::string& path) override;

 private:
  void _register(const Code& code);
};

}  // namespace platform
