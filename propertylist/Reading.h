#pragma once

#include <cstddef>
#include <cstdint>
#include <mutex>
#include <optional>
#include <span>
#include <string>

#include "propertylist/Export.h"
#include "propertylist/Value.h"

namespace propertylist {

// What the readers refuse, so that no input costs more than its size allows.
inline constexpr std::size_t kMaximumDepth = 512;                         // nested containers
inline constexpr std::size_t kMinimumValueLimit = 1'000'000;              // see readPropertyList
inline constexpr std::size_t kMaximumFileSize = std::size_t{256} << 20U;  // bytes, in a file or not

// Why bytes are no property list, and where.
struct PROPERTYLIST_EXPORT ReadError {
  std::string what;                       // one sentence without a full stop
  std::optional<std::size_t> byteOffset;  // binary form
  std::optional<std::size_t> line;        // XML form, from 1
  std::optional<std::size_t> column;      // XML form, in bytes, from 1
  // `what` with the place, as one line.
  std::string description() const;
};

// Either a value or an error, never both and never neither.
struct PROPERTYLIST_EXPORT ReadResult {
  std::optional<Value> value;
  ReadError error;
};

// Reads a property list of either form; the first bytes tell which. Any bytes may come: a result is
// always given, nothing is thrown (but std::bad_alloc), the stack used is bounded, and time and
// memory stay proportional to the input. A list is refused when it is nested deeper than
// kMaximumDepth, or when it would have more values than the larger of kMinimumValueLimit and its
// size in bytes once everything that the binary form shares is written out.
PROPERTYLIST_EXPORT ReadResult readPropertyList(std::span<const std::uint8_t> bytes);
PROPERTYLIST_EXPORT ReadResult readBinaryPropertyList(std::span<const std::uint8_t> bytes);
PROPERTYLIST_EXPORT ReadResult readXMLPropertyList(std::span<const std::uint8_t> bytes);

// Reads the file at `path` in one go. A link as the last part of the path is not followed, a file
// that is not regular is not opened for waiting, and one above kMaximumFileSize is refused: each is
// an error like unreadable content.
struct PROPERTYLIST_EXPORT FileReadResult {
  std::optional<Value> value;
  bool exists = false;  // false when there is nothing at `path`; `error` then says so too
  std::string error;    // empty exactly when there is a value
};
PROPERTYLIST_EXPORT FileReadResult readPropertyListFile(const std::string& path);

// Reads files for whoever asks for one file again and again: one with the same bytes as the list
// that was read last has the same value, and is not taken apart anew. The file itself is read each
// time, so what anybody wrote meanwhile is seen. Keeps the bytes of one list, up to
// kMaximumKeptSize, and its value. For any thread.
class PROPERTYLIST_EXPORT RepeatedReading {
 public:
  static constexpr std::size_t kMaximumKeptSize = std::size_t{1} << 20U;  // bytes
  // As propertylist::readPropertyListFile.
  FileReadResult readPropertyListFile(const std::string& path);

 private:
  std::mutex _lock;
  Bytes _bytes;
  std::optional<Value> _value;
};

}  // namespace propertylist
