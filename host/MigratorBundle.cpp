#include "host/MigratorBundle.h"

#include <algorithm>
#include <filesystem>
#include <string_view>
#include <system_error>
#include <utility>

#include "host/BundleTrust.h"
#include "platform/DataClassMigrator.h"
#include "propertylist/Reading.h"

namespace host {
namespace {

using propertylist::Dictionary;

constexpr std::string_view kKind = "DataClassMigrator";
constexpr std::string_view kSuffix = ".migrator";
constexpr std::string_view kAgain = "; install the migrator again.";
constexpr TrustWords kTrustWords = {"the migrator", "the user who runs the host",
                                    "install the migrator again"};

bool isPlainName(const std::string& name) {
  return !name.empty() && name != "." && name != ".." && name.find('/') == std::string::npos &&
         name.find('\0') == std::string::npos;
}

// A file below the bundle's folder, by its parts.
bool isInside(const std::string& name) {
  const std::filesystem::path path(name);
  return !name.empty() &&
         std::all_of(path.begin(), path.end(),
                     [](const std::filesystem::path& part) { return isPlainName(part.string()); });
}

std::vector<std::string> stringsUnder(const Dictionary& information, std::string_view key) {
  std::vector<std::string> strings;
  const propertylist::Array* array = propertylist::findArray(information, key);
  if (array == nullptr) return strings;
  for (const propertylist::Value& value : *array)
    if (const propertylist::Text* text = value.asString()) strings.push_back(*text);
  return strings;
}

// Collects what is wrong with one bundle while its parts are read.
class Reader {
 public:
  explicit Reader(std::string folder) : _folder(std::move(folder)) {}

  ReadBundle read() {
    MigratorBundle bundle;
    bundle.path = _folder;
    if (_isTrusted(_folder) && _isTrusted(_file("Info.plist"))) _readInformation(bundle);
    if (!_problems.empty()) return {std::nullopt, std::move(_problems)};
    return {std::move(bundle), {}};
  }

 private:
  std::string _file(const std::string& name) const { return _folder + "/" + name; }

  bool _isTrusted(const std::string& path) {
    auto reason = whyNotTrusted(path, kTrustWords);
    if (reason) _problems.push_back(std::move(*reason));
    return !reason;
  }

  void _complain(std::string_view what) {
    _problems.push_back(_file("Info.plist") + " " + std::string(what) + std::string(kAgain));
  }

  void _readInformation(MigratorBundle& bundle) {
    const propertylist::FileReadResult read =
        propertylist::readPropertyListFile(_file("Info.plist"));
    const Dictionary* information = read.value ? read.value->asDictionary() : nullptr;
    if (information == nullptr) {
      _complain("is no dictionary" + (read.error.empty() ? "" : " (" + read.error + ")"));
      return;
    }
    _checkKind(*information);
    const propertylist::Text* name = propertylist::findString(*information, "Name");
    bundle.name = name != nullptr ? *name : std::filesystem::path(_folder).stem().string();
    _readCode(*information, bundle);
    _readSelection(*information, bundle);
    _checkResources(*information, bundle);
  }

  void _checkKind(const Dictionary& information) {
    const propertylist::Text* kind = propertylist::findString(information, "Kind");
    if (kind == nullptr || *kind != kKind) _complain("does not name a data-class migrator");
    const propertylist::Value* version = information.find("PlatformInterfaceVersion");
    const auto number = version != nullptr ? version->asInteger() : std::nullopt;
    if (number != platform::kPlatformInterfaceVersion)
      _problems.push_back(_file("Info.plist") + " names version " +
                          (number ? std::to_string(*number) : std::string("(none)")) +
                          " of the platform's interfaces, this host offers " +
                          std::to_string(platform::kPlatformInterfaceVersion) +
                          "; install the migrator that belongs to this host.");
  }

  void _readCode(const Dictionary& information, MigratorBundle& bundle) {
    const propertylist::Text* principalClass =
        propertylist::findString(information, "PrincipalClass");
    if (principalClass == nullptr || principalClass->empty())
      _complain("names no principal class");
    else
      bundle.principalClass = *principalClass;
    const propertylist::Text* executable = propertylist::findString(information, "Executable");
    if (executable == nullptr || !isPlainName(*executable)) {
      _complain("names no executable in the bundle");
      return;
    }
    bundle.executable = _file(*executable);
    if (_isTrusted(bundle.executable) && !std::filesystem::is_regular_file(bundle.executable))
      _problems.push_back(bundle.executable + " is no file" + std::string(kAgain));
  }

