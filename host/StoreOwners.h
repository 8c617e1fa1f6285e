#pragma once

#include <cstddef>
#include <map>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "deviceimage/SyncAgent.h"
#include "host/Observation.h"
#include "host/Report.h"

namespace host {

// Which account's line of the report the records of a service store are counted in.
class StoreOwners {
 public:
  // Makes the lines, without figures yet, for the accounts to be retired.
  StoreOwners(const Observation& before, const Selection& selection,
              const deviceimage::SyncAgent& agent);

  // By account in file order, then by dataclass.
  std::vector<DataclassReport>& lines() { return _lines; }
  // The line that the records of this store belong to; null when no account to be retired owns it.
  DataclassReport* lineOf(const ObservedStore& store);

 private:
  using StoreName = std::pair<deviceimage::Dataclass, std::string>;
  using LineName = std::pair<std::size_t, deviceimage::Dataclass>;  // account in file order

  std::vector<DataclassReport> _lines;
  std::map<StoreName, std::size_t> _owners;  // to a line
};

}  // namespace host
