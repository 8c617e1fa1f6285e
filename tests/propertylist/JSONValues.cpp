#include "tests/propertylist/JSONValues.h"

#include <array>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <stdexcept>

using nlohmann::json;
using propertylist::Array;
using propertylist::Bytes;
using propertylist::Date;
using propertylist::Dictionary;
using propertylist::Kind;
using propertylist::Value;

namespace {

constexpr std::string_view kAlphabet =
    "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";

double realOf(const std::string& text) { return std::strtod(text.c_str(), nullptr); }

Date dateOf(const std::string& text) {
  std::tm parts{};
  if (text.back() != 'Z') return Date{realOf(text)};
  const char* const end = ::strptime(text.c_str(), "%Y-%m-%dT%H:%M:%SZ", &parts);
  if (end == nullptr || *end != '\0') throw std::runtime_error("no date: " + text);
  constexpr std::time_t k2001 = 978307200;
  return Date{static_cast<double>(::timegm(&parts) - k2001)};
}

Value integerOf(const std::string& text) {
  if (text.front() == '-') return Value(std::strtoll(text.c_str(), nullptr, 10));
  return Value(std::strtoull(text.c_str(), nullptr, 10));
}

std::string hexadecimal(double real) {
  std::array<char, 40> text{};
  const int length = std::snprintf(text.data(), text.size(), "%a", real);
  return {text.data(), static_cast<std::size_t>(length)};
}

}  // namespace

Value valueFromJSON(const json& object) {
  const std::string kind = object.begin().key();
  const json& content = object.begin().value();
  if (kind == "string") return content.get<std::string>();
  if (kind == "integer") return integerOf(content.get<std::string>());
  if (kind == "real") return realOf(content.get<std::string>());
  if (kind == "boolean") return content.get<bool>();
  if (kind == "date") return dateOf(content.get<std::string>());
  if (kind == "data") {
    const std::string bytes = bytesOfBase64(content.get<std::string>());
    return Bytes(bytes.begin(), bytes.end());
  }
  if (kind == "array") {
    Array array;
    for (const json& member : content) array.append(valueFromJSON(member));
    return array;
  }
  if (kind != "dict") throw std::runtime_error("no kind of value: " + kind);
  Dictionary dictionary;
  for (const json& pair : content) {
    dictionary.set(pair[0].get<std::string>(), valueFromJSON(pair[1]));
  }
  return dictionary;
}

json jsonFromValue(const Value& value) {
  switch (value.kind()) {
    case Kind::string:
      return {{"string", *value.asString()}};
    case Kind::integer:
      return {{"integer", value.asInteger() ? std::to_string(*value.asInteger())
                                            : std::to_string(*value.asUnsigned())}};
    case Kind::real:
      return {{"real", hexadecimal(*value.asReal())}};
    case Kind::boolean:
      return {{"boolean", *value.asBoolean()}};
    case Kind::date:
      return {{"date", hexadecimal(value.asDate()->secondsSince2001)}};
    case Kind::data:
      return {{"data", base64(std::string(value.asData()->begin(), value.asData()->end()))}};
    case Kind::array: {
      json members = json::array();
      for (const Value& member : *value.asArray()) members.push_back(jsonFromValue(member));
      return {{"array", members}};
    }
    case Kind::dictionary:
      break;
  }
  json pairs = json::array();
  for (const Dictionary::Entry& entry : *value.asDictionary()) {
    pairs.push_back(json::array({entry.key(), jsonFromValue(entry.value())}));
  }
  return {{"dict", pairs}};
}

std::string base64(const std::string& bytes) {
  std::string text;
  unsigned bits = 0;
  unsigned bitCount = 0;
  for (const char byte : bytes) {
    bits = (bits << 8U | static_cast<unsigned char>(byte)) & 0xFFFFFFU;
    for (bitCount += 8; bitCount >= 6; bitCount -= 6) {
      text += kAlphabet[bits >> (bitCount - 6) & 0x3FU];
    }
  }
  if (bitCount > 0) text += kAlphabet[bits << (6 - bitCount) & 0x3FU];
  while (text.size() % 4 != 0) text += '=';
  return text;
}

std::string bytesOfBase64(const std::string& text) {
  std::string bytes;
  unsigned bits = 0;
  unsigned bitCount = 0;
  for (const char c : text) {
    const std::size_t digit = kAlphabet.find(c);
    if (digit == std::string_view::npos) break;  // padding
    bits = (bits << 6U | static_cast<unsigned>(digit)) & 0xFFFFFFU;
    bitCount += 6;
    if (bitCount >= 8) {
      bitCount -= 8;
      bytes += static_cast<char>(static_cast<unsigned char>(bits >> bitCount));
    }
  }
  return bytes;
}
