#pragma once

#include <string_view>

namespace platform {

// The web bookmarks service. The system calls no operation of it: it reaches bookmarks through the
// bookmarks data source, and speaks to the service by this one source option alone.
struct BookmarksStore {
  // Clear hidden bookmarks too. Passed with the value true.
  static constexpr std::string_view ClearHiddenBookmarksOption = "ClearHiddenBookmarks";
};

}  // namespace platform
