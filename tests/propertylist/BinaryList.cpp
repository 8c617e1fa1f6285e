#include "tests/propertylist/BinaryList.h"

propertylist::Bytes BinaryList::bytes() const {
  std::string file = "bplist00";
  std::vector<std::uint64_t> places;
  for (const std::string& raw : objects) {
    places.push_back(file.size());
    file += raw;
  }
  if (!offsets.empty()) places = offsets;
  const std::uint64_t table = file.size();
  for (const std::uint64_t place : places) file += bigEndian(place, offsetSize);
  file += std::string(6, '\0') + bigEndian(offsetSize, 1) + bigEndian(referenceSize, 1);
  file += bigEndian(places.size(), 8) + bigEndian(top, 8) + bigEndian(table, 8);
  return {file.begin(), file.end()};
}

std::string bigEndian(std::uint64_t number, std::size_t size) {
  std::string bytes(size, '\0');
  for (std::size_t i = 0; i < size; ++i) {
    bytes[size - 1 - i] = static_cast<char>(static_cast<unsigned char>(number));
    number = size > 1 ? number >> 8U : 0;
  }
  return bytes;
}

std::string object(std::uint8_t marker, const std::string& contents) {
  return bigEndian(marker, 1) + contents;
}

std::string container(std::uint8_t type, std::size_t count,
                      const std::vector<std::uint64_t>& references, std::size_t size) {
  std::string raw = object(type | 0x0FU, object(0x12, bigEndian(count, 4)));
  for (const std::uint64_t reference : references) raw += bigEndian(reference, size);
  return raw;
}
