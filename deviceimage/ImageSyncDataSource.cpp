#include "deviceimage/ImageSyncDataSource.h"

#include <sqlite3.h>

#include <algorithm>
#include <array>
#include <limits>

#include "deviceimage/Dataclass.h"
#include "deviceimage/RecordPlacer.h"
#include "deviceimage/StoreRows.h"
#include "deviceimage/SyncAgent.h"

namespace deviceimage {
namespace {

using platform::Status;
using platform::SyncDataType;

constexpr std::string_view kDenyTethered = "DenyTethered";
constexpr std::string_view kTetheredSetting = "tethered syncing disabled";

constexpr std::array<std::pair<SyncDataType, std::string_view>, 5> kTypeNames = {
    {{SyncDataType::mailAccounts, "MailAccounts"},
     {SyncDataType::contacts, "Contacts"},
     {SyncDataType::calendars, "Calendars"},
     {SyncDataType::bookmarks, "Bookmarks"},
     {SyncDataType::notes, "Notes"}}};

bool isSet(const platform::DataSourceOptions& options, std::string_view option) {
  return options && propertylist::findBoolean(*options, option) == true;
}

// The dataclasses whose records a source of the type holds.
std::vector<Dataclass> dataclassesOf(SyncDataType type,
                                     const platform::DataSourceOptions& options) {
  std::vector<Dataclass> dataclasses;
  for (const Dataclass dataclass : kDataclasses) {
    if (syncTypeOf(dataclass) != type) continue;
    if (dataclass == Dataclass::calendars && isSet(options, platform::RemindersOnlySourceOption))
      continue;
    if (dataclass == Dataclass::reminders && isSet(options, platform::EventsOnlySourceOption))
      continue;
    dataclasses.push_back(dataclass);
  }
  return dataclasses;
}

Status noOpenSource() { return Status::failure(SQLITE_MISUSE, "there is no open data source"); }

}  // namespace

struct ImageSyncDataSource::Source : platform::DataSource {
  SyncDataType type = SyncDataType::contacts;
  std::optional<std::string> account;  // empty: the device-local store
  std::vector<Dataclass> dataclasses;  // what the source holds
  bool isClosed = false;
  bool wasOrigin = false;  // since the last commit, its records were to go somewhere else
  // What waits for the commit: first the clearing, then the copying.
  bool clears = false;
  std::vector<Row> copies;

