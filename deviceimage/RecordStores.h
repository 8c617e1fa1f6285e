#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <set>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "deviceimage/Dataclass.h"
#include "deviceimage/DeviceImage.h"
#include "platform/Status.h"

namespace deviceimage {

class DatabaseSet;
class RecordPlacer;

// The row of something in its database; unique there, never used again. Rows of different databases
// have nothing to do with one another, so a dataclass goes with each.
using Row = std::int64_t;

// One store as one dataclass sees it. A calendar store is listed for each of calendars and
// reminders that it has collections of; the local one, and one without any, for both.
struct Store {
  Dataclass dataclass = Dataclass::contacts;
  Row row = 0;
  std::optional<std::string>
      account;           // the account's store identifier; empty: the device-local store
  bool retired = false;  // taken out of service and kept; no data source sees it
  std::optional<std::int64_t> retiredAt;  // seconds since 1970 UTC
  bool visible = true;                    // whether the user is shown it
  std::int64_t collections = 0;           // of the dataclass
  std::int64_t records = 0;               // of the dataclass
};

// An address book, calendar, list or folder.
struct Collection {
  Row row = 0;
  std::optional<Row> parent;      // a folder's folder
  std::vector<std::string> path;  // names from the outermost folder to this one
  bool writable = true;
  bool isDefault = false;  // where new records go
  std::int64_t records = 0;
};

// One record without its content.
struct Record {
  Row row = 0;
  Row store = 0;
  Row collection = 0;
  Dataclass dataclass = Dataclass::contacts;
  std::string uid;               // unique among the store's records of the dataclass
  std::string contentHash;       // SHA-256 of the content, 64 lower-case hexadecimal digits
  std::int64_t contentSize = 0;  // bytes
  std::int64_t modifiedAt = 0;   // seconds since 1970 UTC
  // The record is the other version of the record with this UID, kept beside it.
  std::optional<std::string> conflictCopyOf;
  // Where a record was copied from: the other store's account (empty text: the device-local store)
  // and its UID there. Empty for one that was entered here.
  std::optional<std::string> sourceAccount;
  std::optional<std::string> sourceUID;
};

// A record to be added, as the world gave it.
struct NewRecord {
  std::vector<std::string> collectionPath;  // missing collections are made; empty: the default one
  std::string uid;                          // not empty
  std::string content;                      // kept byte for byte
  std::int64_t modifiedAt = 0;              // seconds since 1970 UTC
};

// What became of records that were put into a store.
struct Placed {
  std::int64_t added = 0;         // new in the store, under their own UID
  std::int64_t alreadyThere = 0;  // the same content was there
  std::int64_t conflicts = 0;     // another content was there: both are kept
};

// What is wrong with one database, or that all is well.
struct DatabaseReport {
  std::string path;                   // relative to the image
  bool exists = false;                // a database that is not there holds no stores, and is fine
  std::vector<std::string> problems;  // empty: integrity, references and hashes are as they must be
  // What went wrong is not the file's: reading failed, or the process had no memory or descriptor
  // left. Another look may find it sound.
  bool mayPass = false;
};

// The image's records as tools and reports see them: every store, retired ones too. Programs that
// migrate use platform::SyncDataSource instead.
//
// Two records of one UID and different content are both kept: the newer (by modification time, then
// by hash) under the UID, the other as a conflict copy under the UID, "-conflict-" and the first 16
// digits of its hash. Nothing here deletes a record but purgeRetiredStore.
//
// A database that is missing has no stores, and is made when something is first put into it. One
// that is damaged, not ours or of a newer version is a failure whose text says so, and is left as
// it is. One thread at a time; other processes may use the image at the same time.
class RecordStores {
 public:
  enum class Access {
    readOnly,  // no file is made or changed
    readWrite
  };
  RecordStores(std::shared_ptr<const DeviceImage> image, Access access);
  ~RecordStores();

