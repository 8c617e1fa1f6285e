#include "tools/account-settings/Differences.h"

#include <fmt/format.h>

#include <map>

#include "QuillnetAccountTypeRemoval/AccountConstants.h"
#include "tools/account-settings/Shown.h"

namespace tools {

using propertylist::Dictionary;
using propertylist::Value;

namespace {

struct Accounts {
  std::vector<std::string> order;  // of the identifiers, as in the file
  std::map<std::string, Dictionary> byIdentifier;
};

std::optional<Value> valueOf(const Dictionary& properties, std::string_view key) {
  const Value* const value = properties.find(key);
  return value != nullptr ? std::optional(*value) : std::nullopt;
}

std::vector<Dictionary> childrenOf(const Dictionary& properties) {
  std::vector<Dictionary> children;
  const auto* const values =
      propertylist::findArray(properties, accountsettings::kAccountChildAccounts);
  if (values == nullptr) return children;
  for (const Value& value : *values)
    if (value.asDictionary() != nullptr) children.push_back(*value.asDictionary());
  return children;
}

Accounts accountsOf(const std::vector<Dictionary>& dictionaries) {
  Accounts accounts;
  for (const Dictionary& account : dictionaries) {
    const propertylist::Text* const stored =
        propertylist::findString(account, accountsettings::kAccountIdentifier);
    const std::string identifier = stored != nullptr ? *stored : std::string();
    if (accounts.byIdentifier.insert_or_assign(identifier, account).second)
      accounts.order.push_back(identifier);
  }
  return accounts;
}

class Comparison {
 public:
  std::vector<Difference> differences;

  void compareAccounts(const Accounts& before, const Accounts& after, const std::string& parent) {
    for (const std::string& identifier : before.order)
      if (!after.byIdentifier.contains(identifier))
        differences.push_back({Difference::Kind::deleted,
                               identifier,
                               parent,
                               {},
                               before.byIdentifier.at(identifier),
                               std::nullopt});
    for (const std::string& identifier : after.order) {
      const Dictionary& properties = after.byIdentifier.at(identifier);
      const auto old = before.byIdentifier.find(identifier);
      if (old == before.byIdentifier.end())
        differences.push_back(
            {Difference::Kind::added, identifier, parent, {}, std::nullopt, properties});
      else
        _compareProperties(old->second, properties, identifier, parent);
    }
  }

 private:
  void _compareProperties(const Dictionary& before, const Dictionary& after,
                          const std::string& identifier, const std::string& parent) {
    if (before == after) return;
    Dictionary all = before;
    for (const Dictionary::Entry& entry : after) all.set(entry.key(), entry.value());
    for (const Dictionary::Entry& entry : all) {
      const auto old = valueOf(before, entry.key());
      const auto now = valueOf(after, entry.key());
      if (old == now) continue;
      if (entry.key() == accountsettings::kAccountChildAccounts)
        compareAccounts(accountsOf(childrenOf(before)), accountsOf(childrenOf(after)), identifier);
      else
        differences.push_back(
            {Difference::Kind::modified, identifier, parent, entry.key(), old, now});
    }
  }
};

std::string typeOf(const std::optional<Value>& properties) {
  const propertylist::Text* const type =
      propertylist::findString(*properties->asDictionary(), accountsettings::kAccountType);
  return type != nullptr ? *type : std::string();
}

const char* nameOf(Difference::Kind kind) {
  return kind == Difference::Kind::added     ? "added"
         : kind == Difference::Kind::deleted ? "deleted"
                                             : "modified";
}

// A string stands between quotes, so that it is told from a number.
std::string quoted(const Value& value) {
  return value.asString() != nullptr ? '"' + shownValue(value) + '"' : shownValue(value);
}

}  // namespace

std::vector<Difference> differencesBetween(const std::vector<Dictionary>& before,
                                           const std::vector<Dictionary>& after) {
  Comparison comparison;
  comparison.compareAccounts(accountsOf(before), accountsOf(after), {});
  return std::move(comparison.differences);
}

std::string describe(const Difference& difference) {
  const std::string account =
      difference.parent.empty() ? difference.account : difference.parent + "/" + difference.account;
  switch (difference.kind) {
    case Difference::Kind::added:
      return fmt::format("{}: added, of type {}", account, typeOf(difference.after));
    case Difference::Kind::deleted: {
      const std::size_t children = childrenOf(*difference.before->asDictionary()).size();
      return fmt::format("{}: deleted{}", account,
                         children == 0 ? "" : fmt::format(", with {} child accounts", children));
    }
    case Difference::Kind::modified:
      break;
  }
  if (!difference.after)
    return fmt::format("{}: {}: {} removed", account, difference.key, quoted(*difference.before));
  if (!difference.before)
    return fmt::format("{}: {}: {} added", account, difference.key, quoted(*difference.after));
  return fmt::format("{}: {}: {} -> {}", account, difference.key, quoted(*difference.before),
                     quoted(*difference.after));
}

nlohmann::json jsonOf(const Difference& difference) {
  nlohmann::json json;
  json["account"] = difference.account;
  json["parent"] = orNull(difference.parent);
  json["change"] = nameOf(difference.kind);
  json["key"] = orNull(difference.key);
  if (difference.before) json["before"] = jsonFormOf(*difference.before);
  if (difference.after) json["after"] = jsonFormOf(*difference.after);
  return json;
}

}  // namespace tools
