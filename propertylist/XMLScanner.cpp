#include "propertylist/XMLScanner.h"

#include <algorithm>
#include <array>
#include <bit>
#include <cstdint>
#include <cstring>
#include <set>

#include "propertylist/UTF8.h"

namespace propertylist {
namespace {

constexpr std::string_view kByteOrderMark = "\xEF\xBB\xBF";

bool isBlank(char c) { return c == ' ' || c == '\t' || c == '\r' || c == '\n'; }

// Whether these bytes are ASCII that XML allows, with no look at single ones.
bool isPlain(const char* bytes, std::size_t size) {
  unsigned char bad = 0;
  for (std::size_t i = 0; i < size; ++i) {
    // Without branches, so that many bytes are looked at together. What is not ASCII is negative.
    const auto byte = static_cast<signed char>(bytes[i]);
    bad |= static_cast<unsigned char>(
        static_cast<unsigned>(byte < 0x20) & static_cast<unsigned>(byte != '\t') &
        static_cast<unsigned>(byte != '\n') & static_cast<unsigned>(byte != '\r'));
  }
  return bad == 0;
}

constexpr bool startsName(char c) {
  const auto byte = static_cast<unsigned char>(c);
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || c == '_' || c == ':' || byte >= 0x80;
}

// Whether each byte continues a name.
constexpr std::array<bool, 256> kContinuesName = [] {
  std::array<bool, 256> continues{};
  for (std::size_t byte = 0; byte < continues.size(); ++byte) {
    const auto c = static_cast<char>(byte);
    continues[byte] = startsName(c) || (c >= '0' && c <= '9') || c == '-' || c == '.';
  }
  return continues;
}();

std::string lowerCase(std::string_view text) {
  std::string result(text);
  for (char& c : result) {
    if (c >= 'A' && c <= 'Z') c = static_cast<char>(c - 'A' + 'a');
  }
  return result;
}

// Where a text has to be looked at more closely.
bool isSpecial(char c) { return c == '<' || c == '&' || c == ']' || c == '\r'; }

// Each byte of the word that equals `c` has its high bit set in the answer, and bytes above the
// lowest such one may have it too.
constexpr std::uint64_t bytesEqualTo(std::uint64_t word, char c) {
  constexpr std::uint64_t kOnes = 0x0101010101010101;
  const std::uint64_t different = word ^ (kOnes * static_cast<unsigned char>(c));
  return (different - kOnes) & ~different & (kOnes << 7U);
}

// The first special character at `from` or behind it, or the end of the text.
std::size_t findSpecial(std::string_view text, std::size_t from) {
  constexpr bool kFirstIsLowest = std::endian::native == std::endian::little;
  for (std::uint64_t word = 0; kFirstIsLowest && text.size() - from >= sizeof word;
       from += sizeof word) {
    std::memcpy(&word, text.data() + from, sizeof word);
    const std::uint64_t special = bytesEqualTo(word, '<') | bytesEqualTo(word, '&') |
                                  bytesEqualTo(word, ']') | bytesEqualTo(word, '\r');
    if (special != 0) return from + static_cast<std::size_t>(std::countr_zero(special)) / 8;
  }
  while (from < text.size() && !isSpecial(text[from])) ++from;
  return from;
}

// Line ends of any kind become line feeds.
void appendLines(std::string& text, std::string_view raw) {
  for (std::size_t i = 0; i < raw.size(); ++i) {
    if (raw[i] != '\r') {
      text += raw[i];
    } else if (i + 1 == raw.size() || raw[i + 1] != '\n') {
      text += '\n';
    }
  }
}

}  // namespace

bool isXMLCharacter(char32_t codePoint) {
  if (codePoint < 0x20) return codePoint == '\t' || codePoint == '\n' || codePoint == '\r';
  return isScalarValue(codePoint) && codePoint != 0xFFFE && codePoint != 0xFFFF;
}

bool XMLScanner::readProlog() {
  if (!_checkCharacters()) return false;
  _accept(kByteOrderMark);
  if (_isAt("<?xml") && _text.size() > _at + 5 && isBlank(_text[_at + 5]) && !_readDeclaration()) {
    return false;
  }
  if (!skipBlanks()) return false;
  if (_accept("<!DOCTYPE") && !(_readDocumentType() && skipBlanks())) return false;
  return true;
}

bool XMLScanner::_checkCharacters() {
  constexpr std::size_t kBlock = 32;
  constexpr std::size_t kPart = 8;
  for (std::size_t position = 0; position < _text.size();) {
    const char* const next = _text.data() + position;
    const std::size_t left = _text.size() - position;
    if (left >= kBlock && isPlain(next, kBlock)) {
      position += kBlock;
    } else if (left >= kPart && isPlain(next, kPart)) {
      position += kPart;
    } else if (!_checkCharactersUpTo(position + std::min(left, kPart), position)) {
      return false;
    }
  }
  return true;
}

// One by one, up to and with the character that goes to `end` or beyond.
bool XMLScanner::_checkCharactersUpTo(std::size_t end, std::size_t& position) {
  while (position < end) {
    const std::size_t at = position;
    const std::optional<char32_t> codePoint = decodeUTF8(_text, position);
    if (!codePoint) return _failAt(at, "not UTF-8");
    if (!isXMLCharacter(*codePoint)) return _failAt(at, "a character that XML does not allow");
  }
  return true;
}

bool XMLScanner::_readDeclaration() {
  _accept("<?xml");
  std::string encoding = "utf-8";
  if (!_readAttributes("?>", &encoding)) return false;
  encoding = lowerCase(encoding);
  return encoding == "utf-8" || encoding == "us-ascii" || fail("an encoding other than UTF-8");
}

// Reads the names of a document type, which nobody opens.
bool XMLScanner::_readDocumentType() {
  if (!_readBlanks() || _readName().empty()) return fail("a document type without a name");
  _readBlanks();
  const std::size_t literals = _accept("PUBLIC") ? 2 : _accept("SYSTEM") ? 1 : 0;
  for (std::size_t i = 0; i < literals; ++i) {
    if (!_readBlanks() || !_readLiteral()) return fail("a document type that is not well formed");
  }
  _readBlanks();
  if (_isAt("[")) return fail("a document type with declarations of its own");
  return _accept(">") || fail("a document type that is not well formed");
}

bool XMLScanner::skipBlanks() {
  while (true) {
    _readBlanks();
    if (_isAtTag()) return true;
    if (_isAt("<!--")) {
      if (!_skipComment()) return false;
    } else if (_isAt("<?")) {
      if (!_skipInstruction()) return false;
    } else {
      return true;
    }
  }
}

bool XMLScanner::_skipComment() {
  const std::size_t end = _text.find("--", _at + 4);
  if (end == std::string_view::npos) return fail("a comment without an end");
  if (!_text.substr(end).starts_with("-->")) return _failAt(end, "two hyphens in a comment");
  _at = end + 3;
  return true;
}

bool XMLScanner::_skipInstruction() {
  const std::size_t end = _text.find("?>", _at + 2);
  if (end == std::string_view::npos) return fail("a processing instruction without an end");
  const std::size_t start = _at;
  _at += 2;
  const std::string_view target = _readName();
  const bool isSeparate = _at == end || isBlank(_text[_at]);  // no name goes past the end
  if (target.empty() || !isSeparate || lowerCase(target) == "xml") {
    return _failAt(start, "a processing instruction that is not well formed");
  }
  _at = end + 2;
  return true;
}

std::optional<XMLScanner::Tag> XMLScanner::readTag() {
  Tag tag;
  tag.at = _at;
  if (!_accept("<")) {
    fail(isAtEnd() ? "the end of the document is missing" : "text outside of a value");
    return std::nullopt;
  }
  tag.isEnd = _accept("/");
  tag.name = _readName();
  if (tag.name.empty()) {
    fail(tag, "markup that is no tag");
    return std::nullopt;
  }
  if (tag.isEnd) {
    _readBlanks();
    if (_accept(">")) return tag;
    fail(tag, "an end tag that is not well formed");
    return std::nullopt;
  }
  if (_accept(">")) return tag;  // most have no attributes
  if (!_readAttributes(">", nullptr)) return std::nullopt;
  tag.isEmpty = _text[_at - 2] == '/';
  return tag;
}

// Reads attributes up to and with `end`, or "/>" for a tag's.
bool XMLScanner::_readAttributes(std::string_view end, std::string* encoding) {
  std::set<std::string_view> names;  // not hashed: a file may hold names that collide
  while (true) {
    const bool isSeparate = _readBlanks();
    if (_accept(end) || (end == ">" && _accept("/>"))) return true;
    if (isAtEnd()) return fail("a tag without an end");
    std::string_view name;
    std::string value;
    if (!isSeparate || !_readAttribute(name, value)) return fail("a tag that is not well formed");
    if (!names.insert(name).second) return fail("an attribute that comes twice");
    if (encoding != nullptr && name == "encoding") *encoding = value;
  }
}

bool XMLScanner::_readAttribute(std::string_view& name, std::string& value) {
  name = _readName();
  _readBlanks();
  if (name.empty() || !_accept("=")) return false;
  _readBlanks();
  if (!_isAt("\"") && !_isAt("'")) return false;
  const char quote = _text[_at++];
  while (!isAtEnd() && _text[_at] != quote) {
    if (_isAt("<")) return false;
    if (_isAt("&")) {
      if (!_readReference(value)) return false;
    } else {
      value += _text[_at++];
    }
  }
  if (isAtEnd()) return false;
  ++_at;
  return true;
}

bool XMLScanner::acceptEndTag(std::string_view name) {
  const std::string_view rest = _text.substr(_at);
  const std::size_t size = name.size() + 3;
  const bool isThere = rest.size() >= size && rest.starts_with("</") && rest[size - 1] == '>' &&
                       rest.substr(2, name.size()) == name;
  if (isThere) _at += size;
  return isThere;
}

bool XMLScanner::readText(std::string_view& text) {
  const std::size_t start = _at;
  _at = findSpecial(_text, start);
  text = _text.substr(start, _at - start);
  if (_isAtTag()) return true;  // as most are
  _madeText = text;
  const bool isGood = _readRestOfText(_madeText);
  text = _madeText;
  return isGood;
}

// Whether there is markup that is neither comment nor section nor instruction.
bool XMLScanner::_isAtTag() const {
  return _text.size() - _at >= 2 && _text[_at] == '<' && _text[_at + 1] != '!' &&
         _text[_at + 1] != '?';
}

bool XMLScanner::_readRestOfText(std::string& text) {
  while (!isAtEnd()) {
    const std::size_t start = _at;
    _at = findSpecial(_text, start);
    text.append(_text, start, _at - start);
    if (isAtEnd()) break;
    bool isGood = true;
    if (_isAt("]")) {
      isGood = !_isAt("]]>") || fail("the end of a section that has no beginning");
      text += _text[_at++];
    } else if (_isAt("\r")) {
      ++_at;
      if (!_isAt("\n")) text += '\n';
    } else if (_isAt("&")) {
      isGood = _readReference(text);
    } else if (_isAt("<!--")) {
      isGood = _skipComment();
    } else if (_isAt("<?")) {
      isGood = _skipInstruction();
    } else if (_isAt("<![CDATA[")) {
      isGood = _readSection(text);
    } else {
      return true;
    }
    if (!isGood) return false;
  }
  return true;
}

bool XMLScanner::_readSection(std::string& text) {
  constexpr std::size_t kStartSize = std::string_view("<![CDATA[").size();
  const std::size_t end = _text.find("]]>", _at + kStartSize);
  if (end == std::string_view::npos) return fail("a section without an end");
  appendLines(text, _text.substr(_at + kStartSize, end - _at - kStartSize));
  _at = end + 3;
  return true;
}

bool XMLScanner::_readReference(std::string& text) {
  constexpr std::size_t kLongest = 64;  // leading zeros may make a character reference long
  const std::size_t end = _text.substr(_at, kLongest).find(';');
  if (end == std::string_view::npos) return fail("a reference without an end");
  const std::string_view name = _text.substr(_at + 1, end - 1);
  if (name.starts_with('#')) {
    if (!_readCharacterReference(name.substr(1), text)) return false;
  } else if (name == "amp") {
    text += '&';
  } else if (name == "lt") {
    text += '<';
  } else if (name == "gt") {
    text += '>';
  } else if (name == "quot") {
    text += '"';
  } else if (name == "apos") {
    text += '\'';
  } else {
    return fail("an entity that is not predefined");
  }
  _at += end + 1;
  return true;
}

bool XMLScanner::_readCharacterReference(std::string_view digits, std::string& text) {
  const bool isHexadecimal = digits.starts_with('x');
  if (isHexadecimal) digits.remove_prefix(1);
  const char32_t base = isHexadecimal ? 16 : 10;
  char32_t codePoint = 0;
  for (const char c : digits) {
    char32_t digit = base;
    if (c >= '0' && c <= '9') digit = static_cast<char32_t>(c - '0');
    if (c >= 'a' && c <= 'f') digit = static_cast<char32_t>(c - 'a' + 10);
    if (c >= 'A' && c <= 'F') digit = static_cast<char32_t>(c - 'A' + 10);
    if (digit >= base) return fail("a character reference that is no number");
    codePoint = std::min<char32_t>(codePoint * base + digit, 0x110000);  // nothing wraps
  }
  if (digits.empty() || !isXMLCharacter(codePoint)) {
    return fail("a reference to a character that XML does not allow");
  }
  appendUTF8(text, codePoint);
  return true;
}

std::string_view XMLScanner::_readName() {
  const std::size_t start = _at;
  if (!isAtEnd() && startsName(_text[_at])) {
    while (!isAtEnd() && kContinuesName[static_cast<unsigned char>(_text[_at])]) ++_at;
  }
  return _text.substr(start, _at - start);
}

std::optional<std::string_view> XMLScanner::_readLiteral() {
  if (!_isAt("\"") && !_isAt("'")) return std::nullopt;
  const std::size_t end = _text.find(_text[_at], _at + 1);
  if (end == std::string_view::npos) return std::nullopt;
  const std::string_view literal = _text.substr(_at + 1, end - _at - 1);
  _at = end + 1;
  return literal;
}

// Whether there were blanks.
bool XMLScanner::_readBlanks() {
  const std::size_t start = _at;
  while (!isAtEnd() && isBlank(_text[_at])) ++_at;
  return _at > start;
}

bool XMLScanner::_accept(std::string_view token) {
  if (!_isAt(token)) return false;
  _at += token.size();
  return true;
}

// The first failure stays.
bool XMLScanner::_failAt(std::size_t at, std::string what) {
  if (!_error.what.empty()) return false;
  const std::string_view before = _text.substr(0, at);
  const std::size_t lineStart = before.rfind('\n') + 1;  // 0 when there is none
  _error.what = std::move(what);
  _error.line = 1 + static_cast<std::size_t>(std::count(before.begin(), before.end(), '\n'));
  _error.column = at - lineStart + 1;
  return false;
}

}  // namespace propertylist
