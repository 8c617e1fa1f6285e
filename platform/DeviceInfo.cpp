#include "platform/DeviceInfo.h"

#include <vector>

namespace platform {
namespace {

// The parts of `path` with "." and ".." resolved by their text alone. A ".." with nothing left to
// go back over is dropped, as "/.." is "/".
std::vector<std::string_view> resolvedParts(std::string_view path) {
  std::vector<std::string_view> parts;
  while (!path.empty()) {
    const std::string_view part = path.substr(0, path.find('/'));
    path.remove_prefix(part.size() < path.size() ? part.size() + 1 : part.size());
    if (part == "..") {
      if (!parts.empty()) parts.pop_back();
    } else if (!part.empty() && part != ".") {
      parts.push_back(part);
    }
  }
  return parts;
}

}  // namespace

std::string joinedPath(std::string_view root, std::string_view path) {
  std::string joined(root.substr(0, root.find_last_not_of('/') + 1));
  for (const std::string_view part : resolvedParts(path)) joined.append("/").append(part);
  return joined.empty() ? "/" : joined;
}

}  // namespace platform
