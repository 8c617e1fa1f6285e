#pragma once

#include <map>
#include <mutex>
#include <vector>

#include "platform/BundleResources.h"
#include "propertylist/Value.h"

namespace platform {

// Resources that lie flat beside the shared object with the asking code; the object's folder is the
// bundle. The string table T in language L is the property list "L.lproj/T.strings", a dictionary
// of texts by key. A table is read once per process, also when it is missing.
class PLATFORM_EXPORT DlAddrBundleResources : public BundleResources {
 public:
  // `preferredLanguages` are the user's, the first one first ("de", "pt-BR"). A language with a
  // region also accepts a table without one; English comes last. `directory` takes the place of
  // every bundle's folder, for code that is linked into a program.
  explicit DlAddrBundleResources(const std::vector<std::string>& preferredLanguages,
                                 std::optional<std::string> directory = std::nullopt);
  ~DlAddrBundleResources() override;

  // `name` and `type` have no "/" in them.
  std::optional<std::string> pathForResource(const void* code, std::string_view name,
                                             std::string_view type) override;
  std::string localizedString(const void* code, std::string_view key,
                              std::string_view table) override;

 private:
  std::optional<std::string> _directoryOf(const void* code) const;
  const propertylist::Dictionary& _table(const std::string& directory, std::string_view table);
  propertylist::Dictionary _readTable(const std::string& directory, std::string_view table) const;

  std::vector<std::string> _languages;  // in the order in which they are tried
  std::optional<std::string> _directory;
  std::mutex _mutex;
  std::map<std::string, propertylist::Dictionary> _tables;  // by directory and table
};

}  // namespace platform
