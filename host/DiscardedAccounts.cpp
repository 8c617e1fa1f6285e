#include "host/DiscardedAccounts.h"

#include <algorithm>
#include <functional>
#include <set>
#include <utility>

#include "host/AccountComparison.h"

namespace host {
namespace {

using deviceimage::Dataclass;
using deviceimage::dataclassName;

std::string sentenceFor(const AccountReport& account, const std::string& keptCopy) {
  return "The " + account.type + " account " +
         (account.displayName.empty() ? account.identifier : account.displayName) +
         " of the settings file from before is not in the new one" +
         (keptCopy.empty() ? "." : "; " + keptCopy + " still has it.");
}

std::string sentenceFor(const ObservedStore& store) {
  const std::size_t count = store.records.size();
  return std::to_string(count) + (count == 1 ? " record of " : " records of ") +
         std::string(dataclassName(store.dataclass)) + " in the store " + *store.account +
         (count == 1 ? " belongs" : " belong") +
         " to no account of the settings file and cannot be migrated.";
}

}  // namespace

std::vector<std::string> leftByNewSettings(const Settings& before, const Settings& now,
                                           const std::string& keptCopy) {
  std::vector<std::string> sentences;
  // An account without an identifier gets one when the file is brought up to date.
  const AccountRights rights = {{"Identifier"}, {}, {}};
  const AccountComparison accounts =
      compareAccounts(before.accounts, now.accounts, Selection{}, rights);
  for (const AccountReport& account : accounts.accounts)
    if (account.outcome == AccountOutcome::dropped)
      sentences.push_back(sentenceFor(account, keptCopy));
  return sentences;
}

std::vector<std::string> recordsWithoutAccount(const Observation& now,
                                               const deviceimage::SyncAgent& agent,
                                               std::string_view prefix) {
  // A store's name counts whatever it holds. What is longer than all is none.
  std::size_t longest = 0;
  for (const ObservedStore& store : now.stores)
    longest = std::max(longest, store.account.value_or("").size());
  std::set<std::string, std::less<>> owned;
  for (const propertylist::Dictionary& account : now.settings.accounts)
    for (const Dataclass dataclass : deviceimage::kDataclasses)
      if (const auto store = agent.storeIdentifier(account, dataclass);
          store && store->size() <= longest && !owned.contains(*store))
        owned.emplace(*store);
  std::vector<std::string> sentences;
  for (const ObservedStore& store : now.stores)
    if (store.account && store.account->starts_with(prefix) && !store.retired &&
        !store.records.empty() && !owned.contains(*store.account))
      sentences.push_back(sentenceFor(store));
  return sentences;
}

}  // namespace host
