#include "bench/Accounts.h"

#include <array>
#include <map>
#include <memory>
#include <random>
#include <stdexcept>
#include <string_view>
#include <utility>
#include <vector>

#include "propertylist/LeafText.h"
#include "propertylist/Reading.h"
#include "propertylist/Writing.h"

namespace bench {
namespace {

using propertylist::Array;
using propertylist::Bytes;
using propertylist::Date;
using propertylist::Dictionary;
using propertylist::Value;

constexpr std::uint64_t kSeed = 20261121;
constexpr std::size_t kMostKeys = 20;  // of an account

struct Kind {
  const char* type;
  const char* className;
  std::array<const char*, 4> dataclasses;
};

constexpr std::array<Kind, 8> kKinds = {{
    {"Exchange", "DAAccount", {"Mail", "Contacts", "Calendars", "Reminders"}},
    {"Mail", "IMAPAccount", {"Mail", "Notes", nullptr, nullptr}},
    {"Gmail", "GmailAccount", {"Mail", "Contacts", "Calendars", "Notes"}},
    {"CalDAV", "MobileCalDAVAccount", {"Calendars", "Reminders", nullptr, nullptr}},
    {"CardDAV", "CardDAVAccount", {"Contacts", nullptr, nullptr, nullptr}},
    {"Yahoo", "YahooAccount", {"Mail", "Contacts", "Calendars", "Reminders"}},
    {"Subscribed Calendar", "SubCalAccount", {"Calendars", nullptr, nullptr, nullptr}},
    {"Quillnet", "QuillnetAccount", {"Mail", "Contacts", "Calendars", "Bookmarks"}},
}};

constexpr std::array<const char*, 10> kNames = {"Arbeit",         "Home", "Büro",   "Éloïse",
                                                "Адресная книга", "家族", "Verein", "Łukasz",
                                                "Work",           "Ωmega"};
constexpr std::array<const char*, 4> kHosts = {"mail.example.com", "imap.post.example",
                                               "dav.example.org", "exchange.firm.example"};

// Makes one file. The engine's output is fixed by the language; the library's distributions are
// not, and are not used. No expression draws twice where the compiler may choose which comes first.
class Maker {
 public:
  Dictionary settings(std::size_t accounts) {
    std::vector<Value> made;
    made.reserve(accounts);
    for (std::size_t i = 0; i < accounts; ++i) made.emplace_back(_account(i));
    return {{"Version", 12}, {"Accounts", Array(std::move(made))}};
  }

 private:
  std::uint64_t _below(std::uint64_t limit) { return _engine() % limit; }
  bool _happens(unsigned percent) { return _below(100) < percent; }

  std::string _identifier() {
    constexpr std::string_view kDigits = "0123456789ABCDEF";
    std::string text = "00000000-0000-4000-8000-000000000000";
    for (char& c : text) {
      if (c == '0') c = kDigits[_below(16)];
    }
    return text;
  }

  Bytes _data(std::size_t size) {
    Bytes bytes(size);
    for (std::uint8_t& byte : bytes) byte = static_cast<std::uint8_t>(_engine());
    return bytes;
  }

  Date _date() { return Date{static_cast<double>(500'000'000 + _below(250'000'000))}; }

