// Does to the settings file what the process default "TestChange" says:
//
//   retire   takes the accounts that are to be retired out and nothing else
//   drop     takes all accounts out
//   change   renames those that are to stay
//   reverse  turns their order round
//   add      puts one more behind them
//   touch    writes the file as it is
//   version  writes an old version
//   mode     writes the file so that everybody may read it
//   owner    gives the file to root
//   destroy  writes what is no property list
//   remove   removes the file
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <fstream>
#include <string>
#include <vector>

#include "platform/Services.h"
#include "propertylist/Writing.h"
#include "tests/host/bundles/TestMigrator.h"

namespace {

using propertylist::Array;
using propertylist::Dictionary;

bool isRetired(const Dictionary& account) {
  const propertylist::Text* type = propertylist::findString(account, "Type");
  const propertylist::Value* status = account.find("QuillnetStatus");
  return type != nullptr && *type == "Quillnet" && status != nullptr && status->asInteger() == 1;
}

Array changed(const Array& accounts, const std::string& change) {
  std::vector<propertylist::Value> result;
  for (const propertylist::Value& entry : accounts) {
    Dictionary account = *entry.asDictionary();
    if (change == "drop" || (change == "retire" && isRetired(account))) continue;
    if (change == "change" && !isRetired(account)) account.set("DisplayName", "renamed");
    if (change == "reverse")
      result.insert(result.begin(), account);
    else
      result.emplace_back(account);
  }
  if (change == "add") result.emplace_back(Dictionary{{"Identifier", "New"}, {"Type", "Mail"}});
  return Array(result);
}

}  // namespace

bool migrate() {
  const platform::Services& services = platform::services();
  const std::string path = services.deviceInfo.systemRootDirectory() +
                           "/var/mobile/Library/Preferences/com.vantor.accountsettings.plist";
  const auto value = services.preferences.readDefault("TestChange");
  const auto settings = services.fileServices.readPropertyListFile(path);
  if (!value || !settings.value) return false;
  const std::string change = *value->asString();
  if (change == "remove") return std::remove(path.c_str()) == 0;
  Dictionary root = *settings.value->asDictionary();
  root.set("Accounts", changed(*propertylist::findArray(root, "Accounts"), change));
  if (change == "version") root.set("Version", 11);
  propertylist::Bytes bytes = *propertylist::writeBinaryPropertyList(root);
  if (change == "destroy") bytes.resize(bytes.size() / 2);
  std::ofstream file(path, std::fstream::binary | std::fstream::trunc);
  file.write(reinterpret_cast<const char*>(bytes.data()),
             static_cast<std::streamsize>(bytes.size()));
  if (change == "mode" && chmod(path.c_str(), 0644) != 0) return false;
  if (change == "owner" && chown(path.c_str(), 0, 0) != 0) return false;
  return file.good();
}
