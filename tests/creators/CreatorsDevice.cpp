#include "tests/creators/CreatorsDevice.h"

#include <filesystem>

#include "tests/creators/Diary.h"

namespace accountsettings {
namespace {

class KeptDiary : public Diary {
 public:
  KeptDiary() { platform::registerClass(*this); }
  void note(const std::string& line) override { lines.push_back(line); }
  void noteAccount(const std::string& what, const AccountPtr& account) override {
    note(what + "(" + std::string(account ? account->identifier().value_or("(null)") : "none") +
         ")");
  }
  void noteChanges(const std::string& notifier, const Array& changes) override {
    note(told(notifier, changes));
  }
  bool creationFails() const override { return fails; }

  Lines lines;
  bool fails = false;
};

// Registered once in the process.
KeptDiary keptDiary;

}  // namespace

CreatorsDevice::CreatorsDevice() {
  std::filesystem::create_directories(root() + "/Library/Creators");
  std::filesystem::copy_file(FULL_ACCOUNTS_BUNDLE, bundlePath(kFullAccounts));
  std::filesystem::copy_file(SYNC_ACCOUNTS_BUNDLE, bundlePath(kSyncAccounts));
  std::filesystem::copy_file(NOTIFIERS_BUNDLE, bundlePath(kNotifiers));
  std::filesystem::copy_file(UNRESOLVED_BUNDLE, bundlePath(kUnresolved));
  use<platform::ClassRegistry>(_registry);
  keptDiary.lines.clear();
  keptDiary.fails = false;
}

Lines& diaryLines() { return keptDiary.lines; }
void letCreationFail(bool fails) { keptDiary.fails = fails; }

bool fullAccountsAreLoaded() { return platform::registeredClass("MakingCreator") != nullptr; }
bool syncAccountsAreLoaded() { return platform::registeredClass("SyncCreator") != nullptr; }
bool notifiersAreLoaded() { return platform::registeredClass("ChangesNotifier") != nullptr; }

Dictionary entry(const std::string& type, const Dictionary& description) {
  return {{"Type", type}, {"Description", description}};
}

Dictionary creator(const std::string& type, const std::string& framework,
                   const std::string& className) {
  return entry(type, {{"Framework", framework}, {"Class", className}});
}

Dictionary notifier(const std::string& className, const Array& dataclasses) {
  return entry(
      "NotifierAccount",
      {{"Supported Dataclasses", dataclasses}, {"Framework", kNotifiers}, {"Class", className}});
}

std::string told(const std::string& notifier, const Array& changes) {
  return notifier + ": " + propertylist::describe(changes);
}

Dictionary change(int kind, const std::string& identifier, const std::string& type,
                  const Array& originalDataclasses) {
  return {{"ChangeType", kind},
          {"AccountID", identifier},
          {"AccountType", type},
          {"OriginalDataclasses", originalDataclasses}};
}

std::shared_ptr<CreatingAccount> calendarAccount(std::string_view identifier) {
  return CreatingAccount::initWithProperties(accountInfo(identifier));
}

std::shared_ptr<TellingStore> TellingStore::ofFile() {
  const auto store = std::make_shared<TellingStore>();
  store->_initFromSettingsFile();
  return store;
}

bool NotingLoader::loadBundleForAccountWithProperties(const Dictionary& properties) {
  asked.push_back(*propertylist::findString(properties, "Identifier"));
  return _answer;
}

}  // namespace accountsettings
