#include "accountsdatamigrator/LegacyAccounts.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <span>
#include <string_view>
#include <utility>

#include "QuillnetAccountTypeRemoval/AccountConstants.h"
#include "accountsdatamigrator/LegacyIdentifiers.h"
#include "platform/Services.h"

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
constexpr std::size_t kLongestDataclass = 256;

// What the account settings keep under these names is not what a legacy entry has there.
constexpr std::array<std::string_view, 9> kKeysNotTaken = {
    kLegacyIdentifier,     kLegacyDisplayName,           kLegacyDataclasses,
    kAccountType,          kAccountTypeString,           kAccountShortTypeString,
    kAccountChildAccounts, kAccountSupportedDataclasses, kAccountEnabledDataclasses};

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

// A dataclass by its short or its whole name; empty for a name that is longer than any.
std::string wholeDataclass(std::string_view name) {
  if (name.size() > kLongestDataclass) return {};
  const std::string whole(name);
  return name.starts_with(kDataclassPrefix) ? whole : std::string(kDataclassPrefix) + whole;
}

// The lines about one file's entries. A file can have very many that are wrong in one way, and its
// size says little of how many, since entries may be shared: after kMaximum lines there is but one
// more, with their number.
class Remarks {
 public:
  Remarks(const std::string& path, std::string_view list) : _path(path), _list(list) {}
  Remarks(const Remarks&) = delete;
  Remarks& operator=(const Remarks&) = delete;
  ~Remarks() {
    if (_count > kMaximum)
      platform::logToSystem("AccountMigrator: %@: \"%@\": and %ld more of such lines", _path, _list,
                            _count - kMaximum);
  }

  // `what` is a format for `arguments`, what is said of the entry at hand.
  template <typename... Arguments>
  void add(std::string_view what, const Arguments&... arguments) {
    if (++_count > kMaximum) return;
    platform::logToSystem("AccountMigrator: %@: \"%@\"[%ld]" + std::string(what), _path, _list,
                          entry, arguments...);
  }

  std::int64_t entry = 0;  // the index of the entry at hand

 private:
  static constexpr std::int64_t kMaximum = 100;
  const std::string& _path;
  std::string_view _list;
  std::int64_t _count = 0;
};

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
    Remarks remarks(path, list.name);
    for (const Value& each : *entries) {
      if (const Dictionary* const entry = each.asDictionary())
        _addEntry(*entry, list, remarks);
      else
        remarks.add(" is left out: it is no dictionary");
      ++remarks.entry;
    }
    return true;
  }

  void _addEntry(const Dictionary& entry, const List& list, Remarks& remarks) {
    const propertylist::Text* const className = propertylist::findString(entry, kAccountClass);
    if (className == nullptr) return remarks.add(" is left out: it has no string \"Class\"");
    std::string_view type = typeFor(list.classes, *className);
    const propertylist::Text* const host = propertylist::findString(entry, kLegacyHost);
    if (type == kMailAccountType && *className == "IMAPAccount" && host != nullptr)
      if (const std::string_view ofHost = typeFor(list.hosts, *host); !ofHost.empty())
        type = ofHost;
    if (type.empty()) return remarks.add(" is left out: its class \"%@\" is not known", *className);
    if (!_types.knows(type))
      return remarks.add(" is left out: the catalogue lacks its type \"%@\"", type);
    const std::string identifier = _identifierFor(entry, remarks);
    Dictionary account = entry;
    for (const std::string_view key : kKeysNotTaken) account.remove(key);
    account.set(kAccountIdentifier, identifier);
    account.set(kAccountType, type);
    const Value* const name = entry.find(kLegacyDisplayName);
    if (name != nullptr && !account.contains(kAccountDisplayName))
      account.set(kAccountDisplayName, *name);
    account.set(kAccountEnabledDataclasses, _dataclassesFor(entry, type, remarks));
    _accounts.emplace_back(std::move(account));
  }

  // The entry's own when it has one that is still free, else one that follows from its content.
  std::string _identifierFor(const Dictionary& entry, Remarks& remarks) {
    for (const std::string_view key : {kAccountIdentifier, kLegacyIdentifier}) {
      const Value* const value = entry.find(key);
      if (value == nullptr) continue;
      const propertylist::Text* const own = value->asString();
      if (own != nullptr && !own->empty() && _identifiers.take(*own)) return *own;
      if (own != nullptr && !own->empty()) {
        remarks.add(" gets a new identifier: \"%@\" is taken", *own);
        break;
      }
      remarks.add(" has no use for its \"%@\": it is no text", key);
    }
    return _identifiers.make(entry);
  }

  // Those that the entry lists and the type can have; without a list, all that the type can have.
  Array _dataclassesFor(const Dictionary& entry, std::string_view type, Remarks& remarks) const {
    const Array possible = _types.dataclassesOf(type);
    const Value* const given = entry.find(kLegacyDataclasses);
    if (given == nullptr) return possible;
    const Array* const listed = given->asArray();
    if (listed == nullptr) {
      remarks.add(" has no dataclass enabled: its \"%@\" is no array", kLegacyDataclasses);
      return {};
    }
    Array enabled;
    for (const Value& value : *listed) {
      const propertylist::Text* const name = value.asString();
      const std::string dataclass = name == nullptr ? std::string() : wholeDataclass(*name);
      if (!possible.contains(dataclass))
        remarks.add(": dataclass %@ is left out: type \"%@\" has none", value, type);
      else if (!enabled.contains(dataclass))
        enabled.append(dataclass);
    }
    return enabled;
  }

  const AccountTypes& _types;
  std::vector<Value> _accounts;
  LegacyIdentifiers _identifiers;
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
