#include "tools/device-image/import/HtmlTags.h"

#include <algorithm>

#include "tools/device-image/import/TextLines.h"

namespace tools {
namespace {

constexpr std::size_t kNone = std::string_view::npos;
constexpr std::string_view kBlank = " \t\r\n\f";

// Where the tag that begins at `begin` ends. It is broken when another tag begins first, when a
// quotation mark is not closed on its line, or at the end of the text.
void findEnd(std::string_view bytes, HtmlTag& tag) {
  char quote = 0;
  for (std::size_t i = tag.begin + 1; i < bytes.size(); ++i) {
    const char c = bytes[i];
    if (quote != 0) {
      if (c == quote) quote = 0;
      if (c != '\n') continue;
      tag.end = i;
      tag.isBroken = true;
      return;
    }
    if ((c == '"' || c == '\'') && bytes[i - 1] == '=') quote = c;
    if (c == '<' || c == '>') {
      tag.isBroken = c == '<';
      tag.end = tag.isBroken ? i : i + 1;
      return;
    }
  }
  tag.isBroken = true;
  tag.end = bytes.size();
}

std::string utf8Of(std::uint32_t codePoint) {
  std::string text;
  const auto append = [&](std::uint32_t byte) { text += static_cast<char>(byte); };
  if (codePoint < 0x80) {
    append(codePoint);
  } else if (codePoint < 0x800) {
    append(0xC0U | codePoint >> 6U);
    append(0x80U | (codePoint & 0x3FU));
  } else if (codePoint < 0x10000) {
    append(0xE0U | codePoint >> 12U);
    append(0x80U | (codePoint >> 6U & 0x3FU));
    append(0x80U | (codePoint & 0x3FU));
  } else {
    append(0xF0U | codePoint >> 18U);
    append(0x80U | (codePoint >> 12U & 0x3FU));
    append(0x80U | (codePoint >> 6U & 0x3FU));
    append(0x80U | (codePoint & 0x3FU));
  }
  return text;
}

// The names of the characters from U+00A0 to U+00FF, in their order.
constexpr std::string_view kLatin1Names[] = {
    "nbsp",   "iexcl",  "cent",   "pound",  "curren", "yen",    "brvbar", "sect",   "uml",
    "copy",   "ordf",   "laquo",  "not",    "shy",    "reg",    "macr",   "deg",    "plusmn",
    "sup2",   "sup3",   "acute",  "micro",  "para",   "middot", "cedil",  "sup1",   "ordm",
    "raquo",  "frac14", "frac12", "frac34", "iquest", "Agrave", "Aacute", "Acirc",  "Atilde",
    "Auml",   "Aring",  "AElig",  "Ccedil", "Egrave", "Eacute", "Ecirc",  "Euml",   "Igrave",
    "Iacute", "Icirc",  "Iuml",   "ETH",    "Ntilde", "Ograve", "Oacute", "Ocirc",  "Otilde",
    "Ouml",   "times",  "Oslash", "Ugrave", "Uacute", "Ucirc",  "Uuml",   "Yacute", "THORN",
    "szlig",  "agrave", "aacute", "acirc",  "atilde", "auml",   "aring",  "aelig",  "ccedil",
    "egrave", "eacute", "ecirc",  "euml",   "igrave", "iacute", "icirc",  "iuml",   "eth",
    "ntilde", "ograve", "oacute", "ocirc",  "otilde", "ouml",   "divide", "oslash", "ugrave",
    "uacute", "ucirc",  "uuml",   "yacute", "thorn",  "yuml"};
static_assert(std::size(kLatin1Names) == 96);

// The code point of "#233" or "#xE9".
std::optional<std::uint32_t> numericReference(std::string_view name) {
  name.remove_prefix(1);
  const bool hexadecimal = name.starts_with('x') || name.starts_with('X');
  if (hexadecimal) name.remove_prefix(1);
  if (name.empty() || name.size() > 7) return std::nullopt;
  const std::uint32_t base = hexadecimal ? 16 : 10;
  std::uint32_t codePoint = 0;
  for (const char c : name) {
    const std::size_t digit = std::string_view("0123456789ABCDEF").find(upperCased({&c, 1}));
    if (digit >= base) return std::nullopt;
    codePoint = codePoint * base + static_cast<std::uint32_t>(digit);
  }
  const bool isCharacter =
      codePoint != 0 && codePoint <= 0x10FFFF && (codePoint < 0xD800 || codePoint > 0xDFFF);
  return isCharacter ? std::optional(codePoint) : std::nullopt;
}

// The code point that the name between "&" and ";" stands for.
std::optional<std::uint32_t> codePointOf(std::string_view name) {
  if (name.starts_with('#')) return numericReference(name);
  if (name == "amp") return '&';
  if (name == "lt") return '<';
  if (name == "gt") return '>';
  if (name == "quot") return '"';
  if (name == "apos") return '\'';
  const auto* const found = std::find(std::begin(kLatin1Names), std::end(kLatin1Names), name);
  if (found == std::end(kLatin1Names)) return std::nullopt;
  return 0xA0 + static_cast<std::uint32_t>(found - std::begin(kLatin1Names));
}

}  // namespace

std::optional<std::string> HtmlTag::attribute(std::string_view attributeName) const {
  std::string_view rest = attributes;
  for (;;) {
    const std::size_t start = rest.find_first_not_of(kBlank);
    if (start == kNone) return std::nullopt;
    rest.remove_prefix(start);
    const std::size_t nameEnd = std::min(rest.find_first_of(" \t\r\n\f=", 1), rest.size());
    const std::string_view found = rest.substr(0, nameEnd);
    rest.remove_prefix(nameEnd);
    std::string_view value;
    if (rest.starts_with('=')) {
      rest.remove_prefix(1);
      const bool quoted = rest.starts_with('"') || rest.starts_with('\'');
      const std::size_t valueEnd =
          std::min(quoted ? rest.find(rest.front(), 1) : rest.find_first_of(kBlank), rest.size());
      value = rest.substr(quoted ? 1 : 0, valueEnd - (quoted ? 1 : 0));
      rest.remove_prefix(std::min(valueEnd + (quoted ? 1 : 0), rest.size()));
    }
    if (equalsIgnoringCase(found, attributeName)) return resolvedEntities(value);
  }
}

std::optional<HtmlTag> HtmlTags::next() {
  for (;;) {
    HtmlTag tag;
    tag.begin = _bytes.find('<', _position);
    if (tag.begin == kNone) return std::nullopt;
    if (_bytes.substr(tag.begin).starts_with("<!--")) {
      // Once one comment is found to be open, no other can end either.
      const std::size_t commentEnd = _hasOpenComment ? kNone : _bytes.find("-->", tag.begin + 4);
      if (commentEnd != kNone) {
        _position = commentEnd + 3;
        continue;
      }
      _hasOpenComment = true;
      tag.isBroken = true;
      tag.end = tag.begin + 4;
    } else {
      findEnd(_bytes, tag);
    }
    _position = tag.end;
    const std::size_t contentEnd = tag.isBroken ? tag.end : tag.end - 1;
    const std::string_view content = _bytes.substr(tag.begin + 1, contentEnd - tag.begin - 1);
    const std::size_t nameEnd = std::min(content.find_first_of(kBlank), content.size());
    tag.name = upperCased(content.substr(0, nameEnd));
    tag.attributes = content.substr(nameEnd);
    return tag;
  }
}

std::string resolvedEntities(std::string_view text) {
  constexpr std::size_t kLongestName = 10;
  std::string result;
  std::size_t position = 0;
  for (std::size_t ampersand = text.find('&'); ampersand != kNone;
       ampersand = text.find('&', ampersand + 1)) {
    const std::string_view near = text.substr(ampersand + 1, kLongestName + 1);
    const std::size_t semicolon = near.find(';');
    if (semicolon == kNone || semicolon == 0) continue;
    const auto codePoint = codePointOf(near.substr(0, semicolon));
    if (!codePoint) continue;
    result += text.substr(position, ampersand - position);
    result += utf8Of(*codePoint);
    position = ampersand + semicolon + 2;
    ampersand = position - 1;
  }
  result += text.substr(position);
  return result;
}

std::string escapedForHtml(std::string_view text) {
  // Readers pass over blanks at the ends.
  const std::size_t first = text.find_first_not_of(kBlank);
  const std::size_t last = text.find_last_not_of(kBlank);
  std::string result;
  for (std::size_t i = 0; i < text.size(); ++i) {
    const char c = text[i];
    if (first == kNone || i < first || i > last)
      result += "&#" + std::to_string(static_cast<unsigned char>(c)) + ";";
    else if (c == '&')
      result += "&amp;";
    else if (c == '<')
      result += "&lt;";
    else if (c == '>')
      result += "&gt;";
    else if (c == '"')
      result += "&quot;";
    else
      result += c;
  }
  return result;
}

}  // namespace tools
