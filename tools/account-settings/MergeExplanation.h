#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "propertylist/Value.h"

namespace tools {

// The accounts by identifier and in order, as one side of a merge has them.
struct AccountVersion {
  std::string identifier;
  propertylist::Dictionary properties;
};
using AccountVersions = std::vector<AccountVersion>;

// Which side the merge followed: what it gave is what the side has (a key or account that is absent
// there is absent). `neither` would be a mistake of the merge.
enum class Winner { both, memory, disk, neither };
std::string_view nameOf(Winner winner);

// What became of one account, or of one of its keys, and why.
struct MergeLine {
  std::string account;
  std::string key;                           // empty for the account as a whole
  Winner winner = Winner::neither;           // what the result shows
  std::string why;                           // what the three versions show
  std::optional<propertylist::Value> value;  // in the result
};

// Lines for every account that is anywhere: in the order in memory, then those that only the disk
// has, then those that only the original has. An account that all three versions have is followed
// by a line for each of its keys; of the others the result has the whole account or nothing.
// `merged` is what the save gave.
std::vector<MergeLine> explainMerge(const AccountVersions& inMemory,
                                    const AccountVersions& original, const AccountVersions& onDisk,
                                    const AccountVersions& merged);

}  // namespace tools
