#pragma once

#include "deviceimage/RecordStores.h"
#include "tools/common/Files.h"

namespace tools {

// Writes the bookmarks of stores as the HTML that browsers import: one list for each folder, each
// bookmark as it lies in its store.
void writeBookmarks(deviceimage::RecordStores& records,
                    const std::vector<deviceimage::Store>& stores, Output& output);

}  // namespace tools
