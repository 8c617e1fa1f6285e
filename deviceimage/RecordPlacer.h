#pragma once

#include <optional>
#include <span>
#include <string>
#include <string_view>

#include "deviceimage/Database.h"
#include "deviceimage/RecordStores.h"
#include "deviceimage/StoreRows.h"

namespace deviceimage {

// Puts records into one store by the rules that RecordStores.h states: equal content is not
// doubled, and different content under one UID is kept twice. Runs inside the caller's transaction;
// may raise DatabaseFailure. Time and memory for one record do not depend on how many there are.
class RecordPlacer {
 public:
  RecordPlacer(Database& database, Row targetStore);

  // Copies the records with these rows, of any stores; a row that is gone is passed over.
  void copyRecords(std::span<const Row> records);
  // Puts in a record that comes from outside.
  void addRecord(Dataclass dataclass, const NewRecord& record);

  const Placed& placed() const { return _placed; }

 private:
  // A record on its way into the store.
  struct Candidate {
    std::string kind;
    std::string uid;
    std::string baseUID;  // the UID, or the one that the record is a conflict copy of
    std::string contentHash;
    std::int64_t modifiedAt = 0;
    std::optional<std::string> sourceAccount;
    std::optional<Row> sourceRecord;  // holds the content; otherwise `content` does
    std::string_view content;
    Row sourceCollection = 0;  // of sourceRecord
    Row collection = 0;        // where it goes; known once it is inserted
  };
  Candidate _readCandidate(Row record);
  bool _isThere(const Candidate& candidate);
  template <typename FindCollection>
  void _place(Candidate& candidate, const FindCollection& findCollection);
  void _insert(const Candidate& candidate, const std::string& uid);
  std::string _conflictUID(std::string_view kind, const std::string& baseUID,
                           const std::string& contentHash);

  Database& _database;
  Row _store;
  CollectionMap _collections;
  Statement _readRecord;
  Statement _findEqual;
  Statement _findEqualContent;
  Statement _findUID;
  Statement _renameRecord;
  Statement _dropSource;
  Statement _copyRecord;
  Statement _insertRecord;
  Placed _placed;
};

}  // namespace deviceimage
