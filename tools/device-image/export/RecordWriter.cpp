#include "tools/device-image/export/RecordWriter.h"

#include <fmt/format.h>

#include <string>

#include "deviceimage/ContentHash.h"
#include "tools/device-image/Records.h"
#include "tools/device-image/export/BookmarksWriter.h"
#include "tools/device-image/import/NotesReader.h"

namespace tools {
namespace {

using deviceimage::Dataclass;
using deviceimage::Record;
using deviceimage::RecordStores;
using deviceimage::Store;

void visitAll(RecordStores& records, Dataclass dataclass, const std::vector<Store>& stores,
              bool withContent, const RecordStores::Visitor& visit) {
  for (const Store& store : stores)
    requireSuccess(records.visitRecords(dataclass, store.row, withContent, visit),
                   "the export is incomplete");
}

void writeTexts(RecordStores& records, Dataclass dataclass, const std::vector<Store>& stores,
                Output& output) {
  std::string_view missingLineEnd;  // of the record before; the last one stays as it is
  visitAll(records, dataclass, stores, true, [&](const Record&, std::string_view content) {
    output.write(missingLineEnd);
    output.write(content);
    missingLineEnd = content.ends_with('\n')                          ? ""
                     : content.find("\r\n") != std::string_view::npos ? "\r\n"
                                                                      : "\n";
    return true;
  });
}

// Whether a file that holds this note alone is read as this note.
bool standsAlone(std::string_view note) {
  const ReadText read = readNotes(note);
  return read.records.size() == 1 && read.records.front().bytes == note;
}

void writeNotes(RecordStores& records, const std::vector<Store>& stores, Output& output) {
  // The boundary comes from the hashes of all notes, so that no note can hold it.
  std::string hashes;
  std::size_t count = 0;
  bool doesLastStandAlone = true;
  visitAll(records, Dataclass::notes, stores, true,
           [&](const Record& record, std::string_view content) {
             hashes += record.contentHash;
             ++count;
             doesLastStandAlone = standsAlone(content);
             return true;
           });
  const std::string boundary = "notes-" + deviceimage::contentHash(hashes);
  const bool isDigest = count > 1 || !doesLastStandAlone;
  if (isDigest)
    output.write(fmt::format("MIME-Version: 1.0\nContent-Type: multipart/digest; boundary=\"{}\"\n",
                             boundary));
  visitAll(records, Dataclass::notes, stores, true, [&](const Record&, std::string_view content) {
    if (isDigest) output.write(fmt::format("\n--{}\n\n", boundary));
    output.write(content);
    return true;
  });
  if (isDigest) output.write(fmt::format("\n--{}--\n", boundary));
}

}  // namespace

void writeRecords(RecordStores& records, Dataclass dataclass, const std::vector<Store>& stores,
                  Output& output) {
  if (dataclass == Dataclass::bookmarks)
    writeBookmarks(records, stores, output);
  else if (dataclass == Dataclass::notes)
    writeNotes(records, stores, output);
  else
    writeTexts(records, dataclass, stores, output);
}

}  // namespace tools
