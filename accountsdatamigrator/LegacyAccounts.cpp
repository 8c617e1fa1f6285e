#include "accountsdatamigrator/LegacyAccounts.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <set>
#include <span>
#include <string_view>
#include <utility>

#include "QuillnetAccountTypeRemoval/AccountConstants.h"
#include "platform/Services.h"
#include "propertylist/Writing.h"

namespace accountsdatamigrator {

using namespace accountsettings;
using propertylist::Array;
using propertylist::Dictionary;
using propertylist::Value;

namespace {

constexpr std::string_view kLegacyIdentifier = "UniqueIdentifier";
constexpr std::string_view kLegacyDisplayName = "AccountName";
constexpr std::string_view kLegacyDataclasses = "Dataclasses";
constexpr std::string_view kLegacyHost = "Hostname";
constexpr std::string_view kDataclassPrefix = "com.vantor.Dataclass.";

// What the account settings keep under these names is not what a legacy entry has there.
constexpr std::array<std::string_view, 8> kKeysNotTaken = {
    kLegacyIdentifier, kLegacyDisplayName, kLegacyDataclasses,      kAccountChildAccounts,
    kAccountType,      kAccountTypeString, kAccountShortTypeString, kAccountSupportedDataclasses};

struct NamedType {
  std::string_view name;
  std::string_view type;
};

constexpr std::array<NamedType, 10> kMailClasses = {{{"AOLAccount", kMailAccountType},
                                                     {"BriskIMAPAccount", kBriskIMAPAccountType},
                                                     {"GmailAccount", kGmailAccountType},
                                                     {"IMAPAccount", kMailAccountType},
                                                     {"LocalAccount", kMailAccountType},
                                                     {"POPAccount", kMailAccountType},
                                                     {"PellixAccount", kMailAccountType},
                                                     {"QuillnetAccount", kQuillnetAccountType},
                                                     {"SMTPAccount", kSMTPAccountType},
                                                     {"YahooAccount", kYahooAccountType}}};
// Providers that a plain IMAP account may be set up for by hand.
constexpr std::array<NamedType, 2> kMailHosts = {
    {{"imap.gmail.com", kGmailAccountType}, {"imap.mail.yahoo.com", kYahooAccountType}}};
constexpr std::array<NamedType, 5> kDataAccessClasses = {
    {{"CalDAVAccount", kCalDAVAccountType},
     {"CardDAVAccount", kCardDAVAccountType},
     {"ExchangeAccount", kExchangeAccountType},
     {"LDAPAccount", kLDAPAccountType},
     {"SubscribedCalendarAccount", kSubscribedCalendarAccountType}}};

// Empty for a name that is not in the table.
std::string_view typeFor(std::span<const NamedType> table, std::string_view name) {
  const auto found = std::find_if(table.begin(), table.end(),
                                  [&](const NamedType& each) { return each.name == name; });
  return found == table.end() ? std::string_view() : found->type;
}

// One of the lists that accounts are read from.
struct List {
  std::string_view name;
  std::span<const NamedType> classes;
  std::span<const NamedType> hosts;
};
constexpr List kMailList = {"MailAccounts", kMailClasses, kMailHosts};
constexpr List kOutgoingList = {"OutgoingAccounts", kMailClasses, {}};
constexpr List kDataAccessList = {"Accounts", kDataAccessClasses, {}};

// 128 bits of a digest in the form of a UUID of version 8, which is for such.
std::string identifierFrom(std::span<const std::uint8_t> bytes) {
  std::array<std::uint64_t, 2> halves = {0xCBF29CE484222325U, 0x84222325CBF29CE4U};
  for (const std::uint8_t byte : bytes)
    for (std::uint64_t& half : halves) half = (half ^ byte) * 0x100000001B3U + (half >> 47U);
  halves[0] = (halves[0] & ~std::uint64_t{0xF000}) | 0x8000U;
  halves[1] = (halves[1] & (~std::uint64_t{0} >> 2U)) | (std::uint64_t{1} << 63U);
  std::string text;
  for (const std::uint64_t half : halves)
    for (int shift = 60; shift >= 0; shift -= 4) {
      if (text.size() == 8 || text.size() == 13 || text.size() == 18 || text.size() == 23)
        text += '-';
      text += "0123456789ABCDEF"[(half >> static_cast<unsigned>(shift)) & 0xFU];
    }
  return text;
}

// Makes accounts, one after the other, with identifiers that differ.
class Builder {
 public:
  explicit Builder(const AccountTypes& types) : _types(types) {}

  // False, after a line in the log, when the file cannot be read or has no list where one must be.
  bool addFile(const std::string& path, std::span<const List> lists) {
    if (path.empty()) return true;
    const propertylist::FileReadResult read =
        platform::services().fileServices.readPropertyListFile(path);
    const Dictionary* const root = read.value ? read.value->asDictionary() : nullptr;
    if (root == nullptr) {
      platform::logToSystem("AccountMigrator: %@ cannot be read: %@", path,
                            read.value    ? std::string("it holds no dictionary")
                            : read.exists ? read.error
                                          : std::string("there is no such file"));
      return false;
    }
    return std::all_of(lists.begin(), lists.end(),
                       [&](const List& list) { return _addList(path, *root, list); });
  }

