#include "host/AccountComparison.h"

#include <algorithm>
#include <deque>
#include <map>
#include <optional>
#include <unordered_map>

#include "propertylist/Writing.h"

namespace host {
namespace {

using propertylist::Dictionary;

Dictionary without(Dictionary account, const std::vector<std::string>& keys) {
  for (const std::string& key : keys) account.remove(key);
  return account;
}

// Finds the accounts of one list in another, each at most once.
class Finder {
 public:
  Finder(const std::vector<Dictionary>& accounts, const std::vector<std::string>& correctedKeys)
      : _correctedKeys(correctedKeys) {
    for (std::size_t index = 0; index < accounts.size(); ++index) {
      _byIdentifier[identifierOf(accounts[index])].push_back(index);
      _byContent[_content(accounts[index])].push_back(index);
    }
    _taken.resize(accounts.size());
  }

  std::optional<std::size_t> take(const Dictionary& account) {
    const std::string identifier = identifierOf(account);
    auto& indexes = identifier.empty() ? _byContent[_content(account)] : _byIdentifier[identifier];
    while (!indexes.empty()) {
      const std::size_t index = indexes.front();
      indexes.pop_front();
      if (_taken[index]) continue;
      _taken[index] = true;
      return index;
    }
    return std::nullopt;
  }

  bool isTaken(std::size_t index) const { return _taken[index]; }

 private:
  // The same bytes for the same account, apart from what may be corrected. What the file form
  // cannot hold has not come from a file.
  std::string _content(const Dictionary& account) const {
    const auto bytes = propertylist::writeBinaryPropertyList(without(account, _correctedKeys));
    return bytes ? std::string(bytes->begin(), bytes->end()) : std::string();
  }

  const std::vector<std::string>& _correctedKeys;
  std::unordered_map<std::string, std::deque<std::size_t>> _byIdentifier;
  std::unordered_map<std::string, std::deque<std::size_t>> _byContent;
  std::vector<bool> _taken;
};

std::string nameOf(const AccountReport& account) {
  return account.type + " account " +
         (account.displayName.empty() ? account.identifier : account.displayName);
}

AccountReport reportOf(const Dictionary& account) {
  return {identifierOf(account), typeOf(account), textUnder(account, "DisplayName"),
          AccountOutcome::notSelected};
}

// Accounts of `after` that `finder` has not found to be one of before.
void checkAddedAccounts(const std::vector<Dictionary>& after, const Finder& finder,
                        const AccountRights& rights, AccountComparison& comparison) {
  std::map<std::string, std::size_t> counts;  // by type
  for (const Dictionary& account : after) ++counts[typeOf(account)];
  for (std::size_t index = 0; index < after.size(); ++index) {
    if (finder.isTaken(index)) continue;
    const AccountReport report = reportOf(after[index]);
    const bool mayCome =
        counts[report.type] == 1 && std::find(rights.mayBeAdded.begin(), rights.mayBeAdded.end(),
                                              report.type) != rights.mayBeAdded.end();
    if (!mayCome)
      comparison.contradictions.push_back("The " + nameOf(report) + " was not there before.");
  }
}

void noteGoneAccount(const Dictionary& account, const AccountReport& report,
                     const AccountRights& rights, AccountComparison& comparison) {
  const bool mayGo =
      std::any_of(rights.mayBeDropped.begin(), rights.mayBeDropped.end(),
                  [&](const UnkeepableAccounts& unkeepable) { return unkeepable.covers(account); });
  if (mayGo)
    comparison.leftBehind.push_back("The " + nameOf(report) +
                                    " is gone from the settings file: its class \"" +
                                    textUnder(account, "Class") + "\" is unknown.");
  else
    comparison.contradictions.push_back(
        "The " + nameOf(report) + " was not to be retired and is gone from the settings file.");
}

}  // namespace

AccountComparison compareAccounts(const std::vector<Dictionary>& before,
                                  const std::vector<Dictionary>& after, const Selection& selection,
                                  const AccountRights& rights) {
  AccountComparison comparison;
  Finder finder(after, rights.correctedKeys);
  std::optional<std::size_t> last;
  for (const Dictionary& account : before) {
    AccountReport report = reportOf(account);
    const std::optional<std::size_t> found = finder.take(account);
    if (selection.covers(account)) {
      report.outcome = found ? AccountOutcome::kept : AccountOutcome::retired;
      if (found) comparison.leftBehind.push_back("The " + nameOf(report) + " is still there.");
    } else if (!found) {
      report.outcome = AccountOutcome::dropped;
      noteGoneAccount(account, report, rights, comparison);
    } else {
      if (without(account, rights.correctedKeys) != without(after[*found], rights.correctedKeys))
        comparison.contradictions.push_back("The " + nameOf(report) +
                                            " was not to be retired and has changed.");
      if (last && *found < *last)
        comparison.contradictions.push_back("The " + nameOf(report) + " has lost its place.");
      last = found;
    }
    comparison.accounts.push_back(std::move(report));
  }
  checkAddedAccounts(after, finder, rights, comparison);
  return comparison;
}

}  // namespace host
