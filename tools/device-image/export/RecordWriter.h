#pragma once

#include <vector>

#include "deviceimage/RecordStores.h"
#include "tools/common/Files.h"

namespace tools {

// Writes the records of stores of one dataclass, which import reads back to the same records, each
// of them byte for byte as it lies in its store:
//  - contacts, calendars and reminders one after the other, with a line end where a record has none
//    (a vCard file, an iCalendar stream);
//  - bookmarks in an HTML file with their folders;
//  - a single note as it is, several, or one that is a digest itself, as the parts of a
//    multipart/digest message.
// Ends the command when a database or the output fails.
void writeRecords(deviceimage::RecordStores& records, deviceimage::Dataclass dataclass,
                  const std::vector<deviceimage::Store>& stores, Output& output);

}  // namespace tools
