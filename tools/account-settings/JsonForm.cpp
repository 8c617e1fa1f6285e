#include "tools/account-settings/JsonForm.h"

#include <fmt/format.h>

#include <array>
#include <bit>
#include <charconv>
#include <cmath>
#include <cstdint>
#include <limits>
#include <nlohmann/json.hpp>
#include <optional>
#include <set>
#include <utility>
#include <vector>

#include "propertylist/LeafText.h"
#include "tools/account-settings/ExactDates.h"

namespace tools {

using nlohmann::json;
using propertylist::Array;
using propertylist::Date;
using propertylist::Dictionary;
using propertylist::Value;

namespace {

constexpr const char* kDateKey = "@date";
constexpr const char* kDataKey = "@data";
constexpr const char* kRealKey = "@real";
constexpr std::uint64_t kPlainNan =
    std::bit_cast<std::uint64_t>(std::numeric_limits<double>::quiet_NaN());

std::string quoted(const std::string& text) { return json(text).dump(); }

std::string tagged(const char* key, const std::string& text) {
  return fmt::format("{{\"{}\": {}}}", key, text);
}

// With "." or exponent.
std::string finiteText(double real) {
  std::array<char, 32> buffer{};
  const auto written = std::to_chars(buffer.data(), buffer.data() + buffer.size(), real);
  std::string text(buffer.data(), written.ptr);
  if (text.find_first_of(".e") == std::string::npos) text += ".0";
  return text;
}

std::string realForm(double real) {
  if (std::isfinite(real)) return finiteText(real);
  if (std::isinf(real)) return tagged(kRealKey, real > 0 ? "\"inf\"" : "\"-inf\"");
  const auto bits = std::bit_cast<std::uint64_t>(real);
  return tagged(kRealKey, bits == kPlainNan ? "\"nan\"" : fmt::format("\"nan:{:016x}\"", bits));
}

std::string dateForm(Date date) {
  if (const auto text = exactDateText(date)) return tagged(kDateKey, quoted(*text));
  return tagged(kDateKey, realForm(date.secondsSince2001));
}

class Writer {
 public:
  std::string text;

  void write(const Value& value) {
    if (const Dictionary* const dictionary = value.asDictionary()) return _write(*dictionary);
    if (const Array* const array = value.asArray()) return _write(*array);
    text += _leaf(value);
  }

 private:
  static std::string _leaf(const Value& value) {
    if (const propertylist::Text* const string = value.asString())
      return quoted(std::string(*string));
    if (const auto boolean = value.asBoolean()) return *boolean ? "true" : "false";
    if (const auto integer = value.asInteger()) return std::to_string(*integer);
    if (const auto integer = value.asUnsigned()) return std::to_string(*integer);
    if (const auto real = value.asReal()) return realForm(*real);
    if (const auto date = value.asDate()) return dateForm(*date);
    return tagged(kDataKey, '"' + propertylist::base64Text(*value.asData()) + '"');
  }

  void _write(const Dictionary& dictionary) {
    if (dictionary.empty()) {
      text += "{}";
      return;
    }
    const bool isEscaped = dictionary.size() == 1 && dictionary.begin()->key().starts_with('@');
    char before = '{';
    ++_depth;
    for (const Dictionary::Entry& entry : dictionary) {
      _newLine(before);
      text += quoted((isEscaped ? "@" : "") + std::string(entry.key())) + ": ";
      write(entry.value());
      before = ',';
    }
    --_depth;
    _newLine({});
    text += '}';
  }

  void _write(const Array& array) {
    if (array.empty()) {
      text += "[]";
      return;
    }
    char before = '[';
    ++_depth;
    for (const Value& member : array) {
      _newLine(before);
      write(member);
      before = ',';
    }
    --_depth;
    _newLine({});
    text += ']';
  }

  void _newLine(char before) {
    if (before != '\0') text += before;
    text += '\n';
    text.append(_depth * 2, ' ');
  }

  std::size_t _depth = 0;
};

std::optional<Value> realOf(std::string_view text) {
  if (text == "nan") return Value(std::numeric_limits<double>::quiet_NaN());
  if (text == "inf") return Value(std::numeric_limits<double>::infinity());
  if (text == "-inf") return Value(-std::numeric_limits<double>::infinity());
  constexpr std::string_view kBits = "nan:";
  if (!text.starts_with(kBits) || text.size() != kBits.size() + 16) return std::nullopt;
  text.remove_prefix(kBits.size());
  std::uint64_t bits = 0;
  const auto read = std::from_chars(text.data(), text.data() + text.size(), bits, 16);
  const auto real = std::bit_cast<double>(bits);
  if (read.ec != std::errc{} || read.ptr != text.data() + text.size() || !std::isnan(real))
    return std::nullopt;
  return Value(real);
}

// The value that the one entry of a dictionary stands for; empty when it stands for none.
std::optional<Value> untagged(const std::string& key, const Value& value) {
  if (key == kDateKey && value.asReal()) return Value(Date{*value.asReal()});
  const propertylist::Text* const text = value.asString();
  if (text == nullptr) return std::nullopt;
  if (key == kDateKey) {
    const auto date = parseExactDateText(*text);
    return date ? std::optional<Value>(*date) : std::nullopt;
  }
  if (key == kDataKey) {
    const auto data = propertylist::parseBase64(*text);
    return data ? std::optional<Value>(*data) : std::nullopt;
  }
  return key == kRealKey ? realOf(*text) : std::nullopt;
}

// Builds the value from the parser's calls; each answers whether to go on.
class Builder : public nlohmann::json_sax<json> {
 public:
  std::optional<Value> root;
  propertylist::ReadError error;