  void _readSelection(const Dictionary& information, MigratorBundle& bundle) {
    bundle.retiredAccountTypes = stringsUnder(information, "RetiredAccountTypes");
    bundle.correctedAccountKeys = stringsUnder(information, "CorrectedAccountKeys");
    bundle.addedAccountTypes = stringsUnder(information, "AddedAccountTypes");
    if (const Dictionary* accounts =
            propertylist::findDictionary(information, "UnkeepableAccounts"))
      bundle.unkeepableAccounts = {stringsUnder(*accounts, "AccountTypes"),
                                   stringsUnder(*accounts, "KnownClasses"),
                                   stringsUnder(*accounts, "KnownPathParts")};
    const propertylist::Value* status = information.find("RetiredServiceStatus");
    if (status != nullptr && status->asInteger())
      bundle.retiredServiceStatus = *status->asInteger();
    else if (!bundle.retiredAccountTypes.empty())
      _complain("names account types to retire and no service status");
  }

  void _checkResources(const Dictionary& information, MigratorBundle& bundle) {
    for (const std::string& name : stringsUnder(information, "RequiredResources"))
      _checkResource(name);
    const propertylist::Text* types = propertylist::findString(information, "AccountTypesResource");
    if (types == nullptr) return;
    const auto catalogue = _checkResource(std::string(*types) + ".plist");
    const Dictionary* byType = catalogue ? catalogue->asDictionary() : nullptr;
    if (byType == nullptr) return;
    bundle.accountTypes.emplace();
    for (const Dictionary::Entry& entry : *byType) bundle.accountTypes->push_back(entry.key());
  }

  // The value of a property list among the resources, when it is one.
  std::optional<propertylist::Value> _checkResource(const std::string& name) {
    if (!isInside(name)) {
      _complain("names a resource outside the bundle");
      return std::nullopt;
    }
    if (!_isTrusted(_file(name)) || std::filesystem::path(name).extension() != ".plist")
      return std::nullopt;
    propertylist::FileReadResult read = propertylist::readPropertyListFile(_file(name));
    if (!read.value || read.value->asDictionary() == nullptr) {
      _problems.push_back(_file(name) + " is no dictionary" +
                          (read.error.empty() ? "" : " (" + read.error + ")") +
                          std::string(kAgain));
      return std::nullopt;
    }
    return std::move(read.value);
  }

  std::string _folder;
  std::vector<std::string> _problems;
};

std::vector<std::string> bundleNamesIn(const std::string& directory) {
  std::vector<std::string> names;
  std::error_code error;
  for (std::filesystem::directory_iterator each(directory, error), end; !error && each != end;
       each.increment(error))
    if (each->path().extension() == kSuffix) names.push_back(each->path().filename().string());
  std::sort(names.begin(), names.end());
  return names;
}

}  // namespace

ReadBundle readMigratorBundle(const std::string& path) {
  std::error_code error;
  const std::filesystem::path folder = std::filesystem::canonical(path, error);
  if (error)
    return {std::nullopt,
            {path + " cannot be opened: " + error.message() + "; name the folder of a migrator."}};
  if (!std::filesystem::is_directory(folder))
    return {std::nullopt, {path + " is no folder; name the folder of a migrator."}};
  return Reader(folder.string()).read();
}

std::vector<ReadBundle> readMigratorBundlesOfImage(const deviceimage::DeviceImage& image) {
  std::vector<ReadBundle> bundles;
  for (const std::string& name : image.namesIn(deviceimage::DeviceImage::kMigratorsDirectory)) {
    if (!name.ends_with(kSuffix)) continue;
    const std::string folder =
        std::string(deviceimage::DeviceImage::kMigratorsDirectory) + "/" + name;
    const auto read = image.readPropertyList(folder + "/Info.plist");
    const Dictionary* information = read.value ? read.value->asDictionary() : nullptr;
    const propertylist::Text* kind =
        information != nullptr ? propertylist::findString(*information, "Kind") : nullptr;
    if (kind == nullptr || *kind != kKind) continue;
    bundles.push_back(Reader(image.absolutePath(folder)).read());
  }
  return bundles;
}

ReadBundle readInstalledMigratorBundle(const std::string& directory) {
  const std::vector<std::string> names = bundleNamesIn(directory);
  if (names.size() == 1) return readMigratorBundle(directory + "/" + names.front());
  return {std::nullopt,
          {directory + (names.empty() ? " holds no migrator" : " holds more than one migrator") +
           "; install the host and its migrator again, or name one with --bundle."}};
}

}  // namespace host
