#pragma once

#include <string>
#include <string_view>

namespace deviceimage {

// SQLite's way to the files of a database whose directory is held open. It reaches a file there by
// the descriptor, whatever becomes of the names above, and nothing anywhere else: a journal may
// hold the name of another file, which SQLite would read and delete.
//
// - A name is taken as it is. SQLite would look up each link in it once and go by the result.
// - What is no regular file is neither opened nor taken for a journal: a link may lead out of the
//   image, and a FIFO would be waited for.
// - SQLite is told that it cannot look (SQLITE_IOERR_ACCESS) where a look fails, because a journal
//   that it does not see is never rolled back.

// Registers the way once a process, and answers its name, for sqlite3_open_v2. A DatabaseFailure
// when SQLite refuses it.
const char* wayToHeldFiles();

// What the file `name`, without "/", in the directory behind the descriptor is called there.
std::string heldPath(int directory, std::string_view name);

}  // namespace deviceimage
