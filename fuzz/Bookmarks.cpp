// Any bytes, read as a bookmarks file: records and problems, and each bookmark is a part of the
// file.
#include "tools/device-image/import/BookmarksReader.h"

#include "fuzz/RecordReader.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string_view text = fuzz::textOf(data, size);
  const tools::ReadText read = tools::readBookmarks(text);
  fuzz::checkRecords(read);
  for (const tools::TextRecord& record : read.records)
    FUZZ_CHECK(text.find(record.bytes) != std::string_view::npos);
  fuzz::checkEachRecordAlone(read,
                             [](std::string_view bytes) { return tools::readBookmarks(bytes); });
  return 0;
}
