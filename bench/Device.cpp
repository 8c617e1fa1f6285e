#include "bench/Device.h"

#include "QuillnetAccountTypeRemoval/ASSBasicAccount.h"

namespace bench {

// They are kept for the life of the process, and lie in real files.
void Device::_readCatalogues() {
  accountsettings::ASSBasicAccount::initialize();
  accountsettings::ASSBasicAccount::multipleStoresSupportedByDataclass("");
}

Device& device() {
  static Device made;
  return made;
}

}  // namespace bench
