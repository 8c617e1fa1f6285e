#include "host/AccountContents.h"

#include <algorithm>
#include <string_view>

#include "deviceimage/ContentHash.h"
#include "propertylist/Writing.h"

namespace host {

using propertylist::Array;
using propertylist::Bytes;
using propertylist::Dictionary;
using propertylist::Value;

namespace {

std::string_view viewOf(const Bytes& data) {
  return {reinterpret_cast<const char*>(data.data()), data.size()};
}

}  // namespace

std::string AccountContents::of(const Dictionary& account) {
  std::string& content = _contents[account.begin()];
  if (!content.empty()) return content;
  std::vector<Dictionary::Entry> shortened;
  for (const Dictionary::Entry& entry : account) {
    if (std::find(_ignoredKeys.begin(), _ignoredKeys.end(), entry.key()) == _ignoredKeys.end())
      shortened.emplace_back(_shortText(entry.key()), _short(entry.value()));
  }
  const auto bytes = propertylist::writeBinaryPropertyList(Dictionary(std::move(shortened)));
  content = bytes ? deviceimage::contentHash(viewOf(*bytes)) : std::string(kNone);
  return content;
}

// The value with short texts and data only. Nesting is bounded for what comes from a file.
Value AccountContents::_short(const Value& value) {
  if (value.asString() != nullptr) return _shortText(*value.asString());
  if (const Bytes* const data = value.asData()) {
    const std::string text = _shortText(viewOf(*data));
    return Bytes(text.begin(), text.end());
  }
  if (value.asArray() == nullptr && value.asDictionary() == nullptr) return value;
  return _shortContainer(value);
}

Value AccountContents::_shortContainer(const Value& container) {
  const Array* const array = container.asArray();
  const void* const place = array != nullptr
                                ? static_cast<const void*>(array->begin())
                                : static_cast<const void*>(container.asDictionary()->begin());
  if (place == nullptr) return container;  // empty
  const auto known = _shortened.find(place);
  if (known != _shortened.end()) return known->second;
  Value shortened = container;
  if (array != nullptr) {
    std::vector<Value> members;
    for (const Value& member : *array) members.push_back(_short(member));
    shortened = Array(std::move(members));
  } else {
    std::vector<Dictionary::Entry> entries;
    for (const Dictionary::Entry& entry : *container.asDictionary())
      entries.emplace_back(_shortText(entry.key()), _short(entry.value()));
    shortened = Dictionary(std::move(entries));
  }
  return _shortened.emplace(place, std::move(shortened)).first->second;
}

// What stands for a long text is longer than any text that stands for itself.
std::string AccountContents::_shortText(std::string_view text) {
  constexpr std::size_t kLongest = 64;
  if (text.size() <= kLongest) return std::string(text);
  std::string& hash = _hashes[text.data()];
  if (hash.empty()) hash = deviceimage::contentHash(text);
  return "hash " + hash;
}

}  // namespace host
