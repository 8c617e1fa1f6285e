#pragma once

#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "deviceimage/Dataclass.h"
#include "deviceimage/DeviceImage.h"
#include "deviceimage/RecordStores.h"
#include "host/Settings.h"
#include "host/UnusableDatabases.h"

namespace host {

// What the host remembers of one record: enough to find it again, wherever it went.
struct ObservedRecord {
  std::string uid;
  std::string contentHash;  // SHA-256 in 32 bytes
  // The record is another version of the one with this UID; empty: it is that one itself.
  std::string otherVersionOf = {};
  bool operator==(const ObservedRecord&) const = default;
};

// One store as one dataclass sees it, with its records by UID.
struct ObservedStore {
  deviceimage::Dataclass dataclass = deviceimage::Dataclass::contacts;
  std::optional<std::string> account;  // the account's store identifier; empty: the local store
  bool retired = false;
  std::vector<ObservedRecord> records;
};

// Accounts and records of an image at one moment.
struct Observation {
  Settings settings;
  std::vector<ObservedStore> stores;
  std::set<deviceimage::Dataclass> unseen;  // those whose database is left alone unread
  std::string error;  // what could not be read, in one sentence; empty when all else could
};
// Reads all of it, the records through `stores`, and changes nothing.
Observation observe(const deviceimage::DeviceImage& image, deviceimage::RecordStores& stores,
                    const std::vector<UnusableDatabase>& leftAlone);

}  // namespace host
