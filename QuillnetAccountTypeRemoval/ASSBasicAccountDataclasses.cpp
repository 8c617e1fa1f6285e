// Which dataclasses of an account are supported, provisioned and enabled.

#include <algorithm>
#include <array>
#include <set>

#include "QuillnetAccountTypeRemoval/ASSBasicAccount.h"
#include "platform/Services.h"

namespace accountsettings {

using platform::RestrictedFeature;

namespace {

// Whether a list has a string. Most lists have a handful, for which a walk is faster than a set;
// for lists of any length, which a file may hold, a walk for each string would take too long.
class Members {
 public:
  explicit Members(const StringList& strings) : _strings(strings) {
    constexpr std::size_t kHandful = 16;
    if (strings.size() > kHandful) _many.insert(strings.begin(), strings.end());
  }
  bool contain(std::string_view wanted) const {
    return _many.empty() ? contains(_strings, wanted) : _many.contains(wanted);
  }

 private:
  const StringList& _strings;
  std::set<std::string_view> _many;
};

// The members of `dataclasses` that are (not) among `others`, in order.
StringList filtered(const StringList& dataclasses, const StringList& others,
                    bool keepThoseInOthers) {
  const Members members(others);
  StringList kept;
  kept.reserve(dataclasses.size());
  for (const std::string& dataclass : dataclasses) {
    if (members.contain(dataclass) == keepThoseInOthers) kept.push_back(dataclass);
  }
  return kept;
}

}  // namespace

StringList ASSBasicAccount::_orderedDataclasses(const StringList& dataclasses) {
  const StringList& known = allSupportedDataclasses();
  StringList ordered;
  ordered.reserve(dataclasses.size());
  for (const std::string& dataclass : known) {
    if (contains(dataclasses, dataclass)) ordered.push_back(dataclass);
  }
  for (const std::string& dataclass : dataclasses) {
    if (!contains(known, dataclass)) ordered.push_back(dataclass);
  }
  return ordered;
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

StringList ASSBasicAccount::supportedDataclasses() const {
  return _orderedDataclasses(
      supportedDataclassesForAccountType(type().value_or("")).value_or(StringList()));
}

StringList ASSBasicAccount::provisionedDataclasses() const {
  const StringList supported = supportedDataclasses();
  const std::optional<StringList> granted =
      stringsOfArray(accountPropertyForKey(kAccountProvisionedDataclasses));
  const StringList within = granted ? filtered(*granted, supported, true) : supported;
  return _orderedDataclasses(filtered(within, _profileRestrictedDataclasses(), false));
}

std::optional<StringList> ASSBasicAccount::enabledDataclasses() const {
  if (parentAccount_) {
    std::optional<StringList> ofParent = parentAccount_->enabledDataclasses();
    if (ofParent && !ofParent->empty()) return ofParent;
  }
  const std::optional<StringList> stored =
      stringsOfArray(accountPropertyForKey(kAccountEnabledDataclasses));
  if (!stored) return std::nullopt;
  return _orderedDataclasses(filtered(*stored, provisionedDataclasses(), true));
}

bool ASSBasicAccount::isEnabledForDataclass(std::string_view dataclass) const {
  const std::optional<StringList> enabled = enabledDataclasses();
  return enabled && contains(*enabled, dataclass);
}

void ASSBasicAccount::setEnabledForDataclass(bool enabled, std::string_view dataclass) {
  if (contains(supportedDataclasses(), dataclass))
    _forcedSetEnabledForDataclass(enabled, dataclass);
}

void ASSBasicAccount::_forcedSetEnabledForDataclass(bool enabled, std::string_view dataclass) {
  // A set first, because a stored list may hold a dataclass twice; then in a stable order.
  const StringList stored =
      stringsOfArray(properties_.find(kAccountEnabledDataclasses)).value_or(StringList());
  std::set<std::string, std::less<>> dataclasses(stored.begin(), stored.end());
  if (enabled)
    dataclasses.emplace(dataclass);
  else if (const auto found = dataclasses.find(dataclass); found != dataclasses.end())
    dataclasses.erase(found);
  setAccountPropertyForKey(
      arrayOfStrings(_orderedDataclasses(StringList(dataclasses.begin(), dataclasses.end()))),
      kAccountEnabledDataclasses);
}

void ASSBasicAccount::setEnabledForDataclasses(const StringList& dataclasses) {
  removeAccountPropertyForKey(kAccountEnabledDataclasses);
  for (const std::string& dataclass : dataclasses) setEnabledForDataclass(true, dataclass);
}

}  // namespace accountsettings
