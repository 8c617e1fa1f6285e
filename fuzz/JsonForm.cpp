// Any bytes, read as the JSON form of a property list: a value or an error; what was read is
// written and read back the same.
#include "tools/account-settings/JsonForm.h"

#include <string>

#include "fuzz/Check.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string text(reinterpret_cast<const char*>(data), size);
  const propertylist::ReadResult read = tools::readJsonForm(text);
  FUZZ_CHECK(read.value.has_value() == read.error.what.empty());
  if (!read.value) return 0;
  const std::string written = tools::jsonFormText(*read.value);
  const propertylist::ReadResult again = tools::readJsonForm(written);
  FUZZ_CHECK(again.value == read.value);
  FUZZ_CHECK(tools::jsonFormText(*again.value) == written);
  return 0;
}
