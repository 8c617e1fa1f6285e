#include <algorithm>
#include <cstring>
#include <string>
#include <string_view>
#include <vector>

#include "propertylist/Arena.h"
#include "propertylist/DateText.h"
#include "propertylist/LeafText.h"
#include "propertylist/Reading.h"
#include "propertylist/TextTable.h"
#include "propertylist/XMLScanner.h"

namespace propertylist {
namespace {

using Tag = XMLScanner::Tag;

// What the elements of a property list are called.
enum class Element : std::uint8_t {
  unknown,
  key,
  dictionary,
  array,
  string,
  integer,
  real,
  isTrue,
  isFalse,
  date,
  data
};

// Whether a name of the literal's length is that. The length is known to the compiler, so that
// nothing is called.
template <std::size_t kSizeAndEnd>
bool is(std::string_view name, const char (&literal)[kSizeAndEnd]) {  // NOLINT(*-c-arrays)
  return std::memcmp(name.data(), literal, kSizeAndEnd - 1) == 0;
}

// By the length first, since no length has more than a few names.
Element elementOf(std::string_view name) {
  switch (name.size()) {
    case 3:
      return is(name, "key") ? Element::key : Element::unknown;
    case 4:
      if (is(name, "dict")) return Element::dictionary;
      if (is(name, "true")) return Element::isTrue;
      if (is(name, "date")) return Element::date;
      if (is(name, "data")) return Element::data;
      return is(name, "real") ? Element::real : Element::unknown;
    case 5:
      if (is(name, "array")) return Element::array;
      return is(name, "false") ? Element::isFalse : Element::unknown;
    case 6:
      return is(name, "string") ? Element::string : Element::unknown;
    case 7:
      return is(name, "integer") ? Element::integer : Element::unknown;
    default:
      return Element::unknown;
  }
}

// One reading of an XML property list. The containers that are open wait in a list.
class XMLReader {
 public:
  explicit XMLReader(std::string_view text) : _scanner(text), _arena(text.size() / 2) {}

  ReadResult read() {
    if (_readDocument()) return {_arena->value(*_top), {}};
    return {std::nullopt, _scanner.error()};
  }

 private:
  struct Container {
    std::string_view name;  // of its tag
    bool isDictionary;
    std::size_t firstMember;             // in _members
    std::optional<Arena::Raw> key = {};  // whose value comes next
  };
  // A member of an open container; its key, when that is a dictionary.
  struct Member {
    Arena::Raw key;
    Arena::Raw value;
  };

  bool _readDocument() {
    if (!_scanner.readProlog()) return false;
    const std::optional<Tag> root = _scanner.readTag();
    if (!root) return false;
    if (root->isEnd || root->name != "plist") return _scanner.fail(*root, "not a property list");
    if (root->isEmpty) return _scanner.fail(*root, "a property list without a value");
    while (true) {
      if (!_scanner.skipBlanks()) return false;
      const std::optional<Tag> tag = _scanner.readTag();
      if (!tag) return false;
      if (tag->isEnd && _open.empty()) return _readEnd(*tag);
      if (!(tag->isEnd ? _close(*tag) : _readElement(*tag))) return false;
    }
  }

  bool _readEnd(const Tag& tag) {
    if (tag.name != "plist") return _scanner.fail(tag, "an end tag that does not fit");
    if (!_top) return _scanner.fail(tag, "a property list without a value");
    if (!_scanner.skipBlanks()) return false;
    return _scanner.isAtEnd() || _scanner.fail("something behind the property list");
  }

  bool _readElement(const Tag& tag) {
    const Element element = elementOf(tag.name);
    if (element == Element::key) return _readKey(tag);
    if (_open.empty() && _top) return _scanner.fail(tag, "more than one value");
    if (!_open.empty() && _open.back().isDictionary && !_open.back().key) {
      return _scanner.fail(tag, "a value without a key");
    }
    if (element == Element::dictionary || element == Element::array) {
      if (_open.size() == kMaximumDepth) return _scanner.fail(tag, "nested too deep");
      _open.push_back({tag.name, element == Element::dictionary, _members.size()});
      return !tag.isEmpty || _close(tag);
    }
    if (element == Element::unknown) return _scanner.fail(tag, "an unknown element");
    return _readLeaf(tag, element);
  }

