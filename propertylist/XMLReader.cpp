#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "propertylist/DateText.h"
#include "propertylist/LeafText.h"
#include "propertylist/Reading.h"
#include "propertylist/TextTable.h"
#include "propertylist/XMLScanner.h"

namespace propertylist {
namespace {

using Tag = XMLScanner::Tag;

// One reading of an XML property list. The containers that are open wait in a list.
class XMLReader {
 public:
  explicit XMLReader(std::string_view text) : _scanner(text) {}

  ReadResult read() {
    if (_readDocument()) return {std::move(_top), {}};
    return {std::nullopt, _scanner.error()};
  }

 private:
  struct Container {
    std::string_view name;  // of its tag
    std::vector<Value> values;
    std::vector<Dictionary::Entry> entries;
    std::shared_ptr<const std::string> key;  // whose value comes next
    bool isDictionary() const { return name == "dict"; }
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
    if (tag.name == "key") return _readKey(tag);
    if (_open.empty() && _top) return _scanner.fail(tag, "more than one value");
    if (!_open.empty() && _open.back().isDictionary() && !_open.back().key) {
      return _scanner.fail(tag, "a value without a key");
    }
    if (tag.name == "dict" || tag.name == "array") {
      if (_open.size() == kMaximumDepth) return _scanner.fail(tag, "nested too deep");
      _open.push_back({tag.name, {}, {}, nullptr});
      return !tag.isEmpty || _close(tag);
    }
    return _readLeaf(tag);
  }

  bool _readKey(const Tag& tag) {
    if (_open.empty() || !_open.back().isDictionary()) {
      return _scanner.fail(tag, "a key outside of a dictionary");
    }
    if (_open.back().key) return _scanner.fail(tag, "a key without a value");
    std::string text;
    if (!_readContents(tag, text)) return false;
    _open.back().key = _sharedKey(std::move(text));
    return true;
  }

  const std::shared_ptr<const std::string>& _sharedKey(std::string text) {
    const std::uint64_t hash = TextTable::hashOf(text);
    const std::size_t known =
        _keyTable.find(hash, [&](std::size_t index) { return *_keys[index] == text; });
    if (known != TextTable::kNone) return _keys[known];
    _keyTable.add(hash, _keys.size());
    return _keys.emplace_back(std::make_shared<const std::string>(std::move(text)));
  }

  bool _readLeaf(const Tag& tag) {
    std::string text;
    if (!_isLeaf(tag.name)) return _scanner.fail(tag, "an unknown element");
    if (!_readContents(tag, text)) return false;
    std::optional<Value> value = _leaf(tag.name, std::move(text));
    if (!value) return _scanner.fail(tag, "a value that is not well formed");
    return _put(std::move(*value));
  }

  static bool _isLeaf(std::string_view name) {
    return name == "string" || name == "integer" || name == "real" || name == "true" ||
           name == "false" || name == "date" || name == "data";
  }

  static std::optional<Value> _leaf(std::string_view name, std::string text) {
    if (name == "string") return Value(std::move(text));
    if (name == "integer") return parseIntegerText(text);
    if (name == "real") return parseRealText(text);
    if (name == "date") return parseDateText(withoutBlanks(text));
    if (name == "data") return parseBase64(text);
    if (!withoutBlanks(text).empty()) return std::nullopt;
    return Value(name == "true");
  }

  // Reads the text of an element and its end tag.
  bool _readContents(const Tag& tag, std::string& text) {
    if (tag.isEmpty) return true;
    if (!_scanner.readText(text)) return false;
    const std::optional<Tag> end = _scanner.readTag();
    if (!end) return false;
    if (!end->isEnd) return _scanner.fail(*end, "an element inside of a text");
    return end->name == tag.name || _scanner.fail(*end, "an end tag that does not fit");
  }

  bool _close(const Tag& tag) {
    Container& container = _open.back();
    if (tag.name != container.name) return _scanner.fail(tag, "an end tag that does not fit");
    if (container.key) return _scanner.fail(tag, "a key without a value");
    Value value = container.isDictionary() ? Value(Dictionary(std::move(container.entries)))
                                           : Value(Array(std::move(container.values)));
    _open.pop_back();
    return _put(std::move(value));
  }

  bool _put(Value value) {
    if (_open.empty()) {
      _top = std::move(value);
    } else if (_open.back().isDictionary()) {
      _open.back().entries.emplace_back(std::exchange(_open.back().key, nullptr), std::move(value));
    } else {
      _open.back().values.push_back(std::move(value));
    }
    return true;
  }

  XMLScanner _scanner;
  std::vector<Container> _open;
  std::optional<Value> _top;
  TextTable _keyTable;
  std::vector<std::shared_ptr<const std::string>> _keys;
};

}  // namespace

ReadResult readXMLPropertyList(std::span<const std::uint8_t> bytes) {
  if (bytes.size() > kMaximumFileSize) return {std::nullopt, {"too large", {}, {}, {}}};
  return XMLReader({reinterpret_cast<const char*>(bytes.data()), bytes.size()}).read();
}

}  // namespace propertylist