  struct Stores {
    platform::Status status;
    std::vector<Store> stores;  // by dataclass, the local one first, active before retired
  };
  // On failure the status is that of the first database that could not be read, and the stores are
  // those of the others.
  Stores listStores();
  Stores listStores(Dataclass dataclass);

  // The active store of the account, or, without one, the device-local store.
  struct Found {
    platform::Status status;
    std::optional<Store> store;
  };
  Found findStore(Dataclass dataclass, const std::optional<std::string>& account);

  struct Collections {
    platform::Status status;
    std::vector<Collection> collections;  // a folder before what it holds
  };
  Collections listCollections(Dataclass dataclass, Row store);

  // Calls `visit` for each record of the dataclass in the store, by UID, one at a time: memory does
  // not grow with their number. `content` is empty unless asked for and valid during the call.
  // `visit` ends the walk by answering false, and uses no other operation of this object.
  using Visitor = std::function<bool(const Record& record, std::string_view content)>;
  platform::Status visitRecords(Dataclass dataclass, Row store, bool withContent,
                                const Visitor& visit);

  struct Content {
    platform::Status status;
    std::optional<std::string> bytes;  // empty when there is no such record
  };
  Content readContent(Dataclass dataclass, Row record);

  struct Added {
    platform::Status status;
    Placed placed;
  };
  // Puts all records into the active store of the account (without one: the device-local store),
  // which is made when missing: all of them or, on failure, none.
  Added addRecords(Dataclass dataclass, const std::optional<std::string>& account,
                   std::span<const NewRecord> records);

  // Makes sure that the active store is there, also without records.
  platform::Status ensureStore(Dataclass dataclass, const std::optional<std::string>& account);

  // Takes a store with all it holds out of service, as SyncDataSource::removeStore does; a retired
  // one stays as it is.
  platform::Status retireStore(Dataclass dataclass, Row store);

  // Copies the records of a retired store into the active store of `account` (without one: the
  // device-local store), by the rules of addRecords. The retired store stays.
  Added bringBackRetiredStore(Dataclass dataclass, Row retiredStore,
                              const std::optional<std::string>& account);

  // Destroys a retired store with the records of every dataclass in it, for good. Answers how many.
  struct Purged {
    platform::Status status;
    std::int64_t records = 0;
  };
  Purged purgeRetiredStore(Dataclass dataclass, Row retiredStore);

  // Shows or hides the store's records of the dataclass.
  platform::Status setVisible(Dataclass dataclass, Row store, bool visible);

  // How far a sync with another device has come. Empty when it has not begun.
  platform::Status setSyncAnchor(Dataclass dataclass, Row store, std::string_view anchor);
  struct Anchor {
    platform::Status status;
    std::optional<std::string> anchor;
  };
  Anchor syncAnchor(Dataclass dataclass, Row store);

  // Looks at every database: readable, of this version, `PRAGMA integrity_check` and
  // `foreign_key_check` without complaint, each record's hash that of its content. Those whose
  // paths are in `leaveOut` are passed over.
  std::vector<DatabaseReport> checkDatabases(const std::set<std::string>& leaveOut = {});

  // Rolls back what a killed program left half written, as any writer would; nothing else changes.
  // With readOnly access a database in that state is a failure. Those in `leaveOut`, and those
  // without a journal beside them, are passed over.
  platform::Status recoverDatabases(const std::set<std::string>& leaveOut = {});

  // Begins a change of the dataclass's database and takes it back. Fails after five seconds when
  // another program is about to write there, who lets others read meanwhile. Needs readWrite
  // access.
  DatabaseReport tryToWrite(Dataclass dataclass);

 private:
  Added _addTo(Dataclass dataclass, const std::optional<std::string>& account,
               const std::function<void(RecordPlacer& placer)>& add);
  std::unique_ptr<DatabaseSet> _databases;
};

}  // namespace deviceimage
