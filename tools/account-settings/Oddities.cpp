#include "tools/account-settings/Oddities.h"

#include <fmt/format.h>

#include <map>
#include <optional>
#include <utility>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "tools/account-settings/Shown.h"
#include "tools/common/DataclassNames.h"

namespace tools {

using accountsettings::AccountPtr;
using accountsettings::ASSAccountsManager;
using accountsettings::ASSBasicAccount;
using propertylist::Array;
using propertylist::Dictionary;
using propertylist::Value;

namespace {

constexpr std::string_view kAccountsKey = "Accounts";
constexpr std::string_view kVersionKey = "Version";

std::string textUnder(const Dictionary& properties, std::string_view key) {
  const propertylist::Text* const text = propertylist::findString(properties, key);
  return text != nullptr ? *text : std::string();
}

bool isKnownType(std::string_view type) {
  return ASSBasicAccount::initWithProperties({{accountsettings::kAccountType, type},
                                              {accountsettings::kAccountClass, "any"}}) != nullptr;
}

class Search {
 public:
  using Effect = Oddity::Effect;

  std::vector<Oddity> found;

  void lookAtRoot(const Dictionary& root) {
    const Value* const version = root.find(kVersionKey);
    if (version == nullptr)
      _add({}, {}, kVersionKey, "is missing; a save writes it");
    else if (*version != Value(ASSAccountsManager::currentVersion()))
      _add({}, {}, kVersionKey,
           fmt::format("is {} ({}), not {}; a save writes that", shownValue(*version),
                       kindName(*version), ASSAccountsManager::currentVersion()));
    for (const Dictionary::Entry& entry : root)
      if (entry.key() != kAccountsKey && entry.key() != kVersionKey)
        _add({}, {}, entry.key(), "is unknown at the top of the file; a save leaves it out",
             Effect::lost);
    const Value* const accounts = root.find(kAccountsKey);
    if (accounts == nullptr) return;
    if (accounts->asArray() == nullptr)
      return _add({}, {}, kAccountsKey,
                  fmt::format("is no array but of the kind {}; the library sees no account",
                              kindName(*accounts)),
                  Effect::lost);
    for (std::size_t i = 0; i < accounts->asArray()->size(); ++i)
      _lookAtAccount((*accounts->asArray())[i], fmt::format("{}[{}]", kAccountsKey, i));
  }

 private:
  void _add(const std::string& place, const std::string& identifier, std::string_view key,
            std::string text, Effect effect = Effect::none) {
    found.push_back({place, identifier, std::string(key), std::move(text), effect});
  }

  void _lookAtAccount(const Value& entry, const std::string& place) {
    const Dictionary* const properties = entry.asDictionary();
    if (properties == nullptr)
      return _add(
          place, {}, {},
          fmt::format("is no dictionary but of the kind {}; the library drops it", kindName(entry)),
          Effect::lost);
    const std::string identifier = textUnder(*properties, accountsettings::kAccountIdentifier);
    const bool isUsable = _lookAtTypeAndClass(*properties, place, identifier, Effect::lost);
    const auto store = ASSAccountsManager::initWithAccounsInfoArray(Array{entry});
    const AccountPtr account = store->count() == 1 ? store->allBasicAccounts()->front() : nullptr;
    if (isUsable) _lookAtMailClass(*properties, account, place, identifier);
    _lookAtIdentifier(*properties, account, place, true);
    if (account) _lookAtDataclasses(*account, place, identifier);
    _lookAtChildren(*properties, account, place, identifier);
  }

  void _lookAtChildren(const Dictionary& properties, const AccountPtr& parent,
                       const std::string& parentPlace, const std::string& parentIdentifier) {
    const Value* const children = properties.find(accountsettings::kAccountChildAccounts);
    if (children == nullptr) return;
    if (children->asArray() == nullptr)
      return _add(parentPlace, parentIdentifier, accountsettings::kAccountChildAccounts,
                  fmt::format("is no array but of the kind {}; the library sees no children",
                              kindName(*children)),
                  Effect::passedOver);
    for (std::size_t i = 0; i < children->asArray()->size(); ++i) {
      const Value& entry = (*children->asArray())[i];
      const std::string place =
          fmt::format("{}.{}[{}]", parentPlace, accountsettings::kAccountChildAccounts, i);
      if (const Dictionary* const child = entry.asDictionary())
        _lookAtChild(*child, parent, place);
      else
        _add(place, {}, {},
             fmt::format("is no dictionary but of the kind {}; the library ignores it",
                         kindName(entry)),
             Effect::passedOver);
    }
  }

  void _lookAtChild(const Dictionary& properties, const AccountPtr& parent,
                    const std::string& place) {
    const std::string identifier = textUnder(properties, accountsettings::kAccountIdentifier);
    const bool isUsable = _lookAtTypeAndClass(properties, place, identifier, Effect::passedOver);
    _lookAtIdentifier(properties, nullptr, place, false);
    if (properties.contains(accountsettings::kAccountChildAccounts))
      _add(place, identifier, accountsettings::kAccountChildAccounts,
           "is ignored; a child account has no children", Effect::passedOver);
    if (!isUsable || !parent) return;
    const AccountPtr child = ASSBasicAccount::initWithProperties(properties);
    child->setParentAccount(parent);
    _lookAtDataclasses(*child, place, identifier);
  }

