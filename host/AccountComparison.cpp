#include "host/AccountComparison.h"

#include <algorithm>
#include <map>
#include <optional>
#include <string_view>
#include <unordered_map>

#include "deviceimage/KeyedHash.h"
#include "host/AccountContents.h"

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
  // Both outlive the finder, and so does what is taken.
  Finder(const std::vector<Dictionary>& accounts, const std::vector<std::string>& correctedKeys)
      : _accounts(accounts), _contents(correctedKeys) {
    for (std::size_t index = 0; index < accounts.size(); ++index)
      _candidatesOf(identifierIn(accounts[index])).indexes.push_back(index);
    _taken.resize(accounts.size());
  }

  std::optional<std::size_t> take(const Dictionary& account) {
    const std::string_view identifier = identifierIn(account);
    return identifier.empty() ? _takeFrom(_byContent()[_contents.of(account)])
                              : _takeFrom(_candidatesOf(identifier));
  }

  bool isTaken(std::size_t index) const { return _taken[index]; }

 private:
  struct Candidates {
    std::vector<std::size_t> indexes;
    std::size_t next = 0;
  };
  using CandidatesByContent = std::unordered_map<std::string, Candidates, deviceimage::KeyedHash>;

  static std::string_view identifierIn(const Dictionary& account) {
    const propertylist::Text* text = propertylist::findString(account, "Identifier");
    return text != nullptr ? std::string_view(*text) : std::string_view();
  }

  // A small file may give one long identifier to very many accounts: it is looked at once.
  Candidates& _candidatesOf(std::string_view identifier) {
    constexpr std::size_t kShort = 64;
    if (identifier.size() <= kShort) return _byIdentifier[identifier];
    Candidates*& known = _byPlace[identifier.data()];
    if (known == nullptr) known = &_byIdentifier[identifier];
    return *known;
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
  CandidatesByContent& _byContent() {
    if (_ofContents.empty()) {
      for (std::size_t index = 0; index < _accounts.size(); ++index)
        _ofContents[_contents.of(_accounts[index])].indexes.push_back(index);
    }
    return _ofContents;
  }

  const std::vector<Dictionary>& _accounts;
  AccountContents _contents;  // apart from what may be corrected
  std::unordered_map<std::string_view, Candidates, deviceimage::KeyedHash> _byIdentifier;
  std::unordered_map<const char*, Candidates*> _byPlace;  // those of long identifiers
  CandidatesByContent _ofContents;
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
  std::map<std::string_view, std::size_t> counts;
  for (const std::string& type : rights.mayBeAdded)
    counts[type] = static_cast<std::size_t>(
        std::count_if(after.begin(), after.end(),
                      [&](const Dictionary& account) { return typeOf(account) == type; }));
  for (std::size_t index = 0; index < after.size(); ++index) {
    if (finder.isTaken(index)) continue;
    const AccountReport report = reportOf(after[index]);
    const auto count = counts.find(report.type);
    if (count == counts.end() || count->second != 1)
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

// Which accounts are not the same as what was found of them. All are compared at once; only where
// there is a difference by their contents, which takes longer but looks once at what they share.
std::vector<bool> changedAccounts(const std::vector<Dictionary>& before,
                                  const std::vector<Dictionary>& after,
                                  const std::vector<std::optional<std::size_t>>& found,
                                  const std::vector<std::string>& correctedKeys) {
  std::vector<bool> changed(before.size());
  std::vector<propertylist::Value> expected;
  std::vector<propertylist::Value> present;
  for (std::size_t index = 0; index < before.size(); ++index) {
    expected.emplace_back(found[index] ? without(before[index], correctedKeys) : Dictionary());
    present.emplace_back(found[index] ? without(after[*found[index]], correctedKeys)
                                      : Dictionary());
  }
  if (propertylist::Array(expected) == propertylist::Array(present)) return changed;
  AccountContents contents(correctedKeys);
  for (std::size_t index = 0; index < before.size(); ++index) {
    if (!found[index]) continue;
    const std::string content = contents.of(before[index]);
    changed[index] = content != contents.of(after[*found[index]]) ||
                     (content == AccountContents::kNone && expected[index] != present[index]);
  }
  return changed;
}

}  // namespace

AccountComparison compareAccounts(const std::vector<Dictionary>& before,
                                  const std::vector<Dictionary>& after, const Selection& selection,
                                  const AccountRights& rights) {
  AccountComparison comparison;
  Finder finder(after, rights.correctedKeys);
  std::vector<std::optional<std::size_t>> found;  // of each account before
  found.reserve(before.size());
  for (const Dictionary& account : before) found.push_back(finder.take(account));
  const std::vector<bool> changed = changedAccounts(before, after, found, rights.correctedKeys);
  std::optional<std::size_t> last;
  SelectedAccounts selected(selection);
  for (std::size_t index = 0; index < before.size(); ++index) {
    const Dictionary& account = before[index];
    const std::optional<std::size_t> place = found[index];
    AccountReport report = reportOf(account);
    if (selected.cover(account)) {
      report.outcome = place ? AccountOutcome::kept : AccountOutcome::retired;
      if (place) comparison.leftBehind.push_back("The " + nameOf(report) + " is still there.");
    } else if (!place) {
      report.outcome = AccountOutcome::dropped;
      noteGoneAccount(account, report, rights, comparison);
    } else {
      if (changed[index])
        comparison.contradictions.push_back("The " + nameOf(report) +
                                            " was not to be retired and has changed.");
      if (last && *place < *last)
        comparison.contradictions.push_back("The " + nameOf(report) + " has lost its place.");
      last = place;
    }
    comparison.accounts.push_back(std::move(report));
  }
  checkAddedAccounts(after, finder, rights, comparison);
  return comparison;
}

}  // namespace host
