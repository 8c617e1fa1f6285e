#include "host/RecordAccounting.h"

#include <map>
#include <unordered_map>
#include <unordered_set>
#include <utility>

#include "deviceimage/KeyedHash.h"
#include "host/StoreOwners.h"

namespace host {
namespace {

using deviceimage::Dataclass;
using deviceimage::dataclassName;
using deviceimage::KeyedHash;

using Counts = std::unordered_map<std::string, std::int64_t, KeyedHash>;  // by key, see keyOf
using Texts = std::unordered_set<std::string, KeyedHash>;

// Finds an active store of an observation, which must live on.
class ActiveStores {
 public:
  explicit ActiveStores(const Observation& observation) {
    for (const ObservedStore& store : observation.stores)
      if (!store.retired) _stores.emplace(Name(store.dataclass, nameOf(store)), &store);
  }
  const ObservedStore* findLocal(Dataclass dataclass) const { return _find({dataclass, {}}); }
  // The one that `store` is, maybe at another time; null when there is none.
  const ObservedStore* find(const ObservedStore& store) const {
    return _find({store.dataclass, nameOf(store)});
  }

 private:
  using Name = std::pair<Dataclass, std::string>;  // no account is named with an empty text

  static std::string nameOf(const ObservedStore& store) {
    return store.account ? *store.account : std::string();
  }
  const ObservedStore* _find(const Name& name) const {
    const auto found = _stores.find(name);
    return found != _stores.end() ? found->second : nullptr;
  }

  std::map<Name, const ObservedStore*> _stores;
};

std::int64_t countOf(const ObservedStore* store) {
  return store != nullptr ? static_cast<std::int64_t>(store->records.size()) : 0;
}

std::string amount(std::int64_t count, Dataclass dataclass) {
  return std::to_string(count) + (count == 1 ? " record of " : " records of ") +
         std::string(dataclassName(dataclass));
}

// What makes two records of different stores the same: the record that they are versions of, and
// the content. (Hashes are all of one length.)
std::string keyOf(const ObservedRecord& record) {
  return record.contentHash + (record.otherVersionOf.empty() ? record.uid : record.otherVersionOf);
}

Counts countsOf(const ObservedStore* store) {
  Counts counts;
  if (store != nullptr)
    for (const ObservedRecord& record : store->records) ++counts[keyOf(record)];
  return counts;
}

// Takes one away; false when there is none.
bool take(Counts& counts, const std::string& key) {
  const auto found = counts.find(key);
  if (found == counts.end() || found->second == 0) return false;
  --found->second;
  return true;
}

std::int64_t sumOf(const Counts& counts) {
  std::int64_t sum = 0;
  for (const auto& [key, count] : counts) sum += count;
  return sum;
}

// Follows the records of one dataclass from before to after.
class DataclassAccounting {
 public:
  DataclassAccounting(Dataclass dataclass, const ObservedStore* localBefore,
                      const ObservedStore* localAfter, RecordAccounting& result)
      : _dataclass(dataclass), _result(result) {
    _takeLocalStores(localBefore, localAfter);
  }

  void takeRetiredStores(const Observation& before, const Observation& after) {
    for (const ObservedStore& store : after.stores)
      if (store.dataclass == _dataclass && store.retired)
        for (const ObservedRecord& record : store.records) ++_freshRetired[keyOf(record)];
    std::int64_t gone = 0;
    for (const ObservedStore& store : before.stores)
      if (store.dataclass == _dataclass && store.retired)
        for (const ObservedRecord& record : store.records)
          if (!take(_freshRetired, keyOf(record))) ++gone;
    if (gone > 0)
      _contradict(amount(gone, _dataclass) + " in retired stores are gone or have changed.");
  }

  // Gives each record of an account's store its place in the account's line.
  void follow(const ObservedStore& before, const ObservedStore* after, DataclassReport& line) {
    Counts still = countsOf(after);
    std::int64_t lost = 0;
    for (const ObservedRecord& record : before.records) {
      ++line.serviceBefore;
      const std::string key = keyOf(record);
      // What went to the local store may be retired, or still be in its own store, as well.
      const bool isRetired = take(_freshRetired, key);
      const bool isStillThere = take(still, key);
      if (!_localBefore.contains(key) && take(_fresh, key))
        ++(_localUIDs.insert(record.uid).second ? line.moved : line.conflictCopies);
      else if (_localAfter.contains(key))
        ++line.alreadyThere;
      else if (isRetired)
        ++line.retired;
      else if (isStillThere)
        ++line.leftBehind;
      else
        ++lost;
    }
    if (lost > 0)
      _contradict(amount(lost, _dataclass) + " from the store of account " + line.account +
                  " cannot be found any more.");
    if (const std::int64_t more = sumOf(still); more > 0)
      _contradict(amount(more, _dataclass) + " in the store of account " + line.account +
                  " were not there before.");
  }

  void fillLocalFigures(DataclassReport& line) const {
    line.localBefore = _before;
    line.localAfter = _after;
  }