  bool holds(Dataclass dataclass) const {
    return std::find(dataclasses.begin(), dataclasses.end(), dataclass) != dataclasses.end();
  }
  // The source behind the handle while it is open, else null.
  static Source* open(const platform::DataSourcePtr& handle) {
    auto* const source = dynamic_cast<Source*>(handle.get());
    return source == nullptr || source->isClosed ? nullptr : source;
  }
};

template <typename Work>
Status ImageSyncDataSource::_withOpen(const platform::DataSourcePtr& handle, const Work& work) {
  Source* const source = Source::open(handle);
  if (source == nullptr) return noOpenSource();
  return statusOf([&] {
    work(*source);
    return Status::success();
  });
}

std::optional<std::string> ImageSyncDataSource::dataclassNameForSyncType(SyncDataType type) {
  for (const auto& [known, name] : kTypeNames)
    if (known == type) return std::string(name);
  return std::nullopt;
}

platform::SyncDataSource::Created ImageSyncDataSource::createDataSource(
    const std::optional<std::string>& syncDataclassName,
    const std::optional<std::string>& accountIdentifier,
    const platform::DataSourceOptions& options) {
  const auto known = std::find_if(kTypeNames.begin(), kTypeNames.end(), [&](const auto& entry) {
    return entry.second == syncDataclassName;
  });
  if (known == kTypeNames.end())
    return {Status::failure(SQLITE_MISUSE, syncDataclassName
                                               ? "nothing is known of a sync dataclass named \"" +
                                                     *syncDataclassName + "\""
                                               : "a data source needs a sync dataclass"),
            nullptr};
  if (accountIdentifier && accountIdentifier->empty())
    return {Status::failure(SQLITE_MISUSE, "an account's identifier is empty"), nullptr};
  auto source = std::make_shared<Source>();
  source->type = known->first;
  source->account = accountIdentifier;
  source->dataclasses = dataclassesOf(source->type, options);
  Created created;
  created.status = statusOf([&] {
    _databases.find(source->type);  // a database that cannot be used says so now
    created.source = std::move(source);
    return Status::success();
  });
  return created;
}

platform::SyncDataSource::Counted ImageSyncDataSource::countRecords(
    const platform::DataSourcePtr& handle) {
  std::int64_t count = 0;
  Counted counted;
  counted.status = _withOpen(handle, [&](Source& source) {
    Database* const database = _databases.find(source.type);
    if (database == nullptr) return;
    const std::optional<Row> store = findActiveStore(*database, source.account);
    for (const Dataclass dataclass : source.dataclasses)
      if (store) count += deviceimage::countRecords(*database, *store, dataclass);
  });
  constexpr std::int64_t kMost = std::numeric_limits<std::int32_t>::max();
  counted.count = static_cast<std::int32_t>(std::min(count, kMost));
  return counted;
}

Status ImageSyncDataSource::clearAllRecords(const platform::DataSourcePtr& handle) {
  return _withOpen(handle, [](Source& source) {
    source.clears = true;
    source.copies.clear();
  });
}

Status ImageSyncDataSource::clearSyncAnchors(const platform::DataSourcePtr& handle) {
  return _withOpen(handle, [&](Source& source) {
    Database* const database = _databases.find(source.type);
    if (database == nullptr) return;
    const std::optional<Row> store = findActiveStore(*database, source.account);
    if (!store) return;
    Transaction transaction(*database);
    for (const Dataclass dataclass : source.dataclasses)
      execute(*database, "DELETE FROM anchors WHERE store = ?1 AND kind = ?2", *store,
              recordKind(dataclass));
    transaction.commit();
  });
}

Status ImageSyncDataSource::migrateRecords(const platform::DataSourcePtr& from,
                                           const platform::DataSourcePtr& into) {
  Source* const origin = Source::open(from);
  Source* const target = Source::open(into);
  if (origin == nullptr || target == nullptr) return noOpenSource();
  if (origin->type != target->type)
    return Status::failure(SQLITE_MISUSE, "the two data sources hold different kinds of data");
  origin->wasOrigin = true;
  return statusOf([&] {
    Database* const database = _databases.find(origin->type);
    if (database == nullptr) return Status::success();
    const std::optional<Row> store = findActiveStore(*database, origin->account);
    if (!store) return Status::success();
    for (const Dataclass dataclass : origin->dataclasses) {
      if (!target->holds(dataclass)) continue;
      const std::vector<Row> rows = recordRows(*database, *store, dataclass);
      target->copies.insert(target->copies.end(), rows.begin(), rows.end());
    }
    return Status::success();
  });
}

Status ImageSyncDataSource::commit(const platform::DataSourcePtr& handle) {
  return _withOpen(handle, [&](Source& source) {
    _apply(source);
    source.clears = false;
    source.wasOrigin = false;
    source.copies.clear();
  });
}

void ImageSyncDataSource::_apply(Source& source) {
  const bool isLocal = !source.account;
  if (!isLocal && !source.clears && source.copies.empty()) return;
  Database* const existing = _databases.find(source.type);
  if (!isLocal && existing == nullptr) return;  // nothing to clear, nothing that could be copied
  Database& database = isLocal ? _databases.make(source.type) : *existing;
  Transaction transaction(database);
  if (source.clears)
    if (const std::optional<Row> store = findActiveStore(database, source.account))
      retireRecords(database, *store, source.dataclasses);
  if (isLocal || !source.copies.empty()) {
    const Row store = makeActiveStore(database, source.account);
    RecordPlacer placer(database, store);
    placer.copyRecords(source.copies);
    if (const std::optional<std::string> agent = _storeToTakeOver(source)) {
      if (const std::optional<Row> taken = findActiveStore(database, agent)) {
        for (const Dataclass dataclass : source.dataclasses)
          placer.copyRecords(recordRows(database, *taken, dataclass));
        retireStore(database, *taken);
      }
    }
  }
  transaction.commit();
}

// The account whose store the device-local one takes over with this commit; empty when none.
std::optional<std::string> ImageSyncDataSource::_storeToTakeOver(const Source& source) {
  if (source.account || !isSingleStoreType(source.type)) return std::nullopt;
  // Who empties the store, or gives its records to somebody, does not want others in it.
  if (source.clears || source.wasOrigin) return std::nullopt;
  if (_isTetheredSyncingDisabled(source.type)) return std::nullopt;
  return SyncAgent(_databases.image()).quillnetStoreIdentifier();
}

Status ImageSyncDataSource::deleteDataSource(const platform::DataSourcePtr& handle) {
  return _withOpen(handle, [](Source& source) {
    source.isClosed = true;
    source.copies.clear();
  });
}

Status ImageSyncDataSource::removeStore(const platform::DataSourcePtr& handle, bool /*flag*/) {
  return _withOpen(handle, [&](Source& source) {
    Database* const database = _databases.find(source.type);
    if (database == nullptr) return;
    Transaction transaction(*database);
    if (const std::optional<Row> store = findActiveStore(*database, source.account))
      retireStore(*database, *store);
    transaction.commit();
  });
}

platform::SyncDataSource::ExternalSources ImageSyncDataSource::externalSourcesEnabledForSyncType(
    SyncDataType type) {
  std::vector<std::string> names;
  ExternalSources sources;
  sources.status = statusOf([&] {
    if (_isTetheredSyncingDisabled(type)) names.emplace_back(kDenyTethered);
    Database* const database = _databases.find(type);
    if (database == nullptr) return Status::success();
    Statement query(*database,
                    "SELECT account FROM stores WHERE retired_at IS NULL AND account IS NOT NULL "
                    "ORDER BY id");
    while (query.step()) names.push_back(query.text(0));
    return Status::success();
  });
  if (sources.status.isSuccess()) sources.names = std::move(names);
  return sources;
}

bool ImageSyncDataSource::_isTetheredSyncingDisabled(SyncDataType type) {
  Database* const database = _databases.find(type);
  if (database == nullptr) return false;
  Statement query(*database, "SELECT value FROM settings WHERE name = ?1");
  return query.bind(kTetheredSetting).step() && query.bytes(0) == "yes";
}

Status ImageSyncDataSource::setTetheredSyncingDisabled(SyncDataType type, bool disabled) {
  return statusOf([&] {
    if (_isTetheredSyncingDisabled(type) == disabled) return Status::success();
    execute(_databases.make(type),
            "INSERT INTO settings (name, value) VALUES (?1, ?2) "
            "ON CONFLICT (name) DO UPDATE SET value = excluded.value",
            kTetheredSetting, disabled ? "yes" : "no");
    return Status::success();
  });
}

}  // namespace deviceimage
