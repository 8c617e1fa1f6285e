#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <stdexcept>

namespace accountsettings {
namespace {

Dictionary typesForTests() {
  const Array allDataclasses = {
      kAccountDataclassContacts,    kAccountDataclassMail,          kAccountDataclassCalendars,
      kAccountDataclassReminders,   kAccountDataclassBookmarks,     kAccountDataclassNotes,
      kAccountDataclassMediaStream, kAccountDataclassDeviceLocator, kAccountDataclassContactsSearch,
      kAccountDataclassBackup,      kAccountDataclassUbiquity,      kAccountDataclassKeyValue,
      kAccountDataclassShoebox,     kAccountDataclassSharedStreams};
  const Array mailActions = {"Keep Local Data", "Merge Local Data", "Delete Local Data", "None"};
  Dictionary types;
  for (const char* type : {"BookmarkDAV", "BriskIMAP", "CardDAV", "Exchange", "Gmail", "IMAPNotes",
                           "LDAP", "SMTP", "Subscribed Calendar", "VantorAccount", "Yahoo"})
    types.set(type, Dictionary());
  types.set("Quillnet", Dictionary{{"Supported Dataclasses", allDataclasses}});
  types.set("CalDAV", Dictionary{{"Supported Dataclasses",
                                  Array{kAccountDataclassReminders, kAccountDataclassCalendars}}});
  types.set("Mail", Dictionary{{"Supported Dataclasses",
                                Array{kAccountDataclassMail, kAccountDataclassNotes}},
                               {"Enable Actions", mailActions},
                               {"Disable Actions", mailActions}});
  types.set("OnMyDevice", Dictionary{{"Supported Dataclasses",
                                      Array{kAccountDataclassContacts, kAccountDataclassCalendars,
                                            kAccountDataclassReminders, kAccountDataclassBookmarks,
                                            kAccountDataclassNotes}}});
  return types;
}

Dictionary dataclassesForTests() {
  const Dictionary severalStores{{"Supports Multiple Stores", true}};
  return {{kAccountDataclassContacts, severalStores},
          {kAccountDataclassCalendars, severalStores},
          {kAccountDataclassReminders, severalStores},
          {kAccountDataclassNotes, severalStores}};
}

std::string textOrNull(const std::optional<std::string>& text) { return text.value_or("(null)"); }

}  // namespace

AccountsDevice::AccountsDevice() {
  const std::string bundle = root() + "/bundle";
  std::filesystem::create_directories(bundle);
  setResourcesDirectory(bundle);
  setResource("AccountTypesProperties", typesForTests());
  setResource("DataclassesProperties", dataclassesForTests());
}

std::string AccountsDevice::resourcePath(const std::string& name) const {
  return root() + "/bundle/" + name + ".plist";
}

void AccountsDevice::setResource(const std::string& name, const Value& content) {
  const std::optional<std::string> text = propertylist::writeXMLPropertyList(content);
  if (!text) throw std::runtime_error("this resource has no XML form");
  setResourceBytes(name, *text);
}

void AccountsDevice::setResourceBytes(const std::string& name, std::string_view bytes) {
  std::ofstream file(resourcePath(name), std::fstream::binary | std::fstream::trunc);
  file << bytes;
  file.close();
  if (!file) throw std::runtime_error("cannot write " + resourcePath(name));
}

void AccountsDevice::removeResource(const std::string& name) {
  std::filesystem::remove(resourcePath(name));
}

void AccountsDevice::writeAccounts(const Array& accounts) {
  writeSettings({{"Version", 12}, {"Accounts", accounts}});
}

Array AccountsDevice::savedAccounts() const {
  const Dictionary settings = readSettings();
  const Array* accounts = propertylist::findArray(settings, "Accounts");
  if (accounts == nullptr) throw std::runtime_error("the settings have no accounts");
  return *accounts;
}

std::size_t AccountsDevice::countOfFileCalls(std::string_view call) const {
  return static_cast<std::size_t>(
      std::count_if(fileServices.calls().begin(), fileServices.calls().end(),
                    [&](const std::string& line) { return line.starts_with(call); }));
}

SecondComer::SecondComer(AccountsDevice& device, const std::string& resource,
                         std::function<void()> task) {
  device.bundleResources.decideBy(
      [this, resource, task](const std::string& call) -> std::optional<platform::PlannedAnswer> {
        if (!call.starts_with("pathForResource(" + resource) || ++_questions > 1)
          return std::nullopt;
        _thread = std::thread([this, task] {
          _begun = true;
          task();
        });
        for (int turns = 0; !_begun || (turns < 10000 && _questions == 1); ++turns)
          std::this_thread::yield();
        return std::nullopt;
      });
}

Dictionary accountInfo(std::string_view identifier, std::string_view type, const Dictionary& more) {
  Dictionary info{{"Identifier", identifier}, {"Type", type}, {"Class", "C"}};
  for (const Dictionary::Entry& entry : more) info.set(entry.key(), entry.value());
  return info;
}

Dictionary with(Dictionary dictionary, std::string_view key, const Value& value) {
  dictionary.set(key, value);
  return dictionary;
}

Dictionary without(Dictionary dictionary, std::string_view key) {
  dictionary.remove(key);
  return dictionary;
}

Lines identifiersOf(const AccountArray& accounts) {
  Lines identifiers;
  for (const AccountPtr& account : accounts)
    identifiers.push_back(textOrNull(account->identifier()));
  return identifiers;
}

Lines identifiersOf(const Array& accountInfos) {
  Lines identifiers;
  for (const Value& info : accountInfos) {
    const propertylist::Text* identifier =
        propertylist::findString(*info.asDictionary(), "Identifier");
    identifiers.push_back(identifier != nullptr ? *identifier : "(null)");
  }
  return identifiers;
}

std::shared_ptr<OpenStore> OpenStore::ofFile() {
  const auto store = std::make_shared<OpenStore>();
  store->_initFromSettingsFile();
  return store;
}

std::shared_ptr<OpenStore> OpenStore::ofAccounts(const Array& accounts) {
  const auto store = std::make_shared<OpenStore>();
  store->_initWithAccountsInfo(accounts);
  return store;
}

Lines OpenStore::children() const {
  Lines lines;
  for (const auto& [child, parent] : childAccountIDToParentAccountID())
    lines.push_back(std::string(child) + " of " + std::string(*parent->asString()));
  std::sort(lines.begin(), lines.end());
  if (lines.size() != childAccountsByID().size())
    throw std::runtime_error("the two indexes of children differ");
  return lines;
}

}  // namespace accountsettings
