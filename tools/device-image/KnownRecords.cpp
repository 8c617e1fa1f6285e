#include "tools/device-image/KnownRecords.h"

#include <algorithm>

#include "deviceimage/ContentHash.h"
#include "tools/device-image/Records.h"
#include "tools/device-image/import/TextReader.h"

namespace tools {

using deviceimage::Dataclass;
using deviceimage::NewRecord;
using deviceimage::Record;
using deviceimage::RecordStores;
using deviceimage::Row;

namespace {

constexpr std::string_view kNothingDone = "nothing was imported";

std::string_view withoutLineEnd(std::string_view text) {
  if (text.ends_with('\n')) text.remove_suffix(1);
  if (text.ends_with('\r')) text.remove_suffix(1);
  return text;
}

}  // namespace

KnownRecords::KnownRecords(RecordStores& stores, Dataclass dataclass,
                           const std::optional<std::string>& account)
    : _stores(stores), _dataclass(dataclass) {
  const RecordStores::Found found = stores.findStore(dataclass, account);
  requireSuccess(found.status, kNothingDone);
  if (!found.store) return;
  if (dataclass == Dataclass::bookmarks) {
    const RecordStores::Collections listed = stores.listCollections(dataclass, found.store->row);
    requireSuccess(listed.status, kNothingDone);
    for (const deviceimage::Collection& collection : listed.collections)
      _places.emplace(collection.row, collection.path);
  }
  requireSuccess(
      stores.visitRecords(dataclass, found.store->row, false,
                          [this](const Record& record, std::string_view) {
                            _contents.emplace(_placeOf(record.collection), record.contentHash);
                            _rows.emplace(record.conflictCopyOf.value_or(record.uid), record.row);
                            return true;
                          }),
      kNothingDone);
}

bool KnownRecords::hold(const NewRecord& record) {
  const Place place = _dataclass == Dataclass::bookmarks ? record.collectionPath : Place();
  if (_holdContent(place, record.content) || _holdContent(place, withoutLineEnd(record.content)))
    return true;
  const auto [begin, end] = _rows.equal_range(record.uid);
  return std::any_of(begin, end,
                     [&](const auto& entry) { return _isReadAs(entry.second, record); });
}

KnownRecords::Place KnownRecords::_placeOf(Row collection) const {
  const auto found = _places.find(collection);
  return found != _places.end() ? found->second : Place();
}

bool KnownRecords::_holdContent(const Place& place, std::string_view content) const {
  return _contents.contains({place, deviceimage::contentHash(content)});
}

bool KnownRecords::_isReadAs(Row row, const NewRecord& record) {
  const RecordStores::Content content = _stores.readContent(_dataclass, row);
  requireSuccess(content.status, kNothingDone);
  if (!content.bytes) return false;
  const ReadText read = readText(_dataclass, *content.bytes);
  return read.records.size() == 1 && read.records.front().bytes == record.content;
}

}  // namespace tools
