#pragma once

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "platform/testing/InMemoryDevice.h"
#include "propertylist/Writing.h"

namespace localdata {

using accountsettings::AccountPtr;
using platform::Status;
using propertylist::Array;
using propertylist::Dictionary;
using propertylist::Value;

// A device in memory with the shipped resources, whose sync agent knows the service account "ada".
class LocalDataTest : public ::testing::Test {
 protected:
  using Lines = std::vector<std::string>;
  using Journal = platform::CallJournal;

  LocalDataTest() {
    device.setResourcesDirectory(RESOURCES_DIR);
    setSyncAgentAccountName("ada");
  }

  void setSyncAgentAccountName(const Value& name) {
    device.preferences.applications["com.vantor.OTASyncAgent"] = {{"AccountName", name}};
  }

  static Array dataclasses(const std::vector<std::string>& shortNames) {
    Array array;
    for (const std::string& name : shortNames) array.append("com.vantor.Dataclass." + name);
    return array;
  }

  // The properties of an account as the settings file has them; `enabled` are short names.
  static Dictionary accountInfo(std::string_view type, std::string_view identifier,
                                const std::vector<std::string>& enabled) {
    const bool isMail = type == "Mail";
    return {{"Type", type},
            {"Class", isMail ? "IMAPAccount" : "QuillnetAccount"},
            {"Identifier", identifier},
            {"DisplayName", "Name of " + std::string(identifier)},
            {"Enabled Dataclasses", dataclasses(enabled)}};
  }
  // The same with further entries, which win.
  static Dictionary with(Dictionary info, const Dictionary& further) {
    for (const Dictionary::Entry& entry : further) info.set(entry.key(), entry.value());
    return info;
  }
  static Dictionary deviceLocalInfo(const std::vector<std::string>& enabled) {
    return {{"Type", "OnMyDevice"},
            {"Class", "ASSDeviceLocalAccount"},
            {"Identifier", "DeviceLocalAccount"},
            {"Enabled Dataclasses", dataclasses(enabled)}};
  }
  // Gives the code this resource; from then on it finds no other than those given so.
  void writeResource(const std::string& name, const Dictionary& content) {
    const std::string directory = device.root() + "/resources";
    std::filesystem::create_directory(directory);
    const propertylist::Bytes bytes = propertylist::writeBinaryPropertyList(content).value();
    std::ofstream(directory + "/" + name + ".plist", std::fstream::binary)
        .write(reinterpret_cast<const char*>(bytes.data()),
               static_cast<std::streamsize>(bytes.size()));
    device.setResourcesDirectory(directory);
  }
  void useAccountTypes(const Dictionary& types) { writeResource("AccountTypesProperties", types); }
  static AccountPtr record(const Dictionary& info) {
    return accountsettings::ASSBasicAccount::initWithProperties(info);
  }
  // The property of the only account of that type in the settings file; empty without the account
  // or the property.
  std::optional<Value> savedProperty(std::string_view type, std::string_view key) const {
    const Dictionary settings = device.readSettings();
    const Array* accounts = propertylist::findArray(settings, "Accounts");
    if (accounts == nullptr) return std::nullopt;
    for (const Value& account : *accounts) {
      const Dictionary* info = account.asDictionary();
      const propertylist::Text* found = propertylist::findString(*info, "Type");
      if (found == nullptr || *found != type) continue;
      const Value* value = info->find(key);
      return value != nullptr ? std::optional(*value) : std::nullopt;
    }
    return std::nullopt;
  }
  void writeAccounts(std::vector<Value> accounts) {
    device.writeSettings({{"Version", 12}, {"Accounts", Array(std::move(accounts))}});
  }
  // How often the settings file was read so far.
  std::size_t settingsReads() const {
    std::size_t reads = 0;
    for (const std::string& call : device.fileServices.calls())
      if (call == "readPropertyListFile(" + device.settingsPath() + ")") ++reads;
    return reads;
  }

  platform::InMemoryDevice device;
};

}  // namespace localdata