  bool null() override { return _fail("null is no value of a property list"); }
  bool boolean(bool value) override { return _add(value); }
  bool number_integer(json::number_integer_t value) override { return _add(value); }
  bool number_unsigned(json::number_unsigned_t value) override { return _add(value); }
  bool number_float(json::number_float_t value, const std::string& text) override {
    // The parser makes a real of an integer that does not fit.
    if (text.find_first_of(".eE") == std::string::npos)
      return _fail("the integer does not fit into 64 bits");
    return _add(value);
  }
  bool string(std::string& text) override { return _add(std::string_view(text)); }
  bool binary(json::binary_t& /*bytes*/) override { return false; }  // not in texts

  bool start_object(std::size_t /*size*/) override { return _open(true); }
  bool start_array(std::size_t /*size*/) override { return _open(false); }
  bool key(std::string& text) override {
    _frames.back().key = text;
    return true;
  }
  bool end_object() override;
  bool end_array() override;
  bool parse_error(std::size_t position, const std::string& /*lastToken*/,
                   const json::exception& problem) override {
    // "[json.exception.parse_error.101] parse error at line 1, column 2: ..."
    const std::string_view text = problem.what();
    const std::size_t end = text.find("] ");
    error.what = text.substr(end == std::string_view::npos ? 0 : end + 2);
    if (error.what.find("column") == std::string::npos) error.byteOffset = position;
    return false;
  }

 private:
  struct Frame {
    bool isDictionary = false;
    std::string key;  // of the value that comes next
    std::vector<Dictionary::Entry> entries;
    std::vector<Value> members;
  };

  bool _fail(const std::string& what) {
    std::string way;
    for (const Frame& frame : _frames) {
      if (!frame.isDictionary)
        way += fmt::format("[{}]", frame.members.size());
      else if (!frame.key.empty())
        way += (way.empty() ? "" : ".") + frame.key;
    }
    error.what = way.empty() ? what : fmt::format("{} (at {})", what, way);
    return false;
  }

  bool _add(Value value) {
    if (_frames.empty()) {
      root = std::move(value);
    } else if (_frames.back().isDictionary) {
      _frames.back().entries.emplace_back(std::move(_frames.back().key), std::move(value));
      _frames.back().key.clear();
    } else {
      _frames.back().members.push_back(std::move(value));
    }
    return true;
  }

  bool _open(bool isDictionary) {
    // One more than is allowed, for an object that stands for a date or data.
    if (_frames.size() > propertylist::kMaximumDepth) return _failTooDeep();
    _frames.emplace_back().isDictionary = isDictionary;
    return true;
  }

  bool _failTooDeep() {
    error.what = fmt::format("it is nested deeper than {} levels", propertylist::kMaximumDepth);
    return false;
  }

  std::vector<Frame> _frames;
};

bool Builder::end_array() {
  if (_frames.size() > propertylist::kMaximumDepth) return _failTooDeep();
  Value array = Array(std::move(_frames.back().members));
  _frames.pop_back();
  return _add(std::move(array));
}

bool Builder::end_object() {
  std::vector<Dictionary::Entry> entries = std::move(_frames.back().entries);
  if (entries.size() == 1 && entries.front().key().starts_with('@')) {
    const std::string key = entries.front().key();
    if (!key.starts_with("@@")) {
      std::optional<Value> value = untagged(key, entries.front().value());
      _frames.pop_back();
      if (!value)
        return _fail(fmt::format(
            "the value of {} is not understood; write a date as {{\"@date\": "
            "\"2026-11-21T02:40:00Z\"}}, data as {{\"@data\": BASE64}}, and \"@\" twice before a "
            "key of your own",
            quoted(key)));
      return _add(*std::move(value));
    }
    const Value value = entries.front().value();
    entries.clear();
    entries.emplace_back(key.substr(1), value);
  }
  if (_frames.size() > propertylist::kMaximumDepth) return _failTooDeep();
  const std::size_t count = entries.size();
  Dictionary dictionary(std::move(entries));
  if (dictionary.size() != count) return _fail("an object has a key twice");
  _frames.pop_back();
  return _add(std::move(dictionary));
}

}  // namespace

std::string jsonFormText(const Value& value) {
  Writer writer;
  writer.write(value);
  writer.text += '\n';
  return std::move(writer.text);
}

propertylist::ReadResult readJsonForm(std::string_view text) {
  Builder builder;
  if (!json::sax_parse(text.begin(), text.end(), &builder)) return {std::nullopt, builder.error};
  return {std::move(builder.root), {}};
}

bool looksLikeJson(std::string_view text) {
  constexpr std::string_view kByteOrderMark = "\xEF\xBB\xBF";
  if (text.starts_with(kByteOrderMark)) text.remove_prefix(kByteOrderMark.size());
  const std::size_t first = text.find_first_not_of(" \t\r\n");
  return first != std::string_view::npos && !text.starts_with("bplist") &&
         std::string_view("{[\"-0123456789tfn").find(text[first]) != std::string_view::npos;
}

}  // namespace tools
