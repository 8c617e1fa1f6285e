#include "accountservices/Journals.h"

#include <string>
#include <vector>

#include "QuillnetAccountTypeRemoval/AccountChanges.h"
#include "deviceimage/DeviceImage.h"
#include "deviceimage/Journal.h"
#include "platform/Services.h"

namespace accountservices {
namespace {

using accountsettings::AccountChangeType;
using deviceimage::DeviceImage;
using deviceimage::JSONMembers;
using propertylist::Dictionary;

void logLostNote(std::string_view journal, std::string_view reason) {
  platform::logToSystem("Could not note in %@ what an account service heard: %@", journal, reason);
}

// The image is opened anew for each call, so that nothing outlives what was installed.
void append(std::string_view journal, const std::vector<JSONMembers>& lines) {
  const std::string root = platform::services().deviceInfo.systemRootDirectory();
  const deviceimage::OpenedImage opened = DeviceImage::open(root);
  if (!opened.image) {
    logLostNote(journal, opened.error);
    return;
  }
  deviceimage::Journal file(opened.image, journal);
  for (const JSONMembers& members : lines) {
    if (file.append(deviceimage::jsonLine(members))) continue;
    logLostNote(journal, "the file cannot be written");
    return;
  }
}

std::string_view nameOf(const Dictionary& change) {
  const propertylist::Value* const kind =
      change.find(accountsettings::kASChangeAccountChangeTypeKey);
  switch (static_cast<AccountChangeType>(kind == nullptr ? -1 : kind->asInteger().value_or(-1))) {
    case AccountChangeType::added:
      return "added";
    case AccountChangeType::modified:
      return "modified";
    case AccountChangeType::deleted:
      return "deleted";
  }
  return "unknown";
}

std::vector<std::string> textsOf(const propertylist::Array& array) {
  std::vector<std::string> texts;
  for (const propertylist::Value& value : array)
    if (value.asString() != nullptr) texts.push_back(*value.asString());
  return texts;
}

// A record ends at the first value that is missing; so does the line.
void addRecord(JSONMembers& members, const Dictionary& change) {
  members.emplace_back("change", nameOf(change));
  if (const auto* account =
          propertylist::findString(change, accountsettings::kASChangeAccountIdentifierKey))
    members.emplace_back("account", std::string_view(*account));
  if (const auto* type = propertylist::findString(change, accountsettings::kASChangeAccountTypeKey))
    members.emplace_back("type", std::string_view(*type));
  if (const auto* original = propertylist::findArray(
          change, accountsettings::kASChangeAccountOriginallyEnabledDataclassesKey))
    members.emplace_back("originalDataclasses", textsOf(*original));
}

}  // namespace

void journalChanges(std::string_view notifier, const propertylist::Array& changes) {
  const std::string time = deviceimage::timestamp();
  std::vector<JSONMembers> lines;
  for (const propertylist::Value& value : changes) {
    JSONMembers members = {{"time", time},
                           {"notifier", notifier},
                           {"record", static_cast<std::int64_t>(lines.size() + 1)},
                           {"of", static_cast<std::int64_t>(changes.size())}};
    addRecord(members, value.asDictionary() == nullptr ? Dictionary() : *value.asDictionary());
    lines.push_back(std::move(members));
  }
  append(DeviceImage::kAccountChangesFile, lines);
}

void journalDataclassChange(std::string_view notifier, std::string_view change,
                            std::string_view account, std::string_view dataclass) {
  append(DeviceImage::kAccountChangesFile, {{{"time", deviceimage::timestamp()},
                                             {"notifier", notifier},
                                             {"change", change},
                                             {"account", account},
                                             {"dataclass", dataclass}}});
}

void journalRefresh(const Refresh& refresh) {
  const std::string time = deviceimage::timestamp();
  JSONMembers members = {{"time", time},
                         {"service", refresh.service},
                         {"account", refresh.account},
                         {"request", refresh.request}};
  if (refresh.container) members.emplace_back("container", *refresh.container);
  members.emplace_back("dataclass", refresh.dataclass);
  members.emplace_back("userRequested", refresh.isUserRequested);
  members.emplace_back("answer", refresh.answer);
  append(DeviceImage::kRefreshesFile, {members});
}

}  // namespace accountservices
