#pragma once

#include <set>
#include <string>

#include "propertylist/Value.h"

namespace fuzz {

// The three-way merge in the fewest words: key by key, memory wins where it changed since
// `original`, else the disk does. Without `original` or `onDisk` there is nothing to compare with.
inline propertylist::Dictionary mergeModel(const propertylist::Dictionary& inMemory,
                                           const propertylist::Dictionary& original,
                                           const propertylist::Dictionary& onDisk) {
  if (original.empty() || onDisk.empty()) return inMemory;
  const auto valueIn = [](const propertylist::Dictionary& dictionary, const std::string& key) {
    const propertylist::Value* const value = dictionary.find(key);
    return value != nullptr ? std::optional(*value) : std::nullopt;
  };
  std::set<std::string> keys;
  for (const auto* side : {&inMemory, &original, &onDisk})
    for (const auto& entry : *side) keys.insert(entry.key());
  propertylist::Dictionary merged;
  for (const std::string& key : keys) {
    const bool unchanged = valueIn(inMemory, key) == valueIn(original, key);
    const auto value = valueIn(unchanged ? onDisk : inMemory, key);
    if (value) merged.set(key, *value);
  }
  return merged;
}

}  // namespace fuzz
