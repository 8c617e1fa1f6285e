#pragma once

#include <map>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <unordered_map>
#include <utility>
#include <vector>

#include "deviceimage/KeyedHash.h"
#include "deviceimage/RecordStores.h"

namespace tools {

// The records that a store holds before an import, by what an export makes of them. An export
// writes line ends and blanks around records, and no UID that a record's text does not hold; so a
// record that comes back may differ in these, and is the same all the same.
class KnownRecords {
 public:
  // Reads the active store of the account, or, without one, the device-local store. `stores`
  // outlives the object.
  KnownRecords(deviceimage::RecordStores& stores, deviceimage::Dataclass dataclass,
               const std::optional<std::string>& account);

  // Whether the store holds the record: in the same folder with equal content, or with a content
  // that is read as this record alone.
  bool hold(const deviceimage::NewRecord& record);

 private:
  using Place = std::vector<std::string>;  // a bookmark's folder; of other records, nothing
  Place _placeOf(deviceimage::Row collection) const;
  bool _holdContent(const Place& place, std::string_view content) const;
  bool _isReadAs(deviceimage::Row row, const deviceimage::NewRecord& record);

  deviceimage::RecordStores& _stores;
  deviceimage::Dataclass _dataclass;
  std::map<deviceimage::Row, Place> _places;          // by collection
  std::set<std::pair<Place, std::string>> _contents;  // by hash
  // By the UID of all versions.
  std::unordered_multimap<std::string, deviceimage::Row, deviceimage::KeyedHash> _rows;
};

}  // namespace tools
