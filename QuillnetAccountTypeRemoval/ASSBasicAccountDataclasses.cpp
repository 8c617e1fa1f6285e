// Which dataclasses of an account are supported, provisioned and enabled.

#include <algorithm>
#include <array>

#include "QuillnetAccountTypeRemoval/ASSBasicAccount.h"
#include "platform/Services.h"

namespace accountsettings {

using platform::RestrictedFeature;

namespace {

// Whether a list has a string. Most lists have a handful, for which a walk is faster than a set;
// for lists of any length, which a file may hold, a walk for each string would take too long.
class Members {
 public:
  explicit Members(const NameList& names) : _names(names) {
    constexpr std::size_t kHandful = 16;
    if (names.size() > kHandful) _many.insert(names.begin(), names.end());
  }
  bool contain(std::string_view wanted) const {
    return _many.empty() ? contains(_names, wanted) : _many.contains(wanted);
  }

 private:
  const NameList& _names;
  NameSet _many;
};

// The members of `dataclasses` that are (not) among `others`, in order.
NameList filtered(const NameList& dataclasses, const NameList& others, bool keepThoseInOthers) {
  const Members members(others);
  NameList kept;
  kept.reserve(dataclasses.size());
  for (const std::string_view dataclass : dataclasses) {
    if (members.contain(dataclass) == keepThoseInOthers) kept.push_back(dataclass);
  }
  return kept;
}

NameList namesOf(const StringList& strings) { return {strings.begin(), strings.end()}; }

}  // namespace

NameList ASSBasicAccount::_orderedNames(const NameList& names) {
  const StringList& known = allSupportedDataclasses();
  NameList ordered;
  ordered.reserve(names.size());
  for (const std::string& dataclass : known) {
    if (contains(names, dataclass)) ordered.push_back(dataclass);
  }
  for (const std::string_view dataclass : names) {
    if (!contains(known, dataclass)) ordered.push_back(dataclass);
  }
  return ordered;
}

StringList ASSBasicAccount::_orderedDataclasses(const StringList& dataclasses) {
  return copiesOf(_orderedNames(namesOf(dataclasses)));
}

StringList ASSBasicAccount::_profileRestrictedDataclasses() {
  struct Restriction {
    RestrictedFeature feature;
    std::array<std::string_view, 2> withheld;
  };
  static constexpr std::array<Restriction, 5> kRestrictions = {{
      {RestrictedFeature::cloudDocumentSync,
       {kAccountDataclassUbiquity, kAccountDataclassKeyValue}},
      {RestrictedFeature::photoStream, {kAccountDataclassMediaStream}},
      {RestrictedFeature::sharedPhotoStreams, {kAccountDataclassSharedStreams}},
      {RestrictedFeature::cloudBackup, {kAccountDataclassBackup}},
      {RestrictedFeature::cardsWhileLocked, {kAccountDataclassShoebox}},
  }};
  StringList restricted;
  for (const Restriction& restriction : kRestrictions) {
    const int state = platform::services().restrictions.featureRestriction(restriction.feature);
    if (state != platform::RestrictionsService::kExplicitlyForbidden) continue;
    for (const std::string_view dataclass : restriction.withheld) {
      if (!dataclass.empty()) restricted.emplace_back(dataclass);
    }
  }
  return restricted;
}

NameList ASSBasicAccount::_supportedNames() const {
  return _orderedNames(_namesSupportedForAccountType(type().value_or("")).value_or(NameList()));
}

NameList ASSBasicAccount::_provisionedNames() const {
  const NameList supported = _supportedNames();
  const std::optional<NameList> granted =
      namesOfArray(accountPropertyForKey(kAccountProvisionedDataclasses));
  const NameList within = granted ? filtered(*granted, supported, true) : supported;
  const StringList restricted = _profileRestrictedDataclasses();
  return _orderedNames(filtered(within, namesOf(restricted), false));
}

std::optional<NameList> ASSBasicAccount::_enabledNames() const {
  if (parentAccount_) {
    std::optional<NameList> ofParent = parentAccount_->_enabledNames();
    if (ofParent && !ofParent->empty()) return ofParent;
  }
  const std::optional<NameList> stored =
      namesOfArray(accountPropertyForKey(kAccountEnabledDataclasses));
  if (!stored) return std::nullopt;
  return _orderedNames(filtered(*stored, _provisionedNames(), true));
}

void ASSBasicAccount::_askForEnabledNames() const {
  if (parentAccount_) {
    _enabledNames();
    return;
  }
  const propertylist::Value* const stored = properties_.find(kAccountEnabledDataclasses);
  if (stored != nullptr && stored->asArray() != nullptr) _profileRestrictedDataclasses();
}

StringList ASSBasicAccount::supportedDataclasses() const { return copiesOf(_supportedNames()); }

StringList ASSBasicAccount::provisionedDataclasses() const { return copiesOf(_provisionedNames()); }

std::optional<StringList> ASSBasicAccount::enabledDataclasses() const {
  const std::optional<NameList> names = _enabledNames();
  return names ? std::optional(copiesOf(*names)) : std::nullopt;
}

bool ASSBasicAccount::isEnabledForDataclass(std::string_view dataclass) const {
  const std::optional<NameList> enabled = _enabledNames();
  return enabled && contains(*enabled, dataclass);
}

void ASSBasicAccount::setEnabledForDataclass(bool enabled, std::string_view dataclass) {
  if (contains(_supportedNames(), dataclass)) _forcedSetEnabledForDataclass(enabled, dataclass);
}

void ASSBasicAccount::_forcedSetEnabledForDataclass(bool enabled, std::string_view dataclass) {
  // A set first, because a stored list may hold a dataclass twice; then in a stable order.
  const NameList stored =
      namesOfArray(properties_.find(kAccountEnabledDataclasses)).value_or(NameList());
  NameSet dataclasses(stored.begin(), stored.end());
  if (enabled)
    dataclasses.insert(dataclass);
  else
    dataclasses.erase(dataclass);
  setAccountPropertyForKey(
      arrayOfStrings(copiesOf(_orderedNames(NameList(dataclasses.begin(), dataclasses.end())))),
      kAccountEnabledDataclasses);
}

void ASSBasicAccount::setEnabledForDataclasses(const StringList& dataclasses) {
  removeAccountPropertyForKey(kAccountEnabledDataclasses);
  for (const std::string& dataclass : dataclasses) setEnabledForDataclass(true, dataclass);
}

}  // namespace accountsettings
