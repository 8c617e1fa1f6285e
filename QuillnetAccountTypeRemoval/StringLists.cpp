#include "QuillnetAccountTypeRemoval/StringLists.h"

#include <algorithm>

namespace accountsettings {
namespace {

template <typename List>
std::optional<List> stringsAs(const propertylist::Value* value) {
  const propertylist::Array* array = value != nullptr ? value->asArray() : nullptr;
  if (array == nullptr) return std::nullopt;
  List strings;
  strings.reserve(array->size());
  for (const propertylist::Value& member : *array) {
    if (const propertylist::Text* string = member.asString()) strings.push_back(*string);
  }
  return strings;
}

}  // namespace

std::optional<StringList> stringsOfArray(const propertylist::Value* value) {
  return stringsAs<StringList>(value);
}

std::optional<NameList> namesOfArray(const propertylist::Value* value) {
  return stringsAs<NameList>(value);
}

propertylist::Array arrayOfStrings(const StringList& strings) {
  return propertylist::Array(std::vector<propertylist::Value>(strings.begin(), strings.end()));
}

StringList copiesOf(const NameList& names) { return {names.begin(), names.end()}; }

bool contains(const NameList& names, std::string_view wanted) {
  return std::find(names.begin(), names.end(), wanted) != names.end();
}

bool contains(const StringList& strings, std::string_view wanted) {
  return std::find(strings.begin(), strings.end(), wanted) != strings.end();
}

}  // namespace accountsettings
