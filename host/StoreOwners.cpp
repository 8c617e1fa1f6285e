#include "host/StoreOwners.h"

#include <algorithm>
#include <set>

namespace host {
namespace {

using deviceimage::Dataclass;
using propertylist::Dictionary;

std::set<Dataclass> enabledDataclasses(const Dictionary& account) {
  std::set<Dataclass> enabled;
  const propertylist::Array* names = propertylist::findArray(account, "Enabled Dataclasses");
  if (names == nullptr) return enabled;
  for (const propertylist::Value& name : *names)
    if (const propertylist::Text* text = name.asString())
      if (const auto dataclass = deviceimage::dataclassWithIdentifier(*text))
        enabled.insert(*dataclass);
  return enabled;
}

// Of the stores, and of those that may come: what is longer is looked for in vain, and a small file
// may give it to very many accounts.
std::size_t longestName(const std::vector<ObservedStore>& stores) {
  std::size_t longest = 1024;
  for (const ObservedStore& store : stores)
    longest = std::max(longest, store.account.value_or("").size());
  return longest;
}

}  // namespace

StoreOwners::StoreOwners(const Observation& before, const Selection& selection,
                         const deviceimage::SyncAgent& agent) {
  std::set<LineName> lineNames;
  std::map<StoreName, std::size_t> claims;        // to an account
  std::map<std::string, std::size_t> firstOwner;  // of a store's name, whatever it holds
  const std::vector<Dictionary>& accounts = before.settings.accounts;
  const std::size_t longest = longestName(before.stores);
  SelectedAccounts selected(selection);
  for (std::size_t index = 0; index < accounts.size(); ++index) {
    if (!selected.cover(accounts[index])) continue;
    const std::set<Dataclass> enabled = enabledDataclasses(accounts[index]);
    for (const Dataclass dataclass : deviceimage::kDataclasses) {
      if (enabled.contains(dataclass)) lineNames.emplace(index, dataclass);
      const auto store = agent.storeIdentifier(accounts[index], dataclass);
      if (!store || store->size() > longest) continue;
      firstOwner.emplace(*store, index);
      if (enabled.contains(dataclass))
        claims.emplace(StoreName(dataclass, std::string(*store)), index);
    }
  }
  for (const ObservedStore& store : before.stores) {
    if (!store.account || store.retired || store.records.empty()) continue;
    const auto owner = firstOwner.find(*store.account);
    if (owner == firstOwner.end()) continue;
    const auto claim = claims.emplace(StoreName(store.dataclass, *store.account), owner->second);
    lineNames.emplace(claim.first->second, store.dataclass);
  }
  std::map<LineName, std::size_t> lineNumbers;
  for (const LineName& name : lineNames) {
    lineNumbers.emplace(name, _lines.size());
    _lines.push_back({nameUnder(accounts[name.first], "Identifier"), name.second});
  }
  for (const auto& [store, account] : claims)
    _owners.emplace(store, lineNumbers.at({account, store.first}));
}

DataclassReport* StoreOwners::lineOf(const ObservedStore& store) {
  if (!store.account || store.retired) return nullptr;
  const auto owner = _owners.find({store.dataclass, *store.account});
  return owner != _owners.end() ? &_lines[owner->second] : nullptr;
}

}  // namespace host
