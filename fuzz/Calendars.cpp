// Any bytes, read as an iCalendar file: records and problems, and each event or to-do is a calendar
// of its own.
#include "tools/device-image/import/CalendarReader.h"

#include "fuzz/RecordReader.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const tools::ReadText read = tools::readCalendars(fuzz::textOf(data, size));
  fuzz::checkRecords(read);
  fuzz::checkEachRecordAlone(read, tools::readCalendars);
  return 0;
}