  Array accounts() && { return Array(std::move(_accounts)); }

 private:
  bool _addList(const std::string& path, const Dictionary& root, const List& list) {
    const Value* const value = root.find(list.name);
    if (value == nullptr) return true;
    const Array* const entries = value->asArray();
    if (entries == nullptr) {
      platform::logToSystem("AccountMigrator: %@: \"%@\" is no array", path, list.name);
      return false;
    }
    for (std::size_t index = 0; index < entries->size(); ++index) {
      _place = path + ": \"" + std::string(list.name) + "\"[" + std::to_string(index) + "]";
      if (const Dictionary* const entry = (*entries)[index].asDictionary())
        _addEntry(*entry, list);
      else
        _leaveOut("it is no dictionary");
    }
    return true;
  }

  void _addEntry(const Dictionary& entry, const List& list) {
    const std::string* const className = propertylist::findString(entry, kAccountClass);
    if (className == nullptr) return _leaveOut("it has no string \"Class\"");
    std::string_view type = typeFor(list.classes, *className);
    const std::string* const host = propertylist::findString(entry, kLegacyHost);
    if (type == kMailAccountType && *className == "IMAPAccount" && host != nullptr)
      if (const std::string_view ofHost = typeFor(list.hosts, *host); !ofHost.empty())
        type = ofHost;
    if (type.empty()) return _leaveOut("its class \"" + *className + "\" is not known");
    if (!_types.knows(type))
      return _leaveOut("the catalogue lacks its type \"" + std::string(type) + "\"");
    const std::string identifier = _identifierFor(entry);
    Dictionary account = entry;
    for (const std::string_view key : kKeysNotTaken) account.remove(key);
    account.set(kAccountIdentifier, identifier);
    account.set(kAccountType, type);
    const Value* const name = entry.find(kLegacyDisplayName);
    if (name != nullptr && !account.contains(kAccountDisplayName))
      account.set(kAccountDisplayName, *name);
    account.set(kAccountEnabledDataclasses, _dataclassesFor(entry, type));
    _accounts.emplace_back(std::move(account));
  }

  void _leaveOut(std::string_view why) const {
    platform::logToSystem("AccountMigrator: %@ is left out: %@", _place, why);
  }

  // The entry's own when it has one that is still free, else one that follows from its content.
  std::string _identifierFor(const Dictionary& entry) {
    for (const std::string_view key : {kAccountIdentifier, kLegacyIdentifier}) {
      const std::string* const own = propertylist::findString(entry, key);
      if (own == nullptr || own->empty()) continue;
      if (_identifiers.insert(*own).second) return *own;
      platform::logToSystem("AccountMigrator: %@ gets a new identifier: \"%@\" is taken", _place,
                            *own);
      break;
    }
    propertylist::Bytes bytes =
        propertylist::writeBinaryPropertyList(entry).value_or(propertylist::Bytes());
    for (;;) {
      std::string made = identifierFrom(bytes);
      if (_identifiers.insert(made).second) return made;
      bytes.push_back(0);  // an entry with equal content came before
    }
  }

  // Those that the entry lists and the type can have; without a list, all that the type can have.
  Array _dataclassesFor(const Dictionary& entry, std::string_view type) const {
    const Array possible = _types.dataclassesOf(type);
    const Array* const listed = propertylist::findArray(entry, kLegacyDataclasses);
    if (listed == nullptr) return possible;
    Array enabled;
    for (const Value& value : *listed) {
      const std::string* const name = value.asString();
      const std::string dataclass = name == nullptr ? std::string()
                                    : name->starts_with(kDataclassPrefix)
                                        ? *name
                                        : std::string(kDataclassPrefix) + *name;
      if (!possible.contains(dataclass))
        platform::logToSystem("AccountMigrator: %@: dataclass %@ is left out: type \"%@\" has none",
                              _place, value, type);
      else if (!enabled.contains(dataclass))
        enabled.append(dataclass);
    }
    return enabled;
  }

  const AccountTypes& _types;
  std::vector<Value> _accounts;
  std::set<std::string, std::less<>> _identifiers;
  std::string _place;  // of the entry at hand
};

}  // namespace

std::optional<Array> readLegacyAccounts(const std::string& mailAccountsFile,
                                        const std::string& dataAccessFile,
                                        const AccountTypes& types) {
  constexpr std::array<List, 2> kMailLists = {kMailList, kOutgoingList};
  constexpr std::array<List, 1> kDataAccessLists = {kDataAccessList};
  Builder builder(types);
  if (!builder.addFile(mailAccountsFile, kMailLists) ||
      !builder.addFile(dataAccessFile, kDataAccessLists))
    return std::nullopt;
  return std::move(builder).accounts();
}

}  // namespace accountsdatamigrator
