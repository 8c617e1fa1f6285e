#include "host/AccountComparison.h"

#include <algorithm>
#include <map>
#include <optional>
#include <string_view>
#include <unordered_map>

#include "deviceimage/ContentHash.h"
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
  // `accounts` outlives the finder.
  Finder(const std::vector<Dictionary>& accounts, const std::vector<std::string>& correctedKeys)
      : _accounts(accounts), _correctedKeys(correctedKeys) {
    for (std::size_t index = 0; index < accounts.size(); ++index)
      _byIdentifier[identifierIn(accounts[index])].indexes.push_back(index);
    _taken.resize(accounts.size());
  }

  std::optional<std::size_t> take(const Dictionary& account) {
    const std::string_view identifier = identifierIn(account);
    return identifier.empty() ? _takeFrom(_byContent()[_content(account)])
                              : _takeFrom(_byIdentifier[identifier]);
  }

  bool isTaken(std::size_t index) const { return _taken[index]; }

 private:
  struct Candidates {
    std::vector<std::size_t> indexes;
    std::size_t next = 0;
  };

  static std::string_view identifierIn(const Dictionary& account) {
    const propertylist::Text* text = propertylist::findString(account, "Identifier");
    return text != nullptr ? std::string_view(*text) : std::string_view();
  }

  std::optional<std::size_t> _takeFrom(Candidates& candidates) {
    while (candidates.next < candidates.indexes.size()) {
      const std::size_t index = candidates.indexes[candidates.next++];
      if (_taken[index]) continue;
      _taken[index] = true;
      return index;
    }
    return std::nullopt;
  }

  // Most lists have no account that is looked for like this.
  std::unordered_map<std::string, Candidates>& _byContent() {
    if (_contents.empty()) {
      for (std::size_t index = 0; index < _accounts.size(); ++index)
        _contents[_content(_accounts[index])].indexes.push_back(index);
    }
    return _contents;
  }

  // The same text for the same account, apart from what may be corrected: a hash, because many
  // accounts may share what is long. What the file form cannot hold has not come from a file.
  std::string _content(const Dictionary& account) const {
    const auto bytes = propertylist::writeBinaryPropertyList(without(account, _correctedKeys));
    if (!bytes) return {};
    return deviceimage::contentHash({reinterpret_cast<const char*>(bytes->data()), bytes->size()});
  }

  const std::vector<Dictionary>& _accounts;
  const std::vector<std::string>& _correctedKeys;
  std::unordered_map<std::string_view, Candidates> _byIdentifier;
  std::unordered_map<std::string, Candidates> _contents;
  std::vector<bool> _taken;
};

std::string nameOf(const AccountReport& account) {
  return account.type + " account " +
         (account.displayName.empty() ? account.identifier : account.displayName);
}

AccountReport reportOf(const Dictionary& account) {
  return {nameUnder(account, "Identifier"), nameUnder(account, "Type"),
          nameUnder(account, "DisplayName"), AccountOutcome::notSelected};
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
                                    nameUnder(account, "Class") + "\" is unknown.");
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
