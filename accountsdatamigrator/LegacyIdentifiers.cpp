#include "accountsdatamigrator/LegacyIdentifiers.h"

#include <array>
#include <cstddef>
#include <iterator>
#include <utility>
#include <vector>

#include "propertylist/Writing.h"

namespace accountsdatamigrator {

using propertylist::Bytes;
using propertylist::Dictionary;
using propertylist::Value;

namespace {

constexpr std::ptrdiff_t kLongestPart = 1024;

template <typename Text>
bool isLong(const Text& text) {
  return std::ssize(text) > kLongestPart;
}

// Of one that is long.
template <typename Text>
Value beginningOf(const Text& text) {
  return Bytes(text.begin(), text.begin() + kLongestPart);
}

// The entry as far as it counts for its identifier.
Dictionary digestedPart(const Dictionary& entry) {
  std::vector<Dictionary::Entry> part;
  for (const Dictionary::Entry& each : entry) {
    const propertylist::Text& key = each.key();
    const Value& value = each.value();
    if (isLong(key) || value.asDictionary() != nullptr || value.asArray() != nullptr) continue;
    const propertylist::Text* const text = value.asString();
    const Bytes* const data = value.asData();
    if (text != nullptr && isLong(*text))
      part.emplace_back(key, beginningOf(*text));
    else if (data != nullptr && isLong(*data))
      part.emplace_back(key, beginningOf(*data));
    else
      part.push_back(each);
  }
  return Dictionary(std::move(part));
}

// 128 bits of a digest in the form of a UUID of version 8, which is for such.
std::string identifierFrom(const Bytes& bytes) {
  std::array<std::uint64_t, 2> halves = {0xCBF29CE484222325U, 0x84222325CBF29CE4U};
  for (const std::uint8_t byte : bytes)
    for (std::uint64_t& half : halves) half = (half ^ byte) * 0x100000001B3U + (half >> 47U);
  halves[0] = (halves[0] & ~std::uint64_t{0xF000}) | 0x8000U;
  halves[1] = (halves[1] & (~std::uint64_t{0} >> 2U)) | (std::uint64_t{1} << 63U);
  std::string text;
  for (const std::uint64_t half : halves)
    for (int shift = 60; shift >= 0; shift -= 4) {
      if (text.size() == 8 || text.size() == 13 || text.size() == 18 || text.size() == 23)
        text += '-';
      text += "0123456789ABCDEF"[(half >> static_cast<unsigned>(shift)) & 0xFU];
    }
  return text;
}

}  // namespace

std::string LegacyIdentifiers::make(const Dictionary& entry) {
  Bytes bytes = propertylist::writeBinaryPropertyList(digestedPart(entry)).value_or(Bytes());
  std::string made = identifierFrom(bytes);
  if (take(made)) return made;
  // An entry with equal content came before. The next try is the one after its last.
  std::uint32_t& tries = _tries[made];
  const std::size_t size = bytes.size();
  do {
    ++tries;
    bytes.resize(size);
    for (unsigned shift = 0; shift < 32; shift += 8)
      bytes.push_back(static_cast<std::uint8_t>(tries >> shift));
    made = identifierFrom(bytes);
  } while (!take(made));
  return made;
}

}  // namespace accountsdatamigrator
