#pragma once

#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

#include "propertylist/Value.h"

namespace accountsettings {

// An ordered list of strings: dataclasses, types, user actions.
using StringList = std::vector<std::string>;

// The same without copies: views of texts that somebody else keeps meanwhile.
using NameList = std::vector<std::string_view>;

// Such views in ascending order, each text once. A small file may name one long text very often:
// whether it is before itself is told by where it stands.
struct NameOrder {
  bool operator()(std::string_view a, std::string_view b) const {
    const bool areOne = a.data() == b.data() && a.size() == b.size();
    return !areOne && a < b;
  }
};
using NameSet = std::set<std::string_view, NameOrder>;

// The strings of an array value, in order, other members left out; empty when `value` is null or no
// array.
std::optional<StringList> stringsOfArray(const propertylist::Value* value);
// The same as views, which live as long as `value` does and is not changed.
std::optional<NameList> namesOfArray(const propertylist::Value* value);

propertylist::Array arrayOfStrings(const StringList& strings);
StringList copiesOf(const NameList& names);

bool contains(const StringList& strings, std::string_view wanted);
bool contains(const NameList& names, std::string_view wanted);

}  // namespace accountsettings
