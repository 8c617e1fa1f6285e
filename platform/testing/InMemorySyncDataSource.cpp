#include "platform/testing/InMemorySyncDataSource.h"

#include <algorithm>
#include <utility>

namespace platform {
namespace {

using RecordKind = InMemorySyncDataSource::RecordKind;

std::string textOf(const DataSourceOptions& options) {
  if (!options) return "none";
  std::string text;
  for (const propertylist::Dictionary::Entry& option : *options)
    text.append(text.empty() ? "{" : ", ").append(option.key());
  return text.empty() ? "{}" : text + "}";
}

std::string_view nameOf(SyncDataType type) {
  switch (type) {
    case SyncDataType::mailAccounts:
      return "MailAccounts";
    case SyncDataType::contacts:
      return "Contacts";
    case SyncDataType::calendars:
      return "Calendars";
    case SyncDataType::bookmarks:
      return "Bookmarks";
    case SyncDataType::notes:
      break;
  }
  return "Notes";
}

std::optional<RecordKind> kindSelectedBy(const DataSourceOptions& options) {
  if (options && options->contains(EventsOnlySourceOption)) return RecordKind::event;
  if (options && options->contains(RemindersOnlySourceOption)) return RecordKind::reminder;
  return std::nullopt;
}

}  // namespace

// An open view of the store `key`. Without `kind` it holds the records of every kind.
struct InMemorySyncDataSource::Source : DataSource {
  Source(StoreKey viewed, const DataSourceOptions& options)
      : key(std::move(viewed)), kind(kindSelectedBy(options)) {
    name = key.first.value_or("local") + " " + key.second;
    if (options) name += " " + textOf(options);
  }
  bool holds(const Record& record) const { return !kind || *kind == record.kind; }

  static std::string nameOf(const DataSourcePtr& source) {
    const auto* viewed = dynamic_cast<const Source*>(source.get());
    return viewed == nullptr ? "none" : viewed->name;
  }
  // The source behind the handle while it is open, else null.
  static Source* open(const DataSourcePtr& source) {
    auto* viewed = dynamic_cast<Source*>(source.get());
    return viewed == nullptr || viewed->closed ? nullptr : viewed;
  }

