#pragma once

#include <optional>
#include <string>

namespace host {

// Why the file or folder at `path` (absolute, without links) is not to be trusted with code: one
// sentence that names it and the remedy; empty when it is fit. It must belong to root or to the
// caller, be writable by nobody else, and be a regular file or a folder, never a link. The folders
// above it must not let others replace it: those that others may write must be sticky, as /tmp is.
std::optional<std::string> whyNotTrusted(const std::string& path);

}  // namespace host
