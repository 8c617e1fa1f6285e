#pragma once

#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "platform/posix/DlAddrBundleResources.h"
#include "platform/testing/FakeService.h"

namespace platform {

// Resources that a test chooses, the same for all code: texts of its own, and a directory of real
// resource files. Without either, no file is found and each text is its key.
class InMemoryBundleResources : public BundleResources, public FakeService {
 public:
  std::map<std::string, std::map<std::string, std::string, std::less<>>, std::less<>>
      texts;  // by table and key; these come first

  // Takes what is not in `texts` from `directory`, in the first of `languages` that it has.
  void useDirectory(const std::string& directory,
                    const std::vector<std::string>& languages = {"en"}) {
    _files = std::make_unique<DlAddrBundleResources>(languages, directory);
  }

  std::optional<std::string> pathForResource(const void* code, std::string_view name,
                                             std::string_view type) override;
  std::string localizedString(const void* code, std::string_view key,
                              std::string_view table) override;

 private:
  std::unique_ptr<DlAddrBundleResources> _files;
};

}  // namespace platform
