// Any bytes, read as a binary property list: a value or an error with its place, and a value that
// was read is compared, described and written like any other; of those that stand for thousands of
// values, a share.
#include <span>

#include "fuzz/Share.h"
#include "fuzz/WrittenLists.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::span<const std::uint8_t> bytes(data, size);
  const propertylist::ReadResult result = propertylist::readBinaryPropertyList(bytes);
  FUZZ_CHECK(result.value.has_value() == result.error.what.empty());
  if (!result.value) {
    FUZZ_CHECK(result.error.byteOffset.has_value() && *result.error.byteOffset <= size);
    return 0;
  }
  if (!fuzz::isChosen(*result.value, bytes)) return 0;
  FUZZ_CHECK(propertylist::readPropertyList(bytes).value == result.value);
  FUZZ_CHECK(propertylist::describe(*result.value).size() <= propertylist::kMaximumDescription + 3);
  fuzz::checkBinaryForm(*result.value);
  return 0;
}
