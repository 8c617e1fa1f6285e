#include "deviceimage/RecordPlacer.h"

#include <sqlite3.h>

#include <utility>

#include "deviceimage/ContentHash.h"

namespace deviceimage {
namespace {

constexpr std::size_t kShortHash = 16;  // digits of a hash in a conflict copy's UID

}  // namespace

RecordPlacer::RecordPlacer(Database& database, Row targetStore)
    : _database(database),
      _store(targetStore),
      _collections(database, targetStore),
      _readRecord(database,
                  "SELECT r.kind, r.uid, r.base_uid, r.content_hash, r.modified_at, r.collection, "
                  "ifnull(s.account, '') FROM records r JOIN stores s ON s.id = r.store "
                  "WHERE r.id = ?1"),
      _findEqual(
          database,
          "SELECT 1 FROM records t JOIN records r ON r.id = ?5 WHERE t.store = ?1 AND "
          "t.kind = ?2 AND t.base_uid = ?3 AND t.content_hash = ?4 AND t.content = r.content"),
      _findEqualContent(
          database,
          "SELECT 1 FROM records WHERE store = ?1 AND kind = ?2 AND base_uid = ?3 AND "
          "content_hash = ?4 AND content = ?5"),
      _findUID(database,
               "SELECT id, base_uid, content_hash, modified_at FROM records "
               "WHERE store = ?1 AND kind = ?2 AND uid = ?3"),
      _renameRecord(database, "UPDATE records SET uid = ?2 WHERE id = ?1"),
      _dropSource(
          database,
          "UPDATE records SET source_account = NULL, source_uid = NULL WHERE store = ?1 AND "
          "kind = ?2 AND source_account = ?3 AND source_uid = ?4"),
      _copyRecord(database,
                  "INSERT INTO records (store, kind, collection, uid, base_uid, content, "
                  "content_hash, modified_at, source_account, source_uid) "
                  "SELECT ?2, kind, ?3, ?4, base_uid, content, content_hash, modified_at, ?5, uid "
                  "FROM records WHERE id = ?1"),
      _insertRecord(database,
                    "INSERT INTO records (store, kind, collection, uid, base_uid, content, "
                    "content_hash, modified_at) VALUES (?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8)") {}

void RecordPlacer::copyRecords(std::span<const Row> records) {
  for (const Row record : records) {
    Candidate candidate = _readCandidate(record);
    _place(candidate, [&] { return _collections.targetOf(candidate.sourceCollection); });
  }
}

void RecordPlacer::addRecord(Dataclass dataclass, const NewRecord& record) {
  Candidate candidate;
  candidate.kind = recordKind(dataclass);
  candidate.uid = record.uid;
  candidate.baseUID = record.uid;
  candidate.contentHash = contentHash(record.content);
  candidate.modifiedAt = record.modifiedAt;
  candidate.content = record.content;
  _place(candidate,
         [&] { return makeCollection(_database, _store, dataclass, record.collectionPath); });
}

RecordPlacer::Candidate RecordPlacer::_readCandidate(Row record) {
  // What somebody has destroyed meanwhile must not look as if it had been copied.
  if (!_readRecord.bind(record).step())
    throw DatabaseFailure(SQLITE_NOTFOUND, "a record that was to be copied is gone");
  Candidate candidate;
  candidate.kind = _readRecord.text(0);
  candidate.uid = _readRecord.text(1);
  candidate.baseUID = _readRecord.text(2);
  candidate.contentHash = _readRecord.text(3);
  candidate.modifiedAt = _readRecord.integer(4);
  candidate.sourceCollection = _readRecord.integer(5);
  candidate.sourceAccount = _readRecord.text(6);
  candidate.sourceRecord = record;
  return candidate;
}

bool RecordPlacer::_isThere(const Candidate& candidate) {
  // The contents are compared too: a hash that somebody has changed must not pass one for the
  // other.
  if (candidate.sourceRecord)
    return _findEqual
        .bind(_store, candidate.kind, candidate.baseUID, candidate.contentHash,
              *candidate.sourceRecord)
        .step();
  return _findEqualContent
      .bind(_store, candidate.kind, candidate.baseUID, candidate.contentHash,
            Statement::Blob{candidate.content})
      .step();
}

template <typename FindCollection>
void RecordPlacer::_place(Candidate& candidate, const FindCollection& findCollection) {
  if (_isThere(candidate)) {
    ++_placed.alreadyThere;
    return;
  }
  candidate.collection = findCollection();
  // One record of the store at most stands for one of the source: the last that came from there.
  if (candidate.sourceAccount)
    _dropSource.bind(_store, candidate.kind, *candidate.sourceAccount, candidate.uid).run();
  if (!_findUID.bind(_store, candidate.kind, candidate.uid).step()) {
    _insert(candidate, candidate.uid);
    ++_placed.added;
    return;
  }
  ++_placed.conflicts;
  const Row other = _findUID.integer(0);
  const std::string otherBase = _findUID.text(1);
  const std::string otherHash = _findUID.text(2);
  const bool otherIsNewer =
      std::pair(_findUID.integer(3), std::string_view(otherHash)) >
      std::pair(candidate.modifiedAt, std::string_view(candidate.contentHash));
  if (otherIsNewer) {
    _insert(candidate, _conflictUID(candidate.kind, candidate.baseUID, candidate.contentHash));
  } else {
    _renameRecord.bind(other, _conflictUID(candidate.kind, otherBase, otherHash)).run();
    _insert(candidate, candidate.uid);
  }
}

void RecordPlacer::_insert(const Candidate& candidate, const std::string& uid) {
  if (candidate.sourceRecord)
    _copyRecord
        .bind(*candidate.sourceRecord, _store, candidate.collection, uid, candidate.sourceAccount)
        .run();
  else
    _insertRecord
        .bind(_store, candidate.kind, candidate.collection, uid, candidate.baseUID,
              Statement::Blob{candidate.content}, candidate.contentHash, candidate.modifiedAt)
        .run();
}

std::string RecordPlacer::_conflictUID(std::string_view kind, const std::string& baseUID,
                                       const std::string& contentHash) {
  const auto isFree = [&](const std::string& uid) {
    return !_findUID.bind(_store, kind, uid).step();
  };
  std::string uid = baseUID + "-conflict-" + contentHash.substr(0, kShortHash);
  if (isFree(uid)) return uid;
  // Somebody's own UID looks like ours.
  const std::string longer = baseUID + "-conflict-" + contentHash;
  uid = longer;
  for (int n = 2; !isFree(uid); ++n) uid = longer + "-" + std::to_string(n);
  return uid;
}

}  // namespace deviceimage
