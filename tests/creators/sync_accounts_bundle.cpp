// A bundle with a creator of sync accounts, whose answers the test can tell apart.

#include "tests/creators/Diary.h"

namespace accountsettings {
namespace {

const char* text(bool value) { return value ? "true" : "false"; }

// Answers whether the user asked.
class SyncAccount : public AccountSyncAccountProtocol {
 public:
  bool refreshContainerWithIdentifierForDataclassIsUserRequested(
      std::string_view containerIdentifier, std::string_view dataclass,
      bool isUserRequested) override {
    diary().note("refreshContainer(" + std::string(containerIdentifier) + ", " +
                 std::string(dataclass) + ", " + text(isUserRequested) + ")");
    return isUserRequested;
  }
  bool refreshContainerListForDataclassIsUserRequested(std::string_view dataclass,
                                                       bool isUserRequested) override {
    diary().note("refreshContainerList(" + std::string(dataclass) + ", " + text(isUserRequested) +
                 ")");
    return isUserRequested;
  }
  bool refreshContainersForDataclassIsUserRequested(std::string_view dataclass,
                                                    bool isUserRequested) override {
    diary().note("refreshContainers(" + std::string(dataclass) + ", " + text(isUserRequested) +
                 ")");
    return isUserRequested;
  }
};

class SyncCreator : public platform::RuntimeClass, public SyncAccountCreator {
 public:
  SyncCreator() { platform::registerClass(*this); }
  std::string className() const override { return "SyncCreator"; }
  SyncAccountPtr accountToRefreshForBasicAccount(const AccountPtr& account) override {
    diary().noteAccount("accountToRefreshForBasicAccount", account);
    if (diary().creationFails()) return nullptr;
    return std::make_shared<SyncAccount>();
  }
};

SyncCreator syncCreator;

}  // namespace
}  // namespace accountsettings
