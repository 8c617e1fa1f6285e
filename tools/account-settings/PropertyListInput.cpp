#include "tools/account-settings/PropertyListInput.h"

#include <fmt/format.h>

#include <cstdint>
#include <span>

#include "propertylist/Reading.h"
#include "tools/account-settings/JsonForm.h"
#include "tools/common/ExitCode.h"
#include "tools/common/Files.h"

namespace tools {

propertylist::Value readPropertyListOfAnyForm(const std::string& path) {
  const std::string bytes = readWholeFile(path, propertylist::kMaximumFileSize);
  const bool isJson = looksLikeJson(bytes);
  propertylist::ReadResult read =
      isJson ? readJsonForm(bytes)
             : propertylist::readPropertyList(
                   {reinterpret_cast<const std::uint8_t*>(bytes.data()), bytes.size()});
  if (!read.value)
    throw CommandFailure(ExitCode::imageDamaged,
                         fmt::format("{}: {}{}; nothing was written; correct the file", path,
                                     isJson ? "as JSON: " : "", read.error.description()));
  return *std::move(read.value);
}

}  // namespace tools
