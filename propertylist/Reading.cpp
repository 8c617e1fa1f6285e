#include "propertylist/Reading.h"

#include <algorithm>
#include <string_view>

namespace propertylist {
namespace {

constexpr std::string_view kBinaryPrefix = "bplist";

}  // namespace

ReadResult readPropertyList(std::span<const std::uint8_t> bytes) {
  const bool isBinary = bytes.size() >= kBinaryPrefix.size() &&
                        std::equal(kBinaryPrefix.begin(), kBinaryPrefix.end(), bytes.begin());
  return isBinary ? readBinaryPropertyList(bytes) : readXMLPropertyList(bytes);
}

std::string ReadError::description() const {
  std::string text = what;
  if (byteOffset) text += " at byte " + std::to_string(*byteOffset);
  if (line) text += " in line " + std::to_string(*line);
  if (column) text += ", column " + std::to_string(*column);
  return text;
}

}  // namespace propertylist
