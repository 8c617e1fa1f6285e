#include "tools/common/DataclassNames.h"

#include <fmt/format.h>

#include "deviceimage/Dataclass.h"
#include "tools/common/ExitCode.h"
#include "tools/common/Text.h"

namespace tools {
namespace {

constexpr std::string_view kPrefix = "com.vantor.Dataclass.";

}  // namespace

std::string dataclassIdentifierOf(const std::string& name) {
  if (const auto dataclass = deviceimage::dataclassNamed(name))
    return std::string(deviceimage::dataclassIdentifier(*dataclass));
  if (name.starts_with(kPrefix) && name.size() > kPrefix.size() && isText(name)) return name;
  throw CommandFailure(
      ExitCode::wrongUsage,
      fmt::format("there is no dataclass \"{}\"; give mail, contacts, calendars, reminders, "
                  "bookmarks, notes or a whole identifier such as {}Backup",
                  name, kPrefix));
}

std::string shownDataclass(const std::string& identifier) {
  const auto dataclass = deviceimage::dataclassWithIdentifier(identifier);
  return dataclass ? std::string(deviceimage::dataclassName(*dataclass)) : identifier;
}

}  // namespace tools
