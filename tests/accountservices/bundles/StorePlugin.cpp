#include "tests/accountservices/bundles/StorePlugin.h"

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "platform/Services.h"

namespace {

using accountsettings::ASSAccountsManager;

class StorePluginClass : public platform::RuntimeClass, public StorePlugin {
 public:
  StorePluginClass() { platform::registerClass(*this); }
  std::string className() const override { return "StorePlugin"; }
  void renameAndNotify(const std::string& identifier, const std::string& name) override {
    ASSAccountsManager::_setShouldSkipNotifications(false);
    const auto store = ASSAccountsManager::init();
    store->accountWithIdentifier(identifier)->setDisplayName(name);
    store->saveAllAccounts();
  }
  bool refresh(const std::string& identifier, const std::string& dataclass) override {
    const auto store = ASSAccountsManager::init();
    return store->accountWithIdentifier(identifier)->refreshContainersForDataclass(dataclass);
  }
  platform::RuntimeClass* classNamed(const std::string& name) override {
    return platform::services().classRegistry.classNamed(name);
  }
};

auto& storePlugin = *new StorePluginClass;

}  // namespace
