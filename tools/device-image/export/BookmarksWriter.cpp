#include "tools/device-image/export/BookmarksWriter.h"

#include <fmt/format.h>

#include <map>
#include <string>
#include <vector>

#include "tools/device-image/Records.h"
#include "tools/device-image/import/HtmlTags.h"
#include "tools/device-image/import/TextRecord.h"

namespace tools {
namespace {

using deviceimage::Collection;
using deviceimage::Dataclass;
using deviceimage::Record;
using deviceimage::RecordStores;
using deviceimage::Row;
using deviceimage::Store;

constexpr std::string_view kBeginning =
    "<!DOCTYPE NETSCAPE-Bookmark-file-1>\n"
    "<META HTTP-EQUIV=\"Content-Type\" CONTENT=\"text/html; charset=UTF-8\">\n"
    "<TITLE>Bookmarks</TITLE>\n"
    "<H1>Bookmarks</H1>\n"
    "<DL><p>\n";
constexpr std::string_view kEnd = "</DL><p>\n";

// One folder of a store, with what it holds directly.
struct Folder {
  std::string name;
  bool isTop = false;  // its bookmarks stand outside folders
  std::vector<Row> folders;
  std::vector<Row> bookmarks;
};

class StoreWriter {
 public:
  StoreWriter(RecordStores& records, Output& output) : _records(records), _output(output) {}

  void write(const Store& store) {
    _load(store);
    for (const Row row : _roots)
      if (_folders[row].isTop) _writeBookmarks(_folders[row]);
    for (const Row row : _roots)
      if (!_folders[row].isTop || !_folders[row].folders.empty()) _writeFolders(row);
  }

 private:
  void _load(const Store& store) {
    const RecordStores::Collections listed =
        _records.listCollections(Dataclass::bookmarks, store.row);
    requireSuccess(listed.status, "the export is incomplete");
    for (const Collection& collection : listed.collections) {
      const bool isRoot = collection.path.size() == 1;
      _folders[collection.row] = {
          collection.path.back(), isRoot && collection.path.back() == kTopBookmarksFolder, {}, {}};
      if (isRoot)
        _roots.push_back(collection.row);
      else
        _folders[collection.parent.value_or(0)].folders.push_back(collection.row);
    }
    requireSuccess(
        _records.visitRecords(Dataclass::bookmarks, store.row, false,
                              [&](const Record& record, std::string_view) {
                                _folders[record.collection].bookmarks.push_back(record.row);
                                return true;
                              }),
        "the export is incomplete");
  }

  // Folders in folders wait on a list of their own, so that the stack does not grow with them.
  void _writeFolders(Row root) {
    struct Open {
      const Folder* folder;
      std::size_t next = 0;  // of its folders
    };
    std::vector<Open> open;
    const auto enter = [&](Row row) {
      const Folder& folder = _folders[row];
      _line(fmt::format("<DT><H3>{}</H3>", escapedForHtml(folder.name)));
      _line("<DL><p>");
      ++_depth;
      if (!folder.isTop) _writeBookmarks(folder);
      open.push_back({&folder});
    };
    enter(root);
    while (!open.empty()) {
      Open& inner = open.back();
      if (inner.next < inner.folder->folders.size()) {
        enter(inner.folder->folders[inner.next++]);
        continue;
      }
      --_depth;
      _line("</DL><p>");
      open.pop_back();
    }
  }

  void _writeBookmarks(const Folder& folder) {
    for (const Row bookmark : folder.bookmarks) _writeBookmark(bookmark);
  }

  void _writeBookmark(Row row) {
    const RecordStores::Content content = _records.readContent(Dataclass::bookmarks, row);
    requireSuccess(content.status, "the export is incomplete");
    if (content.bytes) _line(*content.bytes);
  }

  void _line(std::string_view text) {
    _output.write(std::string(4 * _depth, ' '));
    _output.write(text);
    _output.write("\n");
  }

  RecordStores& _records;
  Output& _output;
  std::size_t _depth = 1;
  std::map<Row, Folder> _folders;
  std::vector<Row> _roots;
};

}  // namespace

void writeBookmarks(RecordStores& records, const std::vector<Store>& stores, Output& output) {
  output.write(kBeginning);
  for (const Store& store : stores) StoreWriter(records, output).write(store);
  output.write(kEnd);
}

}  // namespace tools
