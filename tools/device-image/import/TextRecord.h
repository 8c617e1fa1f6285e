#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "deviceimage/Dataclass.h"

namespace tools {

// What the readers of text refuse, so that no input costs more than its size allows.
inline constexpr std::size_t kMaximumFileSize = std::size_t{256} << 20U;   // bytes
inline constexpr std::size_t kMaximumRecordSize = std::size_t{16} << 20U;  // bytes
inline constexpr std::size_t kMaximumUIDSize = 1000;                       // bytes
inline constexpr std::size_t kMaximumFolderDepth = 64;
inline constexpr std::size_t kMaximumFolderName = 1000;  // bytes

// The folder of a store that holds the bookmarks which lie in no folder of a file.
inline constexpr std::string_view kTopBookmarksFolder = "Bookmarks";

// The folders around a bookmark in its store, outermost first; empty at the top level.
using FolderPath = std::vector<std::string>;

// One record as a reader found it.
struct TextRecord {
  deviceimage::Dataclass dataclass = deviceimage::Dataclass::contacts;
  std::string uid;    // the text's own, or one derived from the content; never empty
  std::string bytes;  // exactly what is kept in the store
  std::optional<std::int64_t> modified;      // seconds since 1970; empty when the text does not say
  std::shared_ptr<const FolderPath> folder;  // of a bookmark; null for the other kinds
  std::size_t line = 0;                      // where the record begins, from 1
};

// Why a part of a file was not read, and what its owner can do about it. Both texts are sentences
// without a full stop.
struct Problem {
  std::size_t line = 0;  // from 1
  std::string what;
  std::string remedy;
};

// What a reader made of one file. A problem stands for a record that is missing from `records` (or
// for text that belongs to none); the other records are whole whatever the problems are.
struct ReadText {
  std::vector<TextRecord> records;
  std::vector<Problem> problems;
};

}  // namespace tools