  std::string _description(const std::string& user) {
    const std::string number = std::to_string(_below(10'000));
    const char* const host = kHosts[_below(kHosts.size())];
    const char* const name = kNames[_below(kNames.size())];
    return user + " at " + host + ", room " + number + ", " + name;
  }

  static Array _dataclassesOf(const Kind& kind) {
    Array dataclasses;
    for (const char* name : kind.dataclasses) {
      if (name != nullptr) dataclasses.append("com.vantor.Dataclass." + std::string(name));
    }
    return dataclasses;
  }

  Dictionary _child(std::string_view type) {
    return {{"Identifier", _identifier()},
            {"Type", type},
            {"Class", "BasicAccount"},
            {"DisplayName", kNames[_below(kNames.size())]},
            {"Enabled Dataclasses", Array{"com.vantor.Dataclass.Calendars"}}};
  }

  // Twelve keys that every account has, then others until there are kMostKeys.
  Dictionary _account(std::size_t number) {
    const Kind& kind = kKinds[_below(kKinds.size())];
    const std::string identifier = _identifier();
    const std::string user = "user" + std::to_string(number) + "@example.com";
    const char* const host = kHosts[_below(kHosts.size())];
    std::vector<Dictionary::Entry> entries;
    const auto add = [&](std::string_view key, Value value) {
      if (entries.size() < kMostKeys) entries.emplace_back(key, std::move(value));
    };
    add("Identifier", identifier);
    add("Sync Identifier", identifier);
    add("Type", kind.type);
    add("Class", kind.className);
    add("DisplayName", kNames[_below(kNames.size())] + std::string(" ") + std::to_string(number));
    add("Username", user);
    add("Hostname", host);
    add("PortNumber", _happens(50) ? 993 : 443);
    add("SSLEnabled", _happens(90));
    add("Enabled Dataclasses", _dataclassesOf(kind));
    add("Date", _date());
    add("ASAccountGeneration", static_cast<std::int64_t>(_below(1000)));
    if (std::string_view(kind.className).ends_with("IMAPAccount"))
      add("AccountPath", "Mail/IMAP-" + user);
    if (_happens(60)) add("Type String", kind.type);
    if (_happens(60)) add("Short Type String", kind.type);
    if (_happens(40)) add("Provisioned Dataclasses", _dataclassesOf(kind));
    if (_happens(60)) add("Token", _data(32 + _below(64)));
    if (_happens(60)) add("Principal Path", "/principals/users/" + identifier + "/");
    if (_happens(40)) add("Description", _description(user));
    if (_happens(30)) add("SyncInterval", static_cast<double>(_below(64)) / 4);
    if (_happens(25)) {
      add("Options", Dictionary{{"ArchiveMessages", _happens(50)},
                                {"MaxMessages", static_cast<std::int64_t>(_below(500))},
                                {"Signature", _description("user")}});
    }
    if (_happens(15)) {
      Array children{_child("CalDAV")};
      if (_happens(40)) children.append(_child("CardDAV"));
      add("ChildAccounts", std::move(children));
    }
    return Dictionary(std::move(entries));
  }

  std::mt19937_64 _engine{kSeed};
};

void putText(std::string& json, std::string_view text) {
  json += '"';
  for (const char c : text) {
    if (c == '"' || c == '\\') json += '\\';
    json += c;
  }
  json += '"';
}

void put(std::string& json, const Value& value) {
  if (const auto* const dictionary = value.asDictionary()) {
    char separator = '{';
    for (const auto& entry : *dictionary) {
      json += separator;
      putText(json, entry.key());
      json += ':';
      put(json, entry.value());
      separator = ',';
    }
    json += dictionary->empty() ? "{}" : "}";
  } else if (const auto* const array = value.asArray()) {
    char separator = '[';
    for (const Value& member : *array) {
      json += separator;
      put(json, member);
      separator = ',';
    }
    json += array->empty() ? "[]" : "]";
  } else if (value.asBoolean()) {
    json += *value.asBoolean() ? "true" : "false";
  } else if (value.asInteger() || value.asReal()) {
    json += propertylist::describe(value);
  } else if (value.asDate()) {
    json += std::to_string(static_cast<std::int64_t>(value.asDate()->secondsSince2001));
  } else if (value.asData() != nullptr) {
    putText(json, propertylist::base64Text(*value.asData()));
  } else {
    putText(json, *value.asString());
  }
}

std::string jsonText(const Value& value) {
  std::string json;
  put(json, value);
  return json;
}

}  // namespace

Dictionary settings(std::size_t accounts) { return Maker().settings(accounts); }

const Document& document(std::size_t accounts) {
  static std::map<std::size_t, std::unique_ptr<Document>> made;
  std::unique_ptr<Document>& entry = made[accounts];
  if (entry) return *entry;
  const Value value = settings(accounts);
  const auto binary = propertylist::writeBinaryPropertyList(value);
  auto xml = propertylist::writeXMLPropertyList(value);
  // As a program has it that has read its file: what the file stores once is in memory once.
  auto read = binary ? propertylist::readBinaryPropertyList(*binary).value : std::nullopt;
  if (!xml || !read) throw std::runtime_error("the generated settings have no file form");
  entry = std::make_unique<Document>(
      Document{accounts, std::move(*read), *binary, std::move(*xml), jsonText(value)});
  return *entry;
}

}  // namespace bench
