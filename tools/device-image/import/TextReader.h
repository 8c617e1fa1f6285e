#pragma once

#include <string_view>

#include "tools/device-image/import/TextRecord.h"

namespace tools {

// The records of a file, read in the form of the dataclass's records. Bookmarks of the file's top
// level lie in `outerFolder`.
ReadText readText(deviceimage::Dataclass dataclass, std::string_view bytes,
                  const FolderPath& outerFolder = {});

}  // namespace tools
