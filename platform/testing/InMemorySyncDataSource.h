#pragma once

#include <map>
#include <set>
#include <string>

#include "platform/SyncDataSource.h"
#include "platform/testing/FakeService.h"

namespace platform {

// Data sources over stores that a test fills with records.
//
// The sync dataclass names are "MailAccounts", "Contacts", "Calendars", "Bookmarks" and "Notes". In
// the journal a source is its store and its name, "local Contacts" or "account-1 Calendars
// {EventsOnly}".
//
// A planned answer of createDataSource gives its status, and a source only when it is `carriedOut`:
// all four combinations of status and source can be had.
class InMemorySyncDataSource : public SyncDataSource, public FakeService {
 public:
  // Which of the source options a record belongs to.
  enum class RecordKind { any, event, reminder };
  struct Record {
    std::string uid;  // unique among the store's records of its kind
    std::string content;
    RecordKind kind = RecordKind::any;
    // Set on the second version of the record with this UID; `uid` is then "<this>-conflict-<n>".
    std::optional<std::string> conflictCopyOf = std::nullopt;
    friend bool operator==(const Record&, const Record&) = default;
  };
  using Account = std::optional<std::string>;  // empty: the device-local store
  struct Store {
    std::vector<Record> records;
    bool hasAnchors = false;
    friend bool operator==(const Store&, const Store&) = default;
  };
  using StoreKey = std::pair<Account, std::string>;  // the account and the sync dataclass name
  // What was taken out of a service account's store, which is kept.
  struct RetiredRecord {
    std::string account;
    std::string syncDataclassName;
    Record record;
    friend bool operator==(const RetiredRecord&, const RetiredRecord&) = default;
  };

  // The stores that exist; a test fills and reads them here.
  std::map<StoreKey, Store> stores;
  std::vector<RetiredRecord> retired;
  // Answers of externalSourcesEnabledForSyncType but for "DenyTethered", which comes first and is
  // there while tethered syncing is off.
  std::map<SyncDataType, std::vector<std::string>> externalSources;
  std::set<SyncDataType> tetheredSyncingDisabled;

  // The records of a store; none when it does not exist.
  std::vector<Record> records(const Account& account, const std::string& syncDataclassName) const;
  bool storeExists(const Account& account, const std::string& syncDataclassName) const;
  // Sources that were opened and not closed.
  int openSources() const { return _openSources; }

  std::optional<std::string> dataclassNameForSyncType(SyncDataType type) override;
  Created createDataSource(const std::optional<std::string>& syncDataclassName,
                           const std::optional<std::string>& accountIdentifier,
                           const DataSourceOptions& options) override;
  Counted countRecords(const DataSourcePtr& source) override;
  Status clearAllRecords(const DataSourcePtr& source) override;
  Status clearSyncAnchors(const DataSourcePtr& source) override;
  Status migrateRecords(const DataSourcePtr& from, const DataSourcePtr& into) override;
  Status commit(const DataSourcePtr& source) override;
  Status deleteDataSource(const DataSourcePtr& source) override;
  Status removeStore(const DataSourcePtr& source, bool flag) override;
  ExternalSources externalSourcesEnabledForSyncType(SyncDataType type) override;
  Status setTetheredSyncingDisabled(SyncDataType type, bool disabled) override;

 private:
  struct Source;
  void _take(const Source& source, std::optional<RecordKind> kind);
  void _put(Store& store, const Record& record);
  int _openSources = 0;
};

}  // namespace platform
