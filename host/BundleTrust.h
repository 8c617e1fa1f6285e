#pragma once

#include <optional>
#include <string>

namespace host {

// Why the file or folder at `path` (absolute, without links) is not to be trusted with code: one
// sentence that names it and the remedy; empty when it is fit. It must belong to root, to the
// caller or to the owner of the host's program, be writable by nobody else, and be a regular file
// or a folder, never a link. The folders above it must not let others replace it: those that others
// may write must be sticky, as /tmp is. Folders that hold the host's program too are not looked at,
// since who could replace the migrator there could replace the host.
std::optional<std::string> whyNotTrusted(const std::string& path);

}  // namespace host