  // False when no record can be made of the properties.
  bool _lookAtTypeAndClass(const Dictionary& properties, const std::string& place,
                           const std::string& identifier, Effect effect) {
    const std::string then =
        effect == Effect::lost ? "the library drops the account" : "the library ignores it";
    const Value* const type = properties.find(accountsettings::kAccountType);
    std::string typeProblem;
    if (type == nullptr)
      typeProblem = "is missing";
    else if (type->asString() == nullptr)
      typeProblem = fmt::format("is no string but of the kind {}", kindName(*type));
    else if (!isKnownType(*type->asString()))
      typeProblem = fmt::format("\"{}\" is unknown", shownValue(*type));
    const bool hasClass = !textUnder(properties, accountsettings::kAccountClass).empty();
    if (!typeProblem.empty())
      _add(place, identifier, accountsettings::kAccountType, typeProblem + "; " + then, effect);
    if (!hasClass)
      _add(place, identifier, accountsettings::kAccountClass,
           "is missing, empty or no string; " + then, effect);
    return typeProblem.empty() && hasClass;
  }

  void _lookAtMailClass(const Dictionary& properties, const AccountPtr& account,
                        const std::string& place, const std::string& identifier) {
    const std::string stored = textUnder(properties, accountsettings::kAccountClass);
    if (!account)
      _add(
          place, identifier, accountsettings::kAccountClass,
          fmt::format("\"{}\" is unknown to the mail engine, and \"AccountPath\" implies no other; "
                      "the library drops the account",
                      stored),
          Effect::lost);
    else if (const auto taken = account->accountClass(); taken != stored)
      _add(place, identifier, accountsettings::kAccountClass,
           fmt::format("\"{}\" is unknown to the mail engine; the library takes \"{}\" instead",
                       stored, taken.value_or("")));
  }

  // `account` is null for a child, and for what makes no account.
  void _lookAtIdentifier(const Dictionary& properties, const AccountPtr& account,
                         const std::string& place, bool isTopLevel) {
    const Value* const stored = properties.find(accountsettings::kAccountIdentifier);
    std::optional<std::string> identifier;
    if (stored != nullptr && stored->asString() != nullptr) identifier = *stored->asString();
    if (account && account->type() == accountsettings::kOnMyDeviceAccountType)
      identifier = account->identifier();  // whatever is stored
    const std::string then =
        isTopLevel ? "the library makes one up at every reading" : "the library ignores the child";
    if (!identifier)
      return _add(
          place, {}, accountsettings::kAccountIdentifier,
          (stored == nullptr ? "is missing"
                             : fmt::format("is no string but of the kind {}", kindName(*stored))) +
              "; " + then,
          isTopLevel ? Effect::none : Effect::passedOver);
    if (identifier->empty()) _add(place, {}, accountsettings::kAccountIdentifier, "is empty");
    const auto [first, isNew] = _places.try_emplace(*identifier, place, isTopLevel);
    if (isNew) return;
    _add(place, *identifier, accountsettings::kAccountIdentifier,
         "is that of " + first->second.first + " too",
         isTopLevel && first->second.second ? Effect::lost : Effect::passedOver);
  }

  void _lookAtDataclasses(const ASSBasicAccount& account, const std::string& place,
                          const std::string& identifier) {
    const std::string_view key = accountsettings::kAccountEnabledDataclasses;
    const Value* const enabled = account.properties().find(key);
    if (enabled == nullptr) return;
    if (enabled->asArray() == nullptr)
      return _add(place, identifier, key,
                  fmt::format("is no array but of the kind {}", kindName(*enabled)));
    const accountsettings::StringList supported = account.supportedDataclasses();
    for (const Value& dataclass : *enabled->asArray()) {
      if (dataclass.asString() == nullptr)
        _add(place, identifier, key,
             fmt::format("holds a value of the kind {}", kindName(dataclass)));
      else if (!accountsettings::contains(supported, *dataclass.asString()))
        _add(place, identifier, key,
             fmt::format("names {}, which the type \"{}\" does not support",
                         shownDataclass(*dataclass.asString()), account.type().value_or("")));
    }
  }

  // Where an identifier stands first, and whether a top-level account has it there.
  std::map<std::string, std::pair<std::string, bool>> _places;
};

}  // namespace

std::string describe(const Oddity& oddity) {
  std::string text = oddity.place;
  if (!oddity.identifier.empty())
    text += fmt::format(" ({})", shownValue(Value(oddity.identifier)));
  for (const std::string& part : {shownValue(Value(oddity.key)), oddity.text})
    if (!part.empty()) text += (text.empty() ? "" : ": ") + part;
  return text;
}

std::vector<Oddity> findOddities(const Dictionary& root) {
  Search search;
  search.lookAtRoot(root);
  return std::move(search.found);
}

}  // namespace tools
