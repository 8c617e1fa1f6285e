#include "tools/account-settings/MergeExplanation.h"

#include <map>
#include <set>
#include <utility>

namespace tools {

using propertylist::Dictionary;
using propertylist::Value;

namespace {

// Null for an account or key that a version lacks.
template <typename T>
struct Versions {
  const T* memory = nullptr;
  const T* original = nullptr;
  const T* disk = nullptr;
  const T* merged = nullptr;
};

template <typename T>
bool areEqual(const T* a, const T* b) {
  return a == nullptr || b == nullptr ? a == b : *a == *b;
}

template <typename T>
Winner winnerOf(const Versions<T>& versions) {
  const bool isMemory = areEqual(versions.merged, versions.memory);
  const bool isDisk = areEqual(versions.merged, versions.disk);
  if (isMemory) return isDisk ? Winner::both : Winner::memory;
  return isDisk ? Winner::disk : Winner::neither;
}

// What a side did to a key since the original.
std::string changeOf(const Value* side, const Value* original) {
  if (areEqual(side, original)) return {};
  if (side == nullptr) return "deleted";
  return original == nullptr ? "added" : "changed";
}

std::string whyOfKey(const Versions<Value>& key) {
  const std::string memory = changeOf(key.memory, key.original);
  const std::string disk = changeOf(key.disk, key.original);
  if (memory.empty() && disk.empty()) return "unchanged";
  if (disk.empty()) return memory + " in memory only";
  if (memory.empty()) return disk + " on disk only";
  if (areEqual(key.memory, key.disk)) return memory + " alike on both";
  if (memory == disk) return memory + " on both: memory wins";
  return memory + " in memory, " + disk + " on disk: memory wins";
}

std::string whyOfAccount(const Versions<Dictionary>& account) {
  const bool hasOriginal = account.original != nullptr && !account.original->empty();
  if (account.memory == nullptr) {
    if (account.disk == nullptr) return "deleted on both";
    return hasOriginal ? "deleted in memory: not written"
                       : "added on disk only: a save does not carry it over";
  }
  if (account.disk == nullptr || account.disk->empty())
    return hasOriginal ? "deleted on disk, but still in memory: written as in memory"
                       : "added in memory only";
  return hasOriginal ? "merged key by key" : "added on both: written as in memory";
}

class Explanation {
 public:
  std::vector<MergeLine> lines;

  void explain(const std::string& identifier, const Versions<Dictionary>& account) {
    MergeLine line{identifier, {}, winnerOf(account), whyOfAccount(account), std::nullopt};
    if (account.merged != nullptr) line.value = *account.merged;
    const bool isMerged = account.memory != nullptr && account.original != nullptr &&
                          account.disk != nullptr && account.merged != nullptr &&
                          !account.original->empty() && !account.disk->empty();
    lines.push_back(std::move(line));
    if (isMerged) _explainKeys(identifier, account);
  }

 private:
  void _explainKeys(const std::string& identifier, const Versions<Dictionary>& account) {
    std::set<std::string> keys;
    for (const Dictionary* const version :
         {account.memory, account.original, account.disk, account.merged})
      for (const Dictionary::Entry& entry : *version) keys.insert(entry.key());
    for (const std::string& name : keys) {
      const Versions<Value> key{account.memory->find(name), account.original->find(name),
                                account.disk->find(name), account.merged->find(name)};
      MergeLine line{identifier, name, winnerOf(key), whyOfKey(key), std::nullopt};
      if (key.merged != nullptr) line.value = *key.merged;
      lines.push_back(std::move(line));
    }
  }
};

std::map<std::string, const Dictionary*> byIdentifier(const AccountVersions& accounts) {
  std::map<std::string, const Dictionary*> result;
  for (const AccountVersion& account : accounts) result[account.identifier] = &account.properties;
  return result;
}

}  // namespace

std::string_view nameOf(Winner winner) {
  switch (winner) {
    case Winner::both:
      return "both";
    case Winner::memory:
      return "memory";
    case Winner::disk:
      return "disk";
    case Winner::neither:
      break;
  }
  return "neither";
}

std::vector<MergeLine> explainMerge(const AccountVersions& inMemory,
                                    const AccountVersions& original, const AccountVersions& onDisk,
                                    const AccountVersions& merged) {
  const auto memoryByID = byIdentifier(inMemory);
  const auto originalByID = byIdentifier(original);
  const auto diskByID = byIdentifier(onDisk);
  const auto mergedByID = byIdentifier(merged);
  const auto find = [](const auto& accounts, const std::string& identifier) {
    const auto found = accounts.find(identifier);
    return found != accounts.end() ? found->second : nullptr;
  };
  Explanation explanation;
  std::set<std::string> seen;
  for (const AccountVersions* const version : {&inMemory, &onDisk, &original})
    for (const AccountVersion& account : *version) {
      const std::string& id = account.identifier;
      if (!seen.insert(id).second) continue;
      explanation.explain(id, {find(memoryByID, id), find(originalByID, id), find(diskByID, id),
                               find(mergedByID, id)});
    }
  return std::move(explanation.lines);
}

}  // namespace tools
