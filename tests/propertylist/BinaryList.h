#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "propertylist/Value.h"

// A binary property list made by hand, good or bad: its objects as raw bytes, the first one on top.
struct BinaryList {
  std::vector<std::string> objects;
  std::uint8_t offsetSize = 4;
  std::uint8_t referenceSize = 1;
  std::uint64_t top = 0;
  // The places of the objects, where they are not to be those of `objects`.
  std::vector<std::uint64_t> offsets = {};

  propertylist::Bytes bytes() const;
};

// `number` in `size` bytes, the highest first.
std::string bigEndian(std::uint64_t number, std::size_t size);
// A marker and raw bytes behind it.
std::string object(std::uint8_t marker, const std::string& contents = "");
// An array or dictionary with references of `size` bytes and a count in the long form.
std::string container(std::uint8_t type, std::size_t count,
                      const std::vector<std::uint64_t>& references, std::size_t size);