  bool _readKey(const Tag& tag) {
    if (_open.empty() || !_open.back().isDictionary) {
      return _scanner.fail(tag, "a key outside of a dictionary");
    }
    if (_open.back().key) return _scanner.fail(tag, "a key without a value");
    if (!_readContents(tag)) return false;
    const std::uint64_t hash = TextTable::hashOf(_text);
    const auto isSame = [this](std::size_t index) { return Arena::textOf(_keys[index]) == _text; };
    std::size_t index = _keyTable.find(hash, isSame);
    if (index == TextTable::kNone) {
      index = _keys.size();
      _keys.push_back(_arena->newText(_text));
      _keyTable.add(hash, index);
    }
    _open.back().key = _keys[index];
    return true;
  }

  bool _readLeaf(const Tag& tag, Element element) {
    if (!_readContents(tag)) return false;
    const std::optional<Arena::Raw> value = _leaf(element);
    if (!value) return _scanner.fail(tag, "a value that is not well formed");
    _put(*value);
    return true;
  }

  std::optional<Arena::Raw> _leaf(Element element) {
    if (element == Element::string) return _arena->newText(_text);
    if (element == Element::integer) {
      const std::optional<IntegerText> integer = parseIntegerText(_text);
      if (!integer) return std::nullopt;
      return Arena::integer(integer->bits, integer->isNegative);
    }
    if (element == Element::real) return _scalar(Kind::real, parseRealText(_text));
    if (element == Element::date) {
      const std::optional<Date> date = parseDateText(withoutBlanks(_text));
      return _scalar(Kind::date, date ? std::optional(date->secondsSince2001) : std::nullopt);
    }
    if (element == Element::data) {
      const std::optional<Bytes> data = parseBase64(_text);
      return data ? std::optional(_arena->newData(*data)) : std::nullopt;
    }
    if (!withoutBlanks(_text).empty()) return std::nullopt;
    return Arena::scalar(Kind::boolean, element == Element::isTrue ? 1 : 0);
  }

  static std::optional<Arena::Raw> _scalar(Kind kind, std::optional<double> number) {
    if (!number) return std::nullopt;
    return Arena::scalar(kind, std::bit_cast<std::uint64_t>(*number));
  }

  // Reads the text of an element into _text, and its end tag.
  bool _readContents(const Tag& tag) {
    _text = {};
    if (tag.isEmpty) return true;
    if (!_scanner.readText(_text)) return false;
    if (_scanner.acceptEndTag(tag.name)) return true;
    const std::optional<Tag> end = _scanner.readTag();
    if (!end) return false;
    if (!end->isEnd) return _scanner.fail(*end, "an element inside of a text");
    return end->name == tag.name || _scanner.fail(*end, "an end tag that does not fit");
  }

  bool _close(const Tag& tag) {
    const Container& container = _open.back();
    if (tag.name != container.name) return _scanner.fail(tag, "an end tag that does not fit");
    if (container.key) return _scanner.fail(tag, "a key without a value");
    const Arena::Raw made =
        container.isDictionary ? _dictionary(container.firstMember) : _array(container.firstMember);
    _members.resize(container.firstMember);
    _open.pop_back();
    _put(made);
    return true;
  }

  Arena::Raw _array(std::size_t first) {
    const Arena::Raw made = _arena->newArray(_members.size() - first);
    for (std::size_t i = first; i < _members.size(); ++i)
      Arena::put(made, i - first, _members[i].value);
    return made;
  }

  Arena::Raw _dictionary(std::size_t first) {
    const Arena::Raw made = _arena->newDictionary(_members.size() - first);
    bool isAscending = true;
    for (std::size_t i = first; i < _members.size(); ++i) {
      Arena::putKey(made, i - first, _members[i].key);
      Arena::putValue(made, i - first, _members[i].value);
      isAscending = isAscending && (i == first || Arena::textOf(_members[i - 1].key) <
                                                      Arena::textOf(_members[i].key));
    }
    if (!isAscending)
      Arena::sort(made, [](const auto& a, const auto& b) { return a.text < b.text; });
    return made;
  }

  void _put(const Arena::Raw& value) {
    if (_open.empty()) {
      _top = value;
    } else {
      _members.push_back({_open.back().key.value_or(Arena::Raw()), value});
      _open.back().key.reset();
    }
  }

  XMLScanner _scanner;
  Arena::Holder _arena;
  std::vector<Container> _open;
  std::vector<Member> _members;  // of all that are open
  std::optional<Arena::Raw> _top;
  std::string_view _text;  // of the element that is read
  TextTable _keyTable;
  std::vector<Arena::Raw> _keys;
};

}  // namespace

ReadResult readXMLPropertyList(std::span<const std::uint8_t> bytes) {
  if (bytes.size() > kMaximumFileSize) return {std::nullopt, {"too large", {}, {}, {}}};
  return XMLReader({reinterpret_cast<const char*>(bytes.data()), bytes.size()}).read();
}

}  // namespace propertylist
