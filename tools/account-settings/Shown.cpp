#include "tools/account-settings/Shown.h"

#include <fmt/format.h>

#include "propertylist/Writing.h"
#include "tools/account-settings/JsonForm.h"
#include "tools/common/DataclassNames.h"
#include "tools/common/Program.h"

namespace tools {

using propertylist::Value;

std::vector<std::string> shownDataclasses(
    const std::optional<accountsettings::StringList>& identifiers) {
  std::vector<std::string> names;
  if (!identifiers) return names;
  for (const std::string& identifier : *identifiers) names.push_back(shownDataclass(identifier));
  return names;
}

nlohmann::json orNull(const std::string& text) {
  return text.empty() ? nlohmann::json() : nlohmann::json(text);
}

nlohmann::json jsonFormOf(const Value& value) { return nlohmann::json::parse(jsonFormText(value)); }

std::string kindName(const Value& value) {
  switch (value.kind()) {
    case propertylist::Kind::dictionary:
      return "dictionary";
    case propertylist::Kind::array:
      return "array";
    case propertylist::Kind::string:
      return "string";
    case propertylist::Kind::integer:
      return "integer";
    case propertylist::Kind::real:
      return "real";
    case propertylist::Kind::boolean:
      return "boolean";
    case propertylist::Kind::date:
      return "date";
    case propertylist::Kind::data:
      return "data";
  }
  return {};
}

std::string shownValue(const Value& value) {
  constexpr std::size_t kLongest = 160;
  if (const auto boolean = value.asBoolean()) return *boolean ? "true" : "false";
  std::string text = propertylist::describe(value);
  if (text.size() <= kLongest) return text;
  std::size_t end = kLongest;
  while ((static_cast<unsigned char>(text[end]) & 0xC0U) == 0x80) --end;  // whole characters
  return text.substr(0, end) + "...";
}

std::string jsonText(const nlohmann::json& json) {
  return json.dump(2, ' ', false, nlohmann::json::error_handler_t::replace) + '\n';
}

void printJson(const nlohmann::json& json) { fmt::print("{}", jsonText(json)); }

void warnOfUnusableEntries(AccountStore& store) {
  const Value* const accounts = store.root().find("Accounts");
  if (accounts == nullptr) return;
  const propertylist::Array* const entries = accounts->asArray();
  const std::size_t unusable = entries == nullptr ? 1 : entries->size() - store.manager().count();
  if (unusable != 0)
    printMessage(
        fmt::format("{}: what the file holds is not all shown, since the library cannot use it; "
                    "account-settings validate --image {} says what is wrong",
                    store.image().settingsFile(), store.image().rootPath()));
}

}  // namespace tools
