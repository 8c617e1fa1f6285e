#include "tools/device-image/import/ContentLines.h"

#include <algorithm>

namespace tools {
namespace {

constexpr std::size_t kNone = std::string_view::npos;

bool isNameLetter(char c) {
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '-' ||
         c == '_';
}

// A line that begins with a blank goes on with the line before it.
bool continuesALine(std::optional<char> c) { return c && (*c == ' ' || *c == '\t'); }

// The offset of the first of `wanted` outside quotation marks, at or after `position`.
std::size_t findOutsideQuotes(std::string_view text, std::string_view wanted,
                              std::size_t position) {
  bool quoted = false;
  for (std::size_t i = position; i < text.size(); ++i) {
    if (text[i] == '"') quoted = !quoted;
    if (!quoted && wanted.find(text[i]) != kNone) return i;
  }
  return kNone;
}

// Fills name, parameters and value from the unfolded text; leaves the name empty when it is none.
void splitProperty(std::string_view text, ContentLine& line) {
  const std::size_t nameEnd = text.find_first_of(";:");
  if (nameEnd == kNone) return;
  const std::size_t colon = text[nameEnd] == ':' ? nameEnd : findOutsideQuotes(text, ":", nameEnd);
  if (colon == kNone) return;
  std::string_view name = text.substr(0, nameEnd);
  const std::size_t dot = name.find('.');
  if (dot != kNone) name.remove_prefix(dot + 1);
  if (!std::all_of(name.begin(), name.end(), isNameLetter)) return;
  line.name = upperCased(name);
  if (nameEnd < colon) line.parameters = text.substr(nameEnd + 1, colon - nameEnd - 1);
  line.value = trimmed(text.substr(colon + 1));
}

}  // namespace

bool ContentLine::is(std::string_view propertyName, std::string_view propertyValue) const {
  return name == propertyName && equalsIgnoringCase(value, propertyValue);
}

std::optional<std::string> ContentLine::parameter(std::string_view parameterName) const {
  for (std::size_t start = 0; start < parameters.size();) {
    const std::size_t stop = std::min(findOutsideQuotes(parameters, ";", start), parameters.size());
    const std::string_view one = std::string_view(parameters).substr(start, stop - start);
    const std::size_t equals = one.find('=');
    if (equals != kNone && equalsIgnoringCase(one.substr(0, equals), parameterName)) {
      std::string_view found = one.substr(equals + 1);
      if (found.size() >= 2 && found.front() == '"' && found.back() == '"')
        found = found.substr(1, found.size() - 2);
      return std::string(found);
    }
    start = stop + 1;
  }
  return std::nullopt;
}

std::optional<ContentLine> ContentLines::next() {
  const std::optional<TextLine> first = _lines.next();
  if (!first) return std::nullopt;
  ContentLine line;
  line.begin = first->begin;
  line.end = first->end;
  line.number = first->number;
  std::string_view text = first->text;
  if (text.starts_with(kByteOrderMark)) {
    text.remove_prefix(kByteOrderMark.size());
    line.begin += kByteOrderMark.size();
  }
  std::string unfolded;
  while (continuesALine(_lines.peek())) {
    if (unfolded.empty()) unfolded = text;
    const std::optional<TextLine> more = _lines.next();
    unfolded += more->text.substr(1);
    line.end = more->end;
    text = unfolded;
  }
  line.isBlank = trimmed(text).empty();
  line.isText = tools::isText(text);
  splitProperty(text, line);
  return line;
}

std::string withLineEnd(std::string_view text) {
  std::string ended(text);
  if (ended.ends_with('\n')) return ended;
  const std::size_t first = text.find('\n');
  const bool hasReturns = first != std::string_view::npos && first > 0 && text[first - 1] == '\r';
  if (hasReturns && !ended.ends_with('\r')) ended += '\r';
  ended += '\n';
  return ended;
}

}  // namespace tools
