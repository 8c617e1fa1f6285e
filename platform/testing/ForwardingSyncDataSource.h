#pragma once

#include "platform/SyncDataSource.h"

namespace platform {

// Hands every operation on to `next`, which outlives it. A test overrides the one it is about.
class ForwardingSyncDataSource : public SyncDataSource {
 public:
  explicit ForwardingSyncDataSource(SyncDataSource& next) : _next(next) {}

  std::optional<std::string> dataclassNameForSyncType(SyncDataType type) override {
    return _next.dataclassNameForSyncType(type);
  }
  Created createDataSource(const std::optional<std::string>& syncDataclassName,
                           const std::optional<std::string>& accountIdentifier,
                           const DataSourceOptions& options) override {
    return _next.createDataSource(syncDataclassName, accountIdentifier, options);
  }
  Counted countRecords(const DataSourcePtr& source) override { return _next.countRecords(source); }
  Status clearAllRecords(const DataSourcePtr& source) override {
    return _next.clearAllRecords(source);
  }
  Status clearSyncAnchors(const DataSourcePtr& source) override {
    return _next.clearSyncAnchors(source);
  }
  Status migrateRecords(const DataSourcePtr& from, const DataSourcePtr& into) override {
    return _next.migrateRecords(from, into);
  }
  Status commit(const DataSourcePtr& source) override { return _next.commit(source); }
  Status deleteDataSource(const DataSourcePtr& source) override {
    return _next.deleteDataSource(source);
  }
  Status removeStore(const DataSourcePtr& source, bool flag) override {
    return _next.removeStore(source, flag);
  }
  ExternalSources externalSourcesEnabledForSyncType(SyncDataType type) override {
    return _next.externalSourcesEnabledForSyncType(type);
  }
  Status setTetheredSyncingDisabled(SyncDataType type, bool disabled) override {
    return _next.setTetheredSyncingDisabled(type, disabled);
  }

 private:
  SyncDataSource& _next;
};

}  // namespace platform
