#include "platform/posix/DlAddrBundleResources.h"

#include <dlfcn.h>
#include <sys/stat.h>

#include <utility>

#include "platform/posix/PlainFileName.h"
#include "propertylist/Reading.h"

namespace platform {
namespace {

std::vector<std::string> languagesInOrder(const std::vector<std::string>& preferred) {
  std::vector<std::string> languages;
  for (const std::string& language : preferred) {
    if (!isPlainFileName(language)) continue;
    languages.push_back(language);
    const std::size_t region = language.find_first_of("-_");
    if (region != std::string::npos && region > 0) languages.push_back(language.substr(0, region));
  }
  languages.emplace_back("en");
  return languages;
}

}  // namespace

DlAddrBundleResources::DlAddrBundleResources(const std::vector<std::string>& preferredLanguages,
                                             std::optional<std::string> directory)
    : _languages(languagesInOrder(preferredLanguages)), _directory(std::move(directory)) {}

DlAddrBundleResources::~DlAddrBundleResources() = default;

std::optional<std::string> DlAddrBundleResources::pathForResource(const void* code,
                                                                  std::string_view name,
                                                                  std::string_view type) {
  const std::optional<std::string> directory = _directoryOf(code);
  const std::string file = std::string(name) + "." + std::string(type);
  if (!directory || !isPlainFileName(file)) return std::nullopt;
  std::string path = *directory + "/" + file;
  struct stat status = {};
  if (::stat(path.c_str(), &status) != 0 || !S_ISREG(status.st_mode)) return std::nullopt;
  return path;
}

std::string DlAddrBundleResources::localizedString(const void* code, std::string_view key,
                                                   std::string_view table) {
  const std::optional<std::string> directory = _directoryOf(code);
  if (!directory || !isPlainFileName(table)) return std::string(key);
  const std::lock_guard lock(_mutex);
  const propertylist::Text* text = propertylist::findString(_table(*directory, table), key);
  return text == nullptr ? std::string(key) : *text;
}

std::optional<std::string> DlAddrBundleResources::_directoryOf(const void* code) const {
  if (_directory) return _directory;
  Dl_info object = {};
  if (::dladdr(code, &object) == 0 || object.dli_fname == nullptr) return std::nullopt;
  const std::string path = object.dli_fname;
  const std::size_t slash = path.rfind('/');
  if (slash == std::string::npos) return std::nullopt;  // a program found by its name alone
  return path.substr(0, slash);
}

const propertylist::Dictionary& DlAddrBundleResources::_table(const std::string& directory,
                                                              std::string_view table) {
  const auto [entry, isNew] = _tables.try_emplace(directory + "/" + std::string(table));
  if (isNew) entry->second = _readTable(directory, table);
  return entry->second;
}

// The table in the first language that has it; empty when none does.
propertylist::Dictionary DlAddrBundleResources::_readTable(const std::string& directory,
                                                           std::string_view table) const {
  for (const std::string& language : _languages) {
    std::string path = directory + "/" + language + ".lproj/";
    path.append(table).append(".strings");
    const propertylist::FileReadResult read = propertylist::readPropertyListFile(path);
    const propertylist::Dictionary* texts = read.value ? read.value->asDictionary() : nullptr;
    if (texts != nullptr) return *texts;
  }
  return {};
}

}  // namespace platform