  StoreKey key;
  std::optional<RecordKind> kind;
  std::string name;
  bool clears = false;          // pending: comes before what is put in
  std::vector<Record> putting;  // pending
  bool closed = false;
};

namespace {

Status noSource() { return Status::failure(22, "there is no open data source"); }

}  // namespace

std::vector<InMemorySyncDataSource::Record> InMemorySyncDataSource::records(
    const Account& account, const std::string& syncDataclassName) const {
  const auto found = stores.find({account, syncDataclassName});
  return found == stores.end() ? std::vector<Record>() : found->second.records;
}

bool InMemorySyncDataSource::storeExists(const Account& account,
                                         const std::string& syncDataclassName) const {
  return stores.contains({account, syncDataclassName});
}

std::optional<std::string> InMemorySyncDataSource::dataclassNameForSyncType(SyncDataType type) {
  if (_fails("dataclassNameForSyncType", {nameOf(type)})) return std::nullopt;
  return std::string(nameOf(type));
}

SyncDataSource::Created InMemorySyncDataSource::createDataSource(
    const std::optional<std::string>& syncDataclassName,
    const std::optional<std::string>& accountIdentifier, const DataSourceOptions& options) {
  Created created;
  created.status = _answered(
      "createDataSource",
      {syncDataclassName.value_or("none"), accountIdentifier.value_or("none"), textOf(options)},
      [&] {
        if (!syncDataclassName) return Status::failure(22, "there is no dataclass");
        created.source =
            std::make_shared<Source>(StoreKey(accountIdentifier, *syncDataclassName), options);
        ++_openSources;
        return Status::success();
      });
  return created;
}

SyncDataSource::Counted InMemorySyncDataSource::countRecords(const DataSourcePtr& source) {
  Counted counted;
  counted.status = _answered("countRecords", {Source::nameOf(source)}, [&] {
    const Source* viewed = Source::open(source);
    if (viewed == nullptr) return noSource();
    for (const Record& record : records(viewed->key.first, viewed->key.second))
      if (viewed->holds(record)) ++counted.count;
    return Status::success();
  });
  return counted;
}

Status InMemorySyncDataSource::clearAllRecords(const DataSourcePtr& source) {
  return _answered("clearAllRecords", {Source::nameOf(source)}, [&] {
    Source* viewed = Source::open(source);
    if (viewed == nullptr) return noSource();
    viewed->putting.clear();
    viewed->clears = true;
    return Status::success();
  });
}

Status InMemorySyncDataSource::clearSyncAnchors(const DataSourcePtr& source) {
  return _answered("clearSyncAnchors", {Source::nameOf(source)}, [&] {
    const Source* viewed = Source::open(source);
    if (viewed == nullptr) return noSource();
    const auto found = stores.find(viewed->key);
    if (found != stores.end()) found->second.hasAnchors = false;
    return Status::success();
  });
}

Status InMemorySyncDataSource::migrateRecords(const DataSourcePtr& from,
                                              const DataSourcePtr& into) {
  return _answered("migrateRecords", {Source::nameOf(from), Source::nameOf(into)}, [&] {
    const Source* source = Source::open(from);
    Source* target = Source::open(into);
    if (source == nullptr || target == nullptr) return noSource();
    for (const Record& record : records(source->key.first, source->key.second))
      if (source->holds(record) && target->holds(record)) target->putting.push_back(record);
    return Status::success();
  });
}

Status InMemorySyncDataSource::commit(const DataSourcePtr& source) {
  return _answered("commit", {Source::nameOf(source)}, [&] {
    Source* viewed = Source::open(source);
    if (viewed == nullptr) return noSource();
    if (std::exchange(viewed->clears, false)) _take(*viewed, viewed->kind);
    // The device-local store comes into being at its first commit, a service's with its first
    // record.
    if (viewed->key.first && viewed->putting.empty()) return Status::success();
    Store& store = stores[viewed->key];
    for (const Record& record : std::exchange(viewed->putting, {})) _put(store, record);
    return Status::success();
  });
}

Status InMemorySyncDataSource::deleteDataSource(const DataSourcePtr& source) {
  return _answered("deleteDataSource", {Source::nameOf(source)}, [&] {
    Source* viewed = Source::open(source);
    if (viewed == nullptr) return noSource();
    viewed->closed = true;
    --_openSources;
    return Status::success();
  });
}

Status InMemorySyncDataSource::removeStore(const DataSourcePtr& source, bool flag) {
  return _answered("removeStore", {Source::nameOf(source), flag ? "true" : "false"}, [&] {
    const Source* viewed = Source::open(source);
    if (viewed == nullptr) return noSource();
    _take(*viewed, std::nullopt);
    stores.erase(viewed->key);
    return Status::success();
  });
}

SyncDataSource::ExternalSources InMemorySyncDataSource::externalSourcesEnabledForSyncType(
    SyncDataType type) {
  ExternalSources answered;
  answered.status = _answered("externalSourcesEnabledForSyncType", {nameOf(type)}, [&] {
    answered.names.emplace();
    if (tetheredSyncingDisabled.contains(type)) answered.names->push_back("DenyTethered");
    const auto found = externalSources.find(type);
    if (found != externalSources.end())
      answered.names->insert(answered.names->end(), found->second.begin(), found->second.end());
    return Status::success();
  });
  return answered;
}

Status InMemorySyncDataSource::setTetheredSyncingDisabled(SyncDataType type, bool disabled) {
  return _answered("setTetheredSyncingDisabled", {nameOf(type), disabled ? "true" : "false"}, [&] {
    if (disabled)
      tetheredSyncingDisabled.insert(type);
    else
      tetheredSyncingDisabled.erase(type);
    return Status::success();
  });
}

// Takes the records of `kind`, or all, out of the source's store; those of a service are retired.
void InMemorySyncDataSource::_take(const Source& source, std::optional<RecordKind> kind) {
  const auto found = stores.find(source.key);
  if (found == stores.end()) return;
  std::vector<Record> kept;
  for (const Record& record : found->second.records) {
    if (kind && *kind != record.kind)
      kept.push_back(record);
    else if (source.key.first)
      retired.push_back({*source.key.first, source.key.second, record});
  }
  found->second.records = std::move(kept);
}

// Adds the record unless its content is there; beside another content of its UID as a conflict
// copy.
void InMemorySyncDataSource::_put(Store& store, const Record& record) {
  int versions = 0;
  for (const Record& present : store.records) {
    if (present.kind != record.kind) continue;
    if (present.uid != record.uid && present.conflictCopyOf != record.uid) continue;
    if (present.content == record.content) return;
    ++versions;
  }
  Record added = record;
  if (versions > 0) {
    added.conflictCopyOf = record.uid;
    added.uid += "-conflict-" + std::to_string(versions);
  }
  store.records.push_back(std::move(added));
}

}  // namespace platform
