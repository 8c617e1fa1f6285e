#include "accountsdatamigrator/AccountTypes.h"

#include <utility>

#include "QuillnetAccountTypeRemoval/AccountConstants.h"
#include "platform/Services.h"

namespace accountsdatamigrator {

using propertylist::Array;
using propertylist::Dictionary;

namespace {

// An address in this bundle, by which the platform tells whose resources are asked for.
const char anchor = 0;

}  // namespace

std::optional<AccountTypes> AccountTypes::read() {
  const platform::Services& services = platform::services();
  const std::optional<std::string> path =
      services.bundleResources.pathForResource(&anchor, "AccountTypesProperties", "plist");
  if (!path) {
    platform::logToSystem("AccountMigrator: AccountTypesProperties.plist is not beside the code");
    return std::nullopt;
  }
  const propertylist::FileReadResult file = services.fileServices.readPropertyListFile(*path);
  const Dictionary* const catalogue = file.value ? file.value->asDictionary() : nullptr;
  if (catalogue != nullptr) return AccountTypes(*catalogue);
  platform::logToSystem("AccountMigrator: %@ cannot be read: %@", *path,
                        file.value ? std::string("it holds no dictionary") : file.error);
  return std::nullopt;
}

Array AccountTypes::dataclassesOf(std::string_view type) const {
  const Dictionary* const entry = propertylist::findDictionary(_catalogue, type);
  const Array* const dataclasses =
      entry == nullptr
          ? nullptr
          : propertylist::findArray(*entry, accountsettings::kPropertiesSupportedDataclasses);
  return dataclasses == nullptr ? Array() : *dataclasses;
}

}  // namespace accountsdatamigrator
