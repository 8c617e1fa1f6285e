#include "tools/device-image/AccountTypes.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>

#include "tools/device-image/Settings.h"

namespace tools {
namespace {

struct AccountType {
  std::string_view name;
  std::string_view defaultClass;
};

constexpr std::array<AccountType, 15> kTypes = {
    {{"Quillnet", "QuillnetAccount"},
     {"VantorAccount", "VantorAccount"},
     {"Mail", "IMAPAccount"},
     {"Gmail", "GmailAccount"},
     {"Yahoo", "YahooAccount"},
     {"Exchange", "ExchangeAccount"},
     {"CalDAV", "MobileCalDAVAccount"},
     {"CardDAV", "CardDAVAccount"},
     {"BookmarkDAV", "BookmarkDAVAccount"},
     {"LDAP", "LDAPAccount"},
     {"Subscribed Calendar", "SubscribedCalendarAccount"},
     {"IMAPNotes", "IMAPNotesAccount"},
     {"SMTP", "SMTPAccount"},
     {"BriskIMAP", "BriskIMAPAccount"},
     {"OnMyDevice", "ASSDeviceLocalAccount"}}};

constexpr std::array<std::string_view, 8> kMailClasses = {
    "PellixAccount", "QuillnetAccount", "POPAccount",   "IMAPAccount",
    "AOLAccount",    "LocalAccount",    "GmailAccount", "YahooAccount"};

// What a storage path holds that tells its mail engine.
constexpr std::array<std::string_view, 8> kMailPaths = {"Mail/Dorn-",
                                                        "Mail/Quillnet-",
                                                        "Mail/AOL-",
                                                        "Mail/Mailboxes",
                                                        "gmail.com@imap.gmail.com",
                                                        "imap.mail.yahoo.com",
                                                        "Mail/POP-",
                                                        "Mail/IMAP-"};

}  // namespace

std::optional<std::string_view> defaultClassOfType(std::string_view type) {
  for (const AccountType& known : kTypes)
    if (known.name == type) return known.defaultClass;
  return std::nullopt;
}

std::string knownTypes() {
  std::string names;
  for (const AccountType& known : kTypes)
    names.append(names.empty() ? "" : ", ").append(known.name);
  return names;
}

std::optional<std::string> mailClassProblem(const propertylist::Dictionary& account) {
  const std::string type = stringOrEmpty(account, kTypeKey);
  const std::string accountClass = stringOrEmpty(account, kClassKey);
  if (type != "Mail" && type != "Quillnet") return std::nullopt;
  if (std::count(kMailClasses.begin(), kMailClasses.end(), accountClass) != 0) return std::nullopt;
  const std::string path = stringOrEmpty(account, kAccountPathKey);
  const bool pathTells = std::any_of(
      kMailPaths.begin(), kMailPaths.end(),
      [&](std::string_view fragment) { return path.find(fragment) != std::string::npos; });
  if (pathTells) return std::nullopt;
  return fmt::format(
      "the device knows no mail class \"{}\" and would drop the account; give --class one of {}, "
      "or "
      "--property AccountPath=... with a path like Mail/IMAP-name",
      accountClass, fmt::join(kMailClasses, ", "));
}

}  // namespace tools
