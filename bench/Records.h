#pragma once

#include <string>

namespace bench {

// Does with the database at `path` what moving the records of a kind does here, by the database's
// own library alone: each record of the store of `account` is read, looked for in the local store
// by content, source and UID, and copied; then the store is retired. The database has our schema,
// and the transaction is synchronised as ours is. Answers how many records were copied; throws
// std::runtime_error when the library says no.
int moveWithTheLibrary(const std::string& path, const std::string& account,
                       const std::string& kind);

}  // namespace bench
