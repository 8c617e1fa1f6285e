#include "deviceimage/Journal.h"

#include <fcntl.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <ctime>

namespace deviceimage {
namespace {

constexpr std::string_view kHexDigits = "0123456789abcdef";
constexpr unsigned char kFirstPrintable = 0x20;
constexpr unsigned char kDelete = 0x7f;

void appendHex(std::string& line, unsigned char byte) {
  line += kHexDigits[byte >> 4U];
  line += kHexDigits[byte & 0xfU];
}

// The length of the UTF-8 sequence at the beginning of `text`, which is not empty; 0 when there is
// none.
std::size_t sequenceLength(std::string_view text) {
  const auto byteAt = [&](std::size_t i) { return static_cast<unsigned char>(text[i]); };
  const unsigned char first = byteAt(0);
  if (first < 0x80) return 1;
  const std::size_t length = first < 0xc2   ? 0
                             : first < 0xe0 ? 2
                             : first < 0xf0 ? 3
                             : first < 0xf5 ? 4
                                            : 0;
  if (length == 0 || text.size() < length) return 0;
  for (std::size_t i = 1; i < length; ++i)
    if ((byteAt(i) & 0xc0U) != 0x80) return 0;
  const bool isTooLong = (first == 0xe0 && byteAt(1) < 0xa0) || (first == 0xf0 && byteAt(1) < 0x90);
  const bool isNoCharacter =
      (first == 0xed && byteAt(1) > 0x9f) || (first == 0xf4 && byteAt(1) > 0x8f);
  return isTooLong || isNoCharacter ? 0 : length;
}

void appendJSON(std::string& line, std::string_view text) {
  line += '"';
  while (!text.empty()) {
    const std::size_t length = sequenceLength(text);
    const auto first = static_cast<unsigned char>(text.front());
    if (length == 0) {
      line += "\xef\xbf\xbd";
    } else if (first < kFirstPrintable || first == kDelete) {
      line += "\\u00";
      appendHex(line, first);
    } else {
      if (first == '"' || first == '\\') line += '\\';
      line += text.substr(0, length);
    }
    text.remove_prefix(length == 0 ? 1 : length);
  }
  line += '"';
}

void appendJSON(std::string& line, bool boolean) { line += boolean ? "true" : "false"; }
void appendJSON(std::string& line, std::int64_t number) { line += std::to_string(number); }
void appendJSON(std::string& line, const std::vector<std::string>& texts) {
  std::string_view separator = "[";
  for (const std::string& text : texts) {
    line += separator;
    appendJSON(line, std::string_view(text));
    separator = ", ";
  }
  if (texts.empty()) line += '[';
  line += ']';
}

}  // namespace

bool Journal::append(std::string_view line) {
  const std::scoped_lock lock(_mutex);
  if (!_file.isOpen())
    _file = Descriptor(_image->openFile(_name, O_WRONLY | O_APPEND | O_CREAT).descriptor);
  if (!_file.isOpen()) return false;
  const std::string whole = std::string(line) + "\n";
  std::string_view rest = whole;
  while (!rest.empty()) {
    const ssize_t written = ::write(_file.number(), rest.data(), rest.size());
    if (written < 0 && errno == EINTR) continue;
    if (written <= 0) return false;
    rest.remove_prefix(static_cast<std::size_t>(written));
  }
  return true;
}

std::string timestamp() {
  const std::time_t now = std::time(nullptr);
  std::tm parts{};
  std::array<char, sizeof "2026-11-21T03:04:05Z" + 8> text{};
  ::gmtime_r(&now, &parts);
  const std::size_t size = std::strftime(text.data(), text.size(), "%Y-%m-%dT%H:%M:%SZ", &parts);
  return {text.data(), size};
}

std::string oneLine(std::string_view text) {
  std::string line;
  line.reserve(text.size());
  for (std::size_t i = 0; i < text.size(); ++i) {
    const auto byte = static_cast<unsigned char>(text[i]);
    const bool isSecondBlock = byte == 0xc2 && i + 1 < text.size() &&
                               static_cast<unsigned char>(text[i + 1]) >= 0x80 &&
                               static_cast<unsigned char>(text[i + 1]) < 0xa0;
    if (byte == '\n') {
      line += "\\n";
    } else if (byte == '\t') {
      line += "\\t";
    } else if (byte == '\r') {
      line += "\\r";
    } else if (byte < kFirstPrintable || byte == kDelete) {
      line += "\\x";
      appendHex(line, byte);
    } else if (isSecondBlock) {
      line += "\\xc2\\x";
      appendHex(line, static_cast<unsigned char>(text[++i]));
    } else {
      line += text[i];
    }
  }
  return line;
}

std::string jsonLine(const JSONMembers& members) {
  std::string line = "{";
  for (const auto& [name, value] : members) {
    if (line.size() > 1) line += ", ";
    appendJSON(line, name);
    line += ": ";
    std::visit([&line](const auto& content) { appendJSON(line, content); }, value);
  }
  return line + "}";
}

}  // namespace deviceimage
