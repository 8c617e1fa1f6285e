#include "platform/testing/InMemoryBundleResources.h"

namespace platform {

std::optional<std::string> InMemoryBundleResources::pathForResource(const void* code,
                                                                    std::string_view name,
                                                                    std::string_view type) {
  if (_fails("pathForResource", {name, type}) || _files == nullptr) return std::nullopt;
  return _files->pathForResource(code, name, type);
}

std::string InMemoryBundleResources::localizedString(const void* code, std::string_view key,
                                                     std::string_view table) {
  if (_fails("localizedString", {key, table})) return std::string(key);
  const auto chosen = texts.find(table);
  if (chosen != texts.end()) {
    const auto text = chosen->second.find(key);
    if (text != chosen->second.end()) return text->second;
  }
  return _files == nullptr ? std::string(key) : _files->localizedString(code, key, table);
}

}  // namespace platform
