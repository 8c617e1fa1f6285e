#include <fmt/format.h>

#include <algorithm>
#include <memory>
#include <nlohmann/json.hpp>
#include <vector>

#include "deviceimage/RecordStores.h"
#include "deviceimage/SyncAgent.h"
#include "tools/common/DataclassNames.h"
#include "tools/common/Images.h"
#include "tools/common/Table.h"
#include "tools/device-image/AccountStores.h"
#include "tools/device-image/Commands.h"
#include "tools/device-image/Records.h"
#include "tools/device-image/Settings.h"

namespace tools {
namespace {

using deviceimage::RecordStores;
using deviceimage::Store;
using nlohmann::ordered_json;
using propertylist::Dictionary;

struct Options {
  std::string directory;
  bool json = false;
};

// The dataclasses that the account has turned on: "contacts" and its like, or the whole identifier
// of one that the image keeps no records of.
std::vector<std::string> enabledDataclasses(const Dictionary& account) {
  std::vector<std::string> names;
  const propertylist::Array* const enabled = findArray(account, kEnabledDataclassesKey);
  if (enabled == nullptr) return names;
  for (const propertylist::Value& value : *enabled) {
    if (value.asString() == nullptr) continue;
    names.push_back(shownDataclass(*value.asString()));
  }
  return names;
}

std::string stateOf(const Store& store) { return store.retired ? "retired" : "active"; }

ordered_json jsonOfAccount(const Dictionary& account) {
  ordered_json json;
  json["identifier"] = stringOrEmpty(account, kIdentifierKey);
  json["type"] = stringOrEmpty(account, kTypeKey);
  json["class"] = stringOrEmpty(account, kClassKey);
  json["display_name"] = stringOrEmpty(account, kDisplayNameKey);
  json["enabled_dataclasses"] = enabledDataclasses(account);
  json["children"] = ordered_json::array();
  for (const Dictionary& child : dictionariesIn(account, kChildAccountsKey)) {
    ordered_json entry;
    entry["identifier"] = stringOrEmpty(child, kIdentifierKey);
    entry["type"] = stringOrEmpty(child, kTypeKey);
    entry["class"] = stringOrEmpty(child, kClassKey);
    entry["display_name"] = stringOrEmpty(child, kDisplayNameKey);
    json["children"].push_back(std::move(entry));
  }
  return json;
}

ordered_json jsonOfStore(const Store& store, const StoreNames& names) {
  ordered_json json;
  json["dataclass"] = deviceimage::dataclassName(store.dataclass);
  json["store"] = names.nameOf(store);
  json["store_identifier"] = store.account ? ordered_json(*store.account) : ordered_json();
  json["state"] = stateOf(store);
  json["collections"] = store.collections;
  json["records"] = store.records;
  json["visible"] = store.visible;
  json["number"] = store.row;
  json["retired_at"] = store.retiredAt ? ordered_json(*store.retiredAt) : ordered_json();
  return json;
}

void printJson(const deviceimage::DeviceImage& image, const std::vector<Dictionary>& accounts,
               const std::vector<Store>& stores, const StoreNames& names) {
  const auto syncAccountName = deviceimage::SyncAgent(image).accountName();
  ordered_json json;
  json["image"] = image.rootPath();
  json["sync_account_name"] = syncAccountName ? ordered_json(*syncAccountName) : ordered_json();
  json["accounts"] = ordered_json::array();
  for (const Dictionary& account : accounts) json["accounts"].push_back(jsonOfAccount(account));
  json["stores"] = ordered_json::array();
  for (const Store& store : stores) json["stores"].push_back(jsonOfStore(store, names));
  fmt::print("{}\n", json.dump(2, ' ', false, ordered_json::error_handler_t::replace));
}

void printTables(const std::vector<Dictionary>& accounts, const std::vector<Store>& stores,
                 const StoreNames& names) {
  Table accountTable({"ACCOUNT", "TYPE", "NAME", "ENABLED"});
  for (const Dictionary& account : accounts) {
    accountTable.addRow({stringOrEmpty(account, kIdentifierKey), stringOrEmpty(account, kTypeKey),
                         stringOrEmpty(account, kDisplayNameKey),
                         fmt::format("{}", fmt::join(enabledDataclasses(account), " "))});
    for (const Dictionary& child : dictionariesIn(account, kChildAccountsKey))
      accountTable.addRow({"  " + stringOrEmpty(child, kIdentifierKey),
                           stringOrEmpty(child, kTypeKey), stringOrEmpty(child, kDisplayNameKey),
                           stringOrEmpty(child, kClassKey)});
  }
  Table storeTable({"DATACLASS", "STORE", "STATE", "NUMBER", "COLLECTIONS", "RECORDS", "VISIBLE"});
  for (const Store& store : stores)
    storeTable.addRow({std::string(deviceimage::dataclassName(store.dataclass)),
                       names.nameOf(store), stateOf(store), std::to_string(store.row),
                       std::to_string(store.collections), std::to_string(store.records),
                       store.visible ? "yes" : "no"});
  fmt::print("{}\n{}", accountTable.text(), storeTable.text());
}

ExitCode run(const Options& options) {
  const ImagePtr image = openImage(options.directory);
  const std::vector<Dictionary> accounts = Settings(*image).accounts();
  RecordStores records(image, RecordStores::Access::readOnly);
  const RecordStores::Stores listed = records.listStores();
  requireSuccess(listed.status, "the stores cannot be listed");
  const StoreNames names(*image);
  if (options.json)
    printJson(*image, accounts, listed.stores, names);
  else
    printTables(accounts, listed.stores, names);
  return ExitCode::done;
}

}  // namespace

void addShowCommand(CLI::App& app, ExitCode& outcome) {
  const auto options = std::make_shared<Options>();
  CLI::App* const command = app.add_subcommand("show", "List the accounts and the stores");
  command->add_option("DIR", options->directory, "The image")->required();
  command->add_flag("--json", options->json, "For programs");
  command->footer("Example:\n  device-image show my-device --json");
  command->callback([options, &outcome] { outcome = run(*options); });
}

}  // namespace tools