  // To be called when every store has been followed.
  void checkThatNothingElseCame() {
    if (const std::int64_t unexplained = sumOf(_fresh); unexplained > 0)
      _contradict(amount(unexplained, _dataclass) +
                  " in the local store were in no store of an account to be retired, or are there "
                  "more than once.");
    if (const std::int64_t unexplained = sumOf(_freshRetired); unexplained > 0)
      _contradict(amount(unexplained, _dataclass) +
                  " came into retired stores and were in no store of an account to be retired, or "
                  "came more than once.");
  }

 private:
  void _contradict(std::string sentence) { _result.contradictions.push_back(std::move(sentence)); }

  void _takeLocalStores(const ObservedStore* before, const ObservedStore* after) {
    _before = countOf(before);
    _after = countOf(after);
    _fresh = countsOf(after);
    for (const auto& [key, count] : _fresh) _localAfter.insert(key);
    std::int64_t gone = 0;
    if (before != nullptr)
      for (const ObservedRecord& record : before->records) {
        _localUIDs.insert(record.uid);
        _localBefore.insert(keyOf(record));
        if (!take(_fresh, keyOf(record))) ++gone;
      }
    if (gone > 0)
      _contradict(amount(gone, _dataclass) + " in the local store are gone or have changed.");
  }

  Dataclass _dataclass;
  RecordAccounting& _result;
  std::int64_t _before = 0;
  std::int64_t _after = 0;
  Texts _localBefore;  // keys
  Texts _localAfter;   // keys
  // What the local store had before, and then what came into it account by account.
  Texts _localUIDs;
  Counts _fresh;         // what the local store has more than before
  Counts _freshRetired;  // what the retired stores have more than before
};

void checkOtherStore(const ObservedStore& before, const ObservedStore* after,
                     RecordAccounting& result) {
  const bool isEmpty = before.records.empty() && countOf(after) == 0;
  if (isEmpty || (after != nullptr && after->records == before.records)) return;
  result.contradictions.push_back("The store " + *before.account + " with " +
                                  std::string(dataclassName(before.dataclass)) +
                                  " belongs to no account to be retired and has changed.");
}

void checkNewStore(const ObservedStore& store, const ActiveStores& before,
                   RecordAccounting& result) {
  if (store.retired || !store.account || store.records.empty() || before.find(store) != nullptr)
    return;
  result.contradictions.push_back("The store " + *store.account + " with " +
                                  std::string(dataclassName(store.dataclass)) +
                                  " was not there before.");
}

// There are no figures for them: their lines become sentences.
void listWhatWasNotSeen(const Observation& before, RecordAccounting& result) {
  std::erase_if(result.dataclasses, [&](const DataclassReport& line) {
    if (!before.unseen.contains(line.dataclass)) return false;
    result.leftBehind.push_back(
        "What account " + line.account + " has of " + std::string(dataclassName(line.dataclass)) +
        " is left as it was, in a database that cannot be used; when it can, "
        "put the account back into the settings and run the host again.");
    return true;
  });
}

std::string whereTheyAre(std::int64_t count, const DataclassReport& line, const char* place) {
  return amount(count, line.dataclass) + " of account " + line.account +
         (count == 1 ? " is " : " are ") + place;
}

void listWhatIsNotLocal(RecordAccounting& result) {
  for (const DataclassReport& line : result.dataclasses) {
    if (line.leftBehind > 0)
      result.leftBehind.push_back(
          whereTheyAre(line.leftBehind, line, "still in the account's own store alone."));
    if (line.retired > 0)
      result.leftBehind.push_back(whereTheyAre(
          line.retired, line, "in a retired store alone, which can be exported or brought back."));
  }
}

}  // namespace

RecordAccounting accountForRecords(const Observation& before, const Observation& after,
                                   const Selection& selection,
                                   const deviceimage::SyncAgent& agent) {
  RecordAccounting result;
  StoreOwners owners(before, selection, agent);
  const ActiveStores activeBefore(before);
  const ActiveStores activeAfter(after);
  for (const Dataclass dataclass : deviceimage::kDataclasses) {
    if (before.unseen.contains(dataclass)) continue;
    DataclassAccounting accounting(dataclass, activeBefore.findLocal(dataclass),
                                   activeAfter.findLocal(dataclass), result);
    accounting.takeRetiredStores(before, after);
    for (const ObservedStore& store : before.stores) {
      if (store.dataclass != dataclass || !store.account || store.retired) continue;
      const ObservedStore* now = activeAfter.find(store);
      if (DataclassReport* line = owners.lineOf(store))
        accounting.follow(store, now, *line);
      else
        checkOtherStore(store, now, result);
    }
    for (DataclassReport& line : owners.lines())
      if (line.dataclass == dataclass) accounting.fillLocalFigures(line);
    accounting.checkThatNothingElseCame();
  }
  for (const ObservedStore& store : after.stores) checkNewStore(store, activeBefore, result);
  result.dataclasses = std::move(owners.lines());
  listWhatWasNotSeen(before, result);
  listWhatIsNotLocal(result);
  return result;
}

}  // namespace host
