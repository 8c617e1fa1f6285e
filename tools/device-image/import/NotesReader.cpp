#include "tools/device-image/import/NotesReader.h"

#include <map>
#include <optional>
#include <string>
#include <utility>

#include "deviceimage/ContentHash.h"
#include "tools/common/Timestamps.h"
#include "tools/device-image/import/ContentLines.h"

namespace tools {
namespace {

constexpr std::size_t kMaximumHeaderSize = std::size_t{64} << 10U;

// The header lines at the top of a message; `size` counts them with the empty line after them. A
// text whose first lines are not all headers has none.
struct Headers {
  std::map<std::string, std::string> values;  // by upper-case name; the first of a name counts
  std::size_t size = 0;
};

Headers headersOf(std::string_view message) {
  Headers headers;
  ContentLines lines(message.substr(0, kMaximumHeaderSize));
  while (const std::optional<ContentLine> line = lines.next()) {
    if (line->isBlank) {
      headers.size = line->end;
      return headers;
    }
    if (line->name.empty()) return {};
    std::string value =
        line->parameters.empty() ? line->value : line->parameters + ":" + line->value;
    headers.values.try_emplace(line->name, std::move(value));
  }
  // Headers alone are a note without text, unless they were cut off here.
  return message.size() <= kMaximumHeaderSize ? headers : Headers{};
}

void readNote(std::string_view bytes, std::size_t line, ReadText& result) {
  if (trimmed(bytes).empty()) {
    result.problems.push_back({line, "the note is empty", "write something into it"});
    return;
  }
  if (!isText(bytes)) {
    result.problems.push_back({line, "the note is not UTF-8 text", "save the file as UTF-8"});
    return;
  }
  if (bytes.size() > kMaximumRecordSize) {
    result.problems.push_back({line, "the note is larger than 16 MiB", "divide it"});
    return;
  }
  Headers headers = headersOf(bytes);
  TextRecord record;
  record.dataclass = deviceimage::Dataclass::notes;
  record.bytes = bytes;
  record.line = line;
  record.uid = std::move(headers.values["UID"]);
  if (record.uid.size() > kMaximumUIDSize) {
    result.problems.push_back({line, "the UID is longer than 1000 bytes", "give it a shorter UID"});
    return;
  }
  if (record.uid.empty()) record.uid = deviceimage::contentHash(bytes);
  record.modified = secondsOfISODate(headers.values["DATE"]);
  if (!record.modified) record.modified = secondsOfMessageDate(headers.values["DATE"]);
  result.records.push_back(std::move(record));
}

// The boundary of a multipart/digest message; empty for any other.
std::string boundaryOf(Headers& headers) {
  const std::string& type = headers.values["CONTENT-TYPE"];
  if (!equalsIgnoringCase(type.substr(0, type.find(';')), "multipart/digest")) return {};
  const std::size_t semicolon = type.find(';');
  if (semicolon == std::string::npos) return {};
  ContentLine line;
  line.parameters = trimmed(std::string_view(type).substr(semicolon + 1));
  return line.parameter("boundary").value_or(std::string());
}

// One part between two delimiters: a header block, which a digest leaves empty, and the note.
void readPart(std::string_view part, std::size_t line, ReadText& result) {
  TextLines lines(part);
  const std::optional<TextLine> blank = lines.next();
  if (blank && blank->text.empty())
    readNote(part.substr(blank->end), line + 1, result);
  else
    result.problems.push_back(
        {line, "the part does not begin with an empty line", "add an empty line before the note"});
}

void readDigest(std::string_view bytes, const std::string& boundary, ReadText& result) {
  const std::string delimiter = "--" + boundary;
  TextLines lines(bytes);
  std::optional<TextLine> start;  // the delimiter before the part
  while (const std::optional<TextLine> line = lines.next()) {
    if (!line->text.starts_with(delimiter)) continue;
    const std::string_view tail = line->text.substr(delimiter.size());
    if (!tail.empty() && tail != "--") continue;
    if (start) {
      // The line end before a delimiter is a part of the delimiter.
      const std::size_t size = line->begin - start->end;
      readPart(bytes.substr(start->end, size == 0 ? 0 : size - 1), start->number + 1, result);
    }
    start = line;
    if (tail == "--") return;
  }
  result.problems.push_back({start ? start->number : 1, "the digest has no end",
                             "add a last line of \"" + delimiter + "--\""});
}

}  // namespace

ReadText readNotes(std::string_view bytes) {
  ReadText result;
  Headers headers = headersOf(bytes);
  const std::string boundary = boundaryOf(headers);
  if (boundary.empty())
    readNote(bytes, 1, result);
  else
    readDigest(bytes, boundary, result);
  return result;
}

}  // namespace tools
