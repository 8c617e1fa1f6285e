#include "QuillnetAccountTypeRemoval/StringLists.h"

#include <algorithm>

namespace accountsettings {

std::optional<StringList> stringsOfArray(const propertylist::Value* value) {
  const propertylist::Array* array = value != nullptr ? value->asArray() : nullptr;
  if (array == nullptr) return std::nullopt;
  StringList strings;
  strings.reserve(array->size());
  for (const propertylist::Value& member : *array) {
    if (const propertylist::Text* string = member.asString()) strings.push_back(*string);
  }
  return strings;
}

propertylist::Array arrayOfStrings(const StringList& strings) {
  return propertylist::Array(std::vector<propertylist::Value>(strings.begin(), strings.end()));
}

bool contains(const StringList& strings, std::string_view wanted) {
  return std::find(strings.begin(), strings.end(), wanted) != strings.end();
}

}  // namespace accountsettings
