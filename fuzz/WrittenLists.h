#pragma once

#include <string>

#include "fuzz/Check.h"
#include "propertylist/Reading.h"
#include "propertylist/Writing.h"

namespace fuzz {

inline propertylist::Bytes bytesOf(const std::string& text) { return {text.begin(), text.end()}; }

// What can be written in the binary form is read back equal, and written again it gives the same
// bytes, which are the result.
inline propertylist::Bytes checkBinaryForm(const propertylist::Value& value) {
  std::optional<propertylist::Bytes> written = propertylist::writeBinaryPropertyList(value);
  FUZZ_CHECK(written.has_value());
  const propertylist::ReadResult again = propertylist::readBinaryPropertyList(*written);
  FUZZ_CHECK(again.value == value);
  FUZZ_CHECK(propertylist::writeBinaryPropertyList(*again.value) == written);
  return std::move(*written);
}

// The same for a value that the XML form can hold, down to its dates.
inline std::string checkXMLForm(const propertylist::Value& value) {
  std::optional<std::string> written = propertylist::writeXMLPropertyList(value);
  FUZZ_CHECK(written.has_value());
  const propertylist::ReadResult again = propertylist::readXMLPropertyList(bytesOf(*written));
  FUZZ_CHECK(again.value == value);
  FUZZ_CHECK(propertylist::writeXMLPropertyList(*again.value) == written);
  return std::move(*written);
}

}  // namespace fuzz
