#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace host {

// What the reasons call the code that is to be loaded, and what they advise.
struct TrustWords {
  std::string_view code;    // "the migrator"
  std::string_view caller;  // "the user who runs the host"
  std::string_view remedy;  // for what is no code at all: "install the migrator again"
};

// Why the file or folder at `path` (absolute, without links) is not to be trusted with code: one
// sentence that names it and the remedy; empty when it is fit. It must belong to root, to the
// caller or to the owner of this program, be writable by nobody else, and be a regular file
// or a folder, never a link. The folders above it must not let others replace it: those that others
// may write must be sticky, as /tmp is. Folders that hold this program too are not looked at, since
// who could replace the code there could replace the program.
std::optional<std::string> whyNotTrusted(const std::string& path, const TrustWords& words);

// The same of the folder and of everything in it, since code may bring libraries of its own.
std::optional<std::string> whyFolderNotTrusted(const std::string& path, const TrustWords& words);

}  // namespace host
