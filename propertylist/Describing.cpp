#include <algorithm>
#include <vector>

#include "propertylist/DateText.h"
#include "propertylist/LeafText.h"
#include "propertylist/UTF8.h"
#include "propertylist/Writing.h"

namespace propertylist {
namespace {

std::string describedDate(Date date) {
  const std::optional<std::string> text = dateText(date);
  return text ? *text : realText(date.secondsSince2001) + " seconds since 2001-01-01T00:00:00Z";
}

// Writes a description from left to right, until it is too long. The containers that are open wait
// in a list.
class Description {
 public:
  explicit Description(std::size_t limit) : _limit(std::min(limit, kMaximumDescription)) {}

  std::string of(const Value& value) {
    _begin(value);
    while (!_open.empty() && !_isTooLong()) _continue();
    return _isTooLong() ? shortened(_text, _limit) : std::move(_text);
  }

 private:
  struct Container {
    const Value* value;
    std::size_t next;  // the member whose turn it is
  };

  bool _isTooLong() const { return _text.size() > _limit; }

  // Appends of `text` what shows where the description is cut: a whole character behind the limit.
  void _append(std::string_view text) {
    constexpr std::size_t kLongestCharacter = 4;
    if (!_isTooLong()) _text += text.substr(0, _limit - _text.size() + kLongestCharacter);
  }

  void _appendData(const Bytes& data) {
    constexpr std::string_view kDigits = "0123456789abcdef";
    _text += '<';
    for (const std::uint8_t byte : data) {
      if (_isTooLong()) return;
      _text += kDigits[byte >> 4U];
      _text += kDigits[byte & 0x0FU];
    }
    _text += '>';
  }

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
        _append(*value.asString());
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
        _appendData(*value.asData());
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
    _append(entry.key());
    _append(" = ");
    _begin(entry.value());
  }

  void _close(char bracket) {
    _text += bracket;
    _open.pop_back();
  }

  std::size_t _limit;
  std::string _text;
  std::vector<Container> _open;
};

}  // namespace

std::string describe(const Value& value, std::size_t limit) { return Description(limit).of(value); }

std::string shortened(std::string_view text, std::size_t limit) {
  if (text.size() <= limit) return std::string(text);
  return std::string(text.substr(0, characterBoundary(text, limit))) + "...";
}

}  // namespace propertylist
