#pragma once

#include <string>
#include <vector>

#include "deviceimage/SyncAgent.h"
#include "host/Observation.h"
#include "host/Report.h"

namespace host {

// What became of the records between two looks at the image.
struct RecordAccounting {
  std::vector<DataclassReport> dataclasses;  // by account in file order, then by dataclass
  std::vector<std::string> leftBehind;       // sentences: records that are not in the local store
  std::vector<std::string> contradictions;   // sentences: what does not add up
};

// Finds each record of before by its content and by the record that it is a version of, never by
// what the migrator says. An account to be retired has a line for each dataclass it has enabled,
// and for any other of which its stores hold records. A store that several such accounts share
// belongs to the first one in file order that has the dataclass enabled, else to the first one. All
// other stores, and the records that the local and the retired stores had before, must still be
// there unchanged and as many times; nothing else may come new into any store. What was not seen
// before has no lines; it is left behind.
RecordAccounting accountForRecords(const Observation& before, const Observation& after,
                                   const Selection& selection, const deviceimage::SyncAgent& agent);

}  // namespace host
