// Merges all triples of small dictionaries and compares each result with a model of the merge: all
// of two keys and three values, then all of three keys and two values. Prints the bad ones and the
// number of cases; the exit code is 1 when one was bad.
#include <iostream>
#include <vector>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "fuzz/MergeModel.h"
#include "platform/testing/InMemoryDevice.h"
#include "propertylist/Writing.h"

namespace {

using accountsettings::ASSAccountsManager;
using propertylist::describe;
using propertylist::Dictionary;

// Every dictionary in which each of the keys is absent or has one of the values 1, 2 and so on.
std::vector<Dictionary> dictionaries(const std::vector<std::string>& keys, int values) {
  std::vector<Dictionary> all = {Dictionary()};
  for (const std::string& key : keys) {
    const std::vector<Dictionary> without = all;
    for (int value = 1; value <= values; ++value) {
      for (Dictionary dictionary : without) {
        dictionary.set(key, value);
        all.push_back(dictionary);
      }
    }
  }
  return all;
}

struct Count {
  int cases = 0;
  int bad = 0;
};

void mergeAll(const ASSAccountsManager& store, const std::vector<Dictionary>& all, Count& count) {
  for (const Dictionary& inMemory : all) {
    for (const Dictionary& original : all) {
      for (const Dictionary& onDisk : all) {
        ++count.cases;
        const Dictionary merged = store.mergeInMemoryPropertiesOriginalPropertiesOnDiskProperties(
            inMemory, original, onDisk);
        if (merged == fuzz::mergeModel(inMemory, original, onDisk)) continue;
        ++count.bad;
        std::cout << "bad " << describe(inMemory) << " over " << describe(original) << " and "
                  << describe(onDisk) << ": " << describe(merged) << "\n";
      }
    }
  }
}

}  // namespace

int main() {
  const platform::InMemoryDevice device;
  const auto store = ASSAccountsManager::initWithAccounsInfoArray(std::nullopt);
  Count count;
  mergeAll(*store, dictionaries({"a", "b"}, 3), count);
  mergeAll(*store, dictionaries({"a", "b", "c"}, 2), count);
  std::cout << count.cases << " cases" << std::endl;
  return count.bad > 0 ? 1 : 0;
}
