#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/Export.h"
#include "platform/Status.h"
#include "platform/SyncDataType.h"
#include "propertylist/Value.h"

namespace platform {

// Keys of the options of createDataSource. Each is passed with the value true.
// The calendar source holds events only.
inline constexpr std::string_view EventsOnlySourceOption = "EventsOnly";
// The calendar source holds reminders only.
inline constexpr std::string_view RemindersOnlySourceOption = "RemindersOnly";

// An open view of one store's records. The platform's own object; the caller only passes it on.
class PLATFORM_EXPORT DataSource {
 public:
  virtual ~DataSource();
};
using DataSourcePtr = std::shared_ptr<DataSource>;
using DataSourceOptions = std::optional<propertylist::Dictionary>;

// The platform's sync data sources: views of the device-local store and of service accounts'
// stores, one dataclass at a time.
//
// Every operation that takes a data source accepts an empty one and answers with a failure, because
// callers pass on what they could not open. What migrateRecords and clearAllRecords change waits
// for commit; clearSyncAnchors and removeStore act at once; deleteDataSource closes the source and
// drops what was not committed. Several sources may be open at a time, on one store and one
// database too: they never block each other. One thread at a time.
class PLATFORM_EXPORT SyncDataSource {
 public:
  struct Created {
    Status status;
    DataSourcePtr source;  // may be set on failure and empty on success: test both
  };
  struct Counted {
    Status status;
    std::int32_t count = 0;
  };
  struct ExternalSources {
    Status status;
    std::optional<std::vector<std::string>> names;
  };

  virtual ~SyncDataSource();

  // The name under which createDataSource knows the type; empty for a type that has none.
  virtual std::optional<std::string> dataclassNameForSyncType(SyncDataType type) = 0;

  // Opens the source of one dataclass: of the service account whose store has `accountIdentifier`,
  // or, without one, the device-local (tethered) source. A store that does not exist yet gives an
  // empty source; nothing is created before a commit. Without a name, a failure. The caller closes
  // what came back with deleteDataSource, whatever happened in between.
  virtual Created createDataSource(const std::optional<std::string>& syncDataclassName,
                                   const std::optional<std::string>& accountIdentifier,
                                   const DataSourceOptions& options) = 0;

  // The number of records that the source holds.
  virtual Counted countRecords(const DataSourcePtr& source) = 0;

  // Takes every record that the source holds out of its store, at the commit.
  virtual Status clearAllRecords(const DataSourcePtr& source) = 0;

  // Forgets the sync state, at once; the next sync starts afresh.
  virtual Status clearSyncAnchors(const DataSourcePtr& source) = 0;

  // Copies every record of `from` into `into`, at the commit of `into`; `from` keeps them.
  // Repeating it doubles nothing, also after a run that was killed. Two records of one identity and
  // different content are both kept.
  virtual Status migrateRecords(const DataSourcePtr& from, const DataSourcePtr& into) = 0;

  // Makes the pending changes lasting, all or none.
  virtual Status commit(const DataSourcePtr& source) = 0;

  // Closes the source; the records stay.
  virtual Status deleteDataSource(const DataSourcePtr& source) = 0;

  // Removes the store behind the source, at once. `flag` is passed through; the system passes
  // false.
  virtual Status removeStore(const DataSourcePtr& source, bool flag) = 0;

  // The names of the sources other than the device-local one that serve the type. "DenyTethered"
  // among them only says that tethered syncing of the type is off.
  virtual ExternalSources externalSourcesEnabledForSyncType(SyncDataType type) = 0;

  // Turns tethered syncing of the type off (true) or on (false).
  virtual Status setTetheredSyncingDisabled(SyncDataType type, bool disabled) = 0;
};

}  // namespace platform
