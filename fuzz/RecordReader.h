#pragma once

#include <string_view>

#include "fuzz/Check.h"
#include "tools/device-image/import/TextRecord.h"

namespace fuzz {

inline std::string_view textOf(const std::uint8_t* data, std::size_t size) {
  return {reinterpret_cast<const char*>(data), size};
}

// What every reader of records promises about any text.
inline void checkRecords(const tools::ReadText& read) {
  for (const tools::TextRecord& record : read.records) {
    FUZZ_CHECK(!record.uid.empty());
    FUZZ_CHECK(record.bytes.size() <= tools::kMaximumRecordSize);
    FUZZ_CHECK(record.line > 0);
    FUZZ_CHECK(!record.folder || record.folder->size() <= tools::kMaximumFolderDepth);
  }
  for (const tools::Problem& problem : read.problems) {
    FUZZ_CHECK(problem.line > 0);
    FUZZ_CHECK(!problem.what.empty() && !problem.remedy.empty());
  }
}

// A record that was read is a text of its own: read alone it is one record, of the same bytes.
template <typename Reader>
void checkEachRecordAlone(const tools::ReadText& read, Reader reader) {
  for (const tools::TextRecord& record : read.records) {
    const tools::ReadText alone = reader(record.bytes);
    FUZZ_CHECK(alone.problems.empty() && alone.records.size() == 1);
    FUZZ_CHECK(alone.records.front().bytes == record.bytes);
    FUZZ_CHECK(alone.records.front().dataclass == record.dataclass);
    FUZZ_CHECK(alone.records.front().modified == record.modified);
  }
}

}  // namespace fuzz
