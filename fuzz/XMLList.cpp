// Any bytes, read as an XML property list: a value or an error with its place; what was read can be
// written in both forms.
#include <span>

#include "fuzz/WrittenLists.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const propertylist::ReadResult result =
      propertylist::readXMLPropertyList(std::span<const std::uint8_t>(data, size));
  FUZZ_CHECK(result.value.has_value() == result.error.what.empty());
  if (!result.value) {
    FUZZ_CHECK(result.error.line.has_value() && *result.error.line <= size + 1);
    FUZZ_CHECK(result.error.column.has_value() && *result.error.column <= size + 1);
    return 0;
  }
  FUZZ_CHECK(propertylist::describe(*result.value).size() <= propertylist::kMaximumDescription + 3);
  fuzz::checkXMLForm(*result.value);
  fuzz::checkBinaryForm(*result.value);
  return 0;
}
