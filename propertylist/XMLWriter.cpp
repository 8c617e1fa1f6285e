#include <bit>
#include <cmath>
#include <limits>
#include <vector>

#include "propertylist/DateText.h"
#include "propertylist/LeafText.h"
#include "propertylist/Reading.h"
#include "propertylist/UTF8.h"
#include "propertylist/Writing.h"
#include "propertylist/XMLScanner.h"

namespace propertylist {
namespace {

constexpr std::string_view kHead =
    "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
    "<plist version=\"1.0\">\n";
constexpr std::string_view kFoot = "</plist>\n";

std::optional<std::string> escaped(std::string_view text) {
  std::string result;
  for (std::size_t position = 0; position < text.size();) {
    const std::optional<char32_t> codePoint = decodeUTF8(text, position);
    if (!codePoint || !isXMLCharacter(*codePoint)) return std::nullopt;
    switch (*codePoint) {
      case '&':
        result += "&amp;";
        break;
      case '<':
        result += "&lt;";
        break;
      case '>':
        result += "&gt;";
        break;
      case '\r':  // as itself it would be read as a line feed
        result += "&#13;";
        break;
      default:
        appendUTF8(result, *codePoint);
    }
  }
  return result;
}

std::optional<std::string> realOrNothing(double real) {
  const bool isOtherNaN = std::isnan(real) && std::bit_cast<std::uint64_t>(real) !=
                                                  std::bit_cast<std::uint64_t>(
                                                      std::numeric_limits<double>::quiet_NaN());
  return isOtherNaN ? std::nullopt : std::optional(realText(real));
}

// One writing of an XML property list. The containers that are open wait in a list.
class XMLWriter {
 public:
  std::optional<std::string> write(const Value& value) {
    _text = kHead;
    bool isGood = _begin(value);
    while (isGood && !_open.empty()) isGood = _continue();
    if (!isGood) return std::nullopt;
    _text += kFoot;
    return std::move(_text);
  }

 private:
  struct Container {
    const Value* value;
    std::size_t next;  // the member whose turn it is
  };

  bool _begin(const Value& value) {
    switch (value.kind()) {
      case Kind::dictionary:
        return _beginContainer(value, "dict", value.asDictionary()->empty());
      case Kind::array:
        return _beginContainer(value, "array", value.asArray()->empty());
      case Kind::string:
        return _put("string", escaped(*value.asString()));
      case Kind::integer:
        return _put("integer", integerText(value));
      case Kind::real:
        return _put("real", realOrNothing(*value.asReal()));
      case Kind::boolean:
        return _putLine(*value.asBoolean() ? "<true/>" : "<false/>");
      case Kind::date:
        return _put("date", dateText(*value.asDate()));
      case Kind::data:
        return _put("data", base64Text(*value.asData()));
    }
    return false;
  }

  bool _beginContainer(const Value& value, const std::string& name, bool isEmpty) {
    if (_open.size() == kMaximumDepth) return false;
    if (isEmpty) return _putLine("<" + name + "/>");
    const bool isGood = _putLine("<" + name + ">");
    _open.push_back({&value, 0});
    return isGood;
  }

  bool _continue() {
    Container& container = _open.back();
    const std::size_t index = container.next++;
    if (const Array* const array = container.value->asArray()) {
      return index == array->size() ? _close("</array>") : _begin((*array)[index]);
    }
    const Dictionary& dictionary = *container.value->asDictionary();
    if (index == dictionary.size()) return _close("</dict>");
    const Dictionary::Entry& entry = dictionary.begin()[index];
    return _put("key", escaped(entry.key())) && _begin(entry.value());
  }

  bool _close(std::string_view endTag) {
    _open.pop_back();
    return _putLine(endTag);
  }

  bool _put(const std::string& name, const std::optional<std::string>& text) {
    if (!text) return false;
    return _putLine("<" + name + ">" + *text + "</" + name + ">");
  }

  // False when the text has become larger than a reader takes.
  bool _putLine(std::string_view line) {
    _text.append(_open.size(), '\t');
    _text += line;
    _text += '\n';
    return _text.size() + kFoot.size() <= kMaximumFileSize;
  }

  std::string _text;
  std::vector<Container> _open;
};

}  // namespace

std::optional<std::string> writeXMLPropertyList(const Value& value) {
  return XMLWriter().write(value);
}

}  // namespace propertylist
