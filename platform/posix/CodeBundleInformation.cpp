#include "platform/posix/CodeBundleInformation.h"

#include <utility>

#include "platform/posix/PlainFileName.h"
#include "propertylist/Reading.h"

namespace platform {
namespace {

std::optional<std::string> stringUnder(const propertylist::Dictionary& dictionary,
                                       std::string_view key) {
  const propertylist::Text* text = propertylist::findString(dictionary, key);
  if (text == nullptr) return std::nullopt;
  return *text;
}

ReadCodeBundleInformation failure(std::string error) { return {std::nullopt, std::move(error)}; }

}  // namespace

ReadCodeBundleInformation readCodeBundleInformation(const std::string& bundlePath) {
  const std::string path = bundlePath + "/Info.plist";
  const propertylist::FileReadResult read = propertylist::readPropertyListFile(path);
  if (!read.value) return failure(path + " cannot be read: " + read.error);
  const propertylist::Dictionary* info = read.value->asDictionary();
  if (info == nullptr) return failure(path + " is no dictionary");
  const propertylist::Text* executable = propertylist::findString(*info, "Executable");
  if (executable == nullptr) return failure(path + " has no string \"Executable\"");
  if (!isPlainFileName(*executable))
    return failure("\"Executable\" in " + path + " is not the name of a file in the bundle");
  const propertylist::Value* version = info->find("PlatformInterfaceVersion");
  return {CodeBundleInformation{bundlePath + "/" + std::string(*executable),
                                stringUnder(*info, "PrincipalClass"),
                                stringUnder(*info, "BundleIdentifier"), stringUnder(*info, "Kind"),
                                version == nullptr ? std::nullopt : version->asInteger()},
          {}};
}

}  // namespace platform
