#include <vector>

#include "propertylist/DateText.h"
#include "propertylist/LeafText.h"
#include "propertylist/Writing.h"

namespace propertylist {
namespace {

std::string dataText(const Bytes& data) {
  constexpr std::string_view kDigits = "0123456789abcdef";
  std::string text = "<";
  for (const std::uint8_t byte : data) {
    text += kDigits[byte >> 4U];
    text += kDigits[byte & 0x0FU];
  }
  return text + ">";
}

std::string describedDate(Date date) {
  const std::optional<std::string> text = dateText(date);
  return text ? *text : realText(date.secondsSince2001) + " seconds since 2001-01-01T00:00:00Z";
}

// Writes a description from left to right. The containers that are open wait in a list.
class Description {
 public:
  std::string of(const Value& value) {
    _begin(value);
    while (!_open.empty() && _text.size() <= kMaximumDescription) _continue();
    if (_text.size() > kMaximumDescription) {
      _text.resize(kMaximumDescription);
      _text += "...";
    }
    return std::move(_text);
  }

 private:
  struct Container {
    const Value* value;
    std::size_t next;  // the member whose turn it is
  };

  void _begin(const Value& value) {
    switch (value.kind()) {
      case Kind::dictionary:
        _text += '{';
        _open.push_back({&value, 0});
        break;
      case Kind::array:
        _text += '(';
        _open.push_back({&value, 0});
        break;
      case Kind::string:
        _text += *value.asString();
        break;
      case Kind::integer:
        _text += integerText(value);
        break;
      case Kind::real:
        _text += realText(*value.asReal());
        break;
      case Kind::boolean:
        _text += *value.asBoolean() ? '1' : '0';
        break;
      case Kind::date:
        _text += describedDate(*value.asDate());
        break;
      case Kind::data:
        _text += dataText(*value.asData());
        break;
    }
  }

  void _continue() {
    Container& container = _open.back();
    const std::size_t index = container.next++;
    if (const Array* const array = container.value->asArray()) {
      if (index == array->size()) return _close(')');
      if (index > 0) _text += ", ";
      return _begin((*array)[index]);
    }
    const Dictionary& dictionary = *container.value->asDictionary();
    if (index == dictionary.size()) return _close('}');
    if (index > 0) _text += "; ";
    const Dictionary::Entry& entry = dictionary.begin()[index];
    _text += entry.key();
    _text += " = ";
    _begin(entry.value());
  }

  void _close(char bracket) {
    _text += bracket;
    _open.pop_back();
  }

  std::string _text;
  std::vector<Container> _open;
};

}  // namespace

std::string describe(const Value& value) { return Description().of(value); }

}  // namespace propertylist
