// Any bytes, read as a vCard file: records and problems, and each card is a card of its own.
#include "tools/device-image/import/CardReader.h"

#include "fuzz/RecordReader.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const tools::ReadText read = tools::readCards(fuzz::textOf(data, size));
  fuzz::checkRecords(read);
  fuzz::checkEachRecordAlone(read, tools::readCards);
  return 0;
}
