#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "deviceimage/Database.h"
#include "platform/SyncDataSource.h"

namespace deviceimage {

// Data sources over the stores of an image's databases. The sync dataclass names are
// "MailAccounts", "Contacts", "Calendars", "Bookmarks" and "Notes"; the calendars' source holds
// events and to-dos, unless an option selects one of the two.
//
// migrateRecords notes which records there are, and commit copies them, by the rules of
// RecordStores.h; a target that holds one kind takes that kind. What clearAllRecords and
// removeStore take out of a store is retired: no source sees it any more, and nothing is lost. A
// commit is one transaction; one that changes nothing writes nothing. The device-local store comes
// into being at its first commit, a service's with its first record.
//
// Of bookmarks and of mail accounts the device keeps one store. So while tethered syncing of the
// type is on, committing a device-local source of it also takes over what the store of the Quillnet
// sync agent holds ("Quillnet:" and the agent's account name, see SyncAgent.h): its records are
// copied into the device-local store and the agent's store is retired, in the same transaction.
// Other accounts' stores are left alone.
class ImageSyncDataSource : public platform::SyncDataSource {
 public:
  // `databases` is shared with the other services of the image and outlives this.
  explicit ImageSyncDataSource(DatabaseSet& databases) : _databases(databases) {}

  std::optional<std::string> dataclassNameForSyncType(platform::SyncDataType type) override;
  Created createDataSource(const std::optional<std::string>& syncDataclassName,
                           const std::optional<std::string>& accountIdentifier,
                           const platform::DataSourceOptions& options) override;
  Counted countRecords(const platform::DataSourcePtr& source) override;
  platform::Status clearAllRecords(const platform::DataSourcePtr& source) override;
  platform::Status clearSyncAnchors(const platform::DataSourcePtr& source) override;
  platform::Status migrateRecords(const platform::DataSourcePtr& from,
                                  const platform::DataSourcePtr& into) override;
  platform::Status commit(const platform::DataSourcePtr& source) override;
  platform::Status deleteDataSource(const platform::DataSourcePtr& source) override;
  platform::Status removeStore(const platform::DataSourcePtr& source, bool flag) override;
  ExternalSources externalSourcesEnabledForSyncType(platform::SyncDataType type) override;
  platform::Status setTetheredSyncingDisabled(platform::SyncDataType type, bool disabled) override;

 private:
  struct Source;
  template <typename Work>
  static platform::Status _withOpen(const platform::DataSourcePtr& source, const Work& work);
  void _apply(Source& source);
  std::optional<std::string> _storeToTakeOver(const Source& source);
  bool _isTetheredSyncingDisabled(platform::SyncDataType type);

  DatabaseSet& _databases;
};

}  // namespace deviceimage
