#pragma once

#include <cstdint>
#include <memory>
#include <mutex>
#include <string>
#include <string_view>
#include <utility>
#include <variant>
#include <vector>

#include "deviceimage/Descriptor.h"
#include "deviceimage/DeviceImage.h"

namespace deviceimage {

// A file of the image that only grows, one line at a time. It is opened at the first line, made
// when missing, and never replaced. Lines of several processes do not mix: each is one write. Any
// thread.
class Journal {
 public:
  // `name` is one of DeviceImage's constants.
  Journal(std::shared_ptr<const DeviceImage> image, std::string_view name)
      : _image(std::move(image)), _name(name) {}
  // Adds `line`, which has no line break, and a line end. False when it could not be written, or
  // not to its end.
  bool append(std::string_view line);

 private:
  std::shared_ptr<const DeviceImage> _image;
  std::string_view _name;
  std::mutex _mutex;
  Descriptor _file;
};

// The time now as "2026-11-21T03:04:05Z".
std::string timestamp();

// `text` as one line for people: control characters are written as "\n", "\t", "\r" or "\x1b" and
// their like, in bytes; so are those of the second control block, which some terminals obey.
std::string oneLine(std::string_view text);

// The members of a JSON object, in order. Texts are views; bytes of them that are not UTF-8 become
// U+FFFD.
using JSONValue = std::variant<std::string_view, bool, std::int64_t, std::vector<std::string>>;
using JSONMembers = std::vector<std::pair<std::string_view, JSONValue>>;
std::string jsonLine(const JSONMembers& members);

}  // namespace deviceimage
