#pragma once

#include <string_view>

#include "tools/device-image/import/TextRecord.h"

namespace tools {

// The bookmarks of an HTML file in the form in which browsers export them: nested <DL> lists of
// <DT><A HREF="...">title</A> and of folders, each an <H3>name</H3> with the list that follows.
//
// A record is one bookmark as it stands in the file, from its <DT> to its </A>, or to the end of
// the <DD> description after it, byte for byte. Its UID is derived from its folder and its address.
// The folders' names are kept; their other attributes are not, nor are folders without bookmarks.
// The file's top level lies in `outerFolder`.
ReadText readBookmarks(std::string_view bytes, FolderPath outerFolder = {});

}  // namespace tools
