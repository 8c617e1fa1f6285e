#include "tests/propertylist/RandomValues.h"

#include <array>
#include <bit>
#include <cmath>

using propertylist::Array;
using propertylist::Bytes;
using propertylist::Date;
using propertylist::Dictionary;
using propertylist::Value;

Value RandomValues::_value(unsigned depth) {
  const std::uint64_t choice = _below(10);
  if (depth >= 5 || choice >= 4) return _leaf();
  const std::uint64_t size = _below(6);
  if (choice < 2) {
    Array array;
    for (std::uint64_t i = 0; i < size; ++i) array.append(_value(depth + 1));
    return array;
  }
  Dictionary dictionary;
  for (std::uint64_t i = 0; i < size; ++i) dictionary.set(_text(), _value(depth + 1));
  return dictionary;
}

Value RandomValues::_leaf() {
  switch (_below(6)) {
    case 0:
      return _integer();
    case 1:
      return _real();
    case 2:
      return _below(2) == 0;
    case 3:
      return _date();
    case 4: {
      Bytes data(_below(40));
      for (std::uint8_t& byte : data) byte = static_cast<std::uint8_t>(_below(256));
      return data;
    }
    default:
      return _text();
  }
}

Value RandomValues::_integer() {
  const std::uint64_t bits = _random() >> _below(64);
  if (_below(2) == 0) return bits;
  return static_cast<std::int64_t>(bits);
}

double RandomValues::_real() {
  const std::array<double, 6> special{0.0,      1.5,      5e-324, 1.7976931348623157e308,
                                      INFINITY, -INFINITY};
  if (_below(3) == 0) return special[_below(special.size())];
  const double real = std::bit_cast<double>(_random());
  return std::isnan(real) ? 1.0 : real;
}

// Whole seconds from the year 1 to 9999, as other programs can hold.
Date RandomValues::_date() {
  constexpr std::int64_t kFirst = -63113904000;
  constexpr std::uint64_t kSeconds = 315537897600;
  return Date{static_cast<double>(kFirst + static_cast<std::int64_t>(_below(kSeconds)))};
}

std::string RandomValues::_text() {
  const std::array<const char*, 10> pieces{
      "a",        "Identifier",   "<&>\"'",           "\n\t", "x ]]>",
      "\xC3\xA4", "\xE6\x97\xA5", "\xF0\x9F\x98\x80", "\r",   "\xEF\xBB\xBF"};
  std::string text;
  for (std::uint64_t i = _below(8); i > 0; --i) {
    if (_form == Form::binary && _below(8) == 0) {
      text += static_cast<char>(_below(32));
    } else {
      text += pieces[_below(pieces.size())];
    }
  }
  if (_below(16) == 0) text.append(_below(300), 'z');
  return text;
}
