#pragma once

#include <nlohmann/json.hpp>
#include <optional>
#include <string>
#include <vector>

#include "propertylist/Value.h"
#include "tools/account-settings/AccountStore.h"

// How accounts and values are shown.
namespace tools {

// "contacts" and its like.
std::vector<std::string> shownDataclasses(
    const std::optional<accountsettings::StringList>& identifiers);

// The text, or null for an empty one.
nlohmann::json orNull(const std::string& text);

// The JSON form of the value (JsonForm.h).
nlohmann::json jsonFormOf(const propertylist::Value& value);

// "string", "integer", ...
std::string kindName(const propertylist::Value& value);

// One line; a long value is cut.
std::string shownValue(const propertylist::Value& value);

// Indented, with a line end.
std::string jsonText(const nlohmann::json& json);
void printJson(const nlohmann::json& json);

// Says on standard error how many entries of the settings file are no accounts to the library, and
// so are not shown.
void warnOfUnusableEntries(AccountStore& store);

}  // namespace tools
