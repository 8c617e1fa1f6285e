#include "tools/device-image/import/BookmarksReader.h"

#include <algorithm>
#include <charconv>
#include <optional>
#include <utility>

#include "deviceimage/ContentHash.h"
#include "tools/device-image/import/HtmlTags.h"
#include "tools/device-image/import/TextLines.h"

namespace tools {
namespace {

// The seconds of ADD_DATE and LAST_MODIFIED; some programs write them in smaller units.
std::optional<std::int64_t> secondsOf(const std::optional<std::string>& text) {
  if (!text) return std::nullopt;
  std::int64_t value = 0;
  const auto parsed = std::from_chars(text->data(), text->data() + text->size(), value);
  if (parsed.ec != std::errc{} || value <= 0) return std::nullopt;
  constexpr std::int64_t kLatestSecond = 100'000'000'000;  // in the year 5138
  while (value > kLatestSecond) value /= 1000;
  return value;
}

// Whether the tag may stand inside a title or a description.
bool isInline(const HtmlTag& tag) {
  static constexpr std::string_view kOutside[] = {"A",   "/A",  "DT",  "/DT",   "DD",
                                                  "/DD", "DL",  "/DL", "H1",    "/H1",
                                                  "H3",  "/H3", "HR",  "/HTML", "/BODY"};
  return std::find(std::begin(kOutside), std::end(kOutside), tag.name) == std::end(kOutside);
}

class Reader {
 public:
  Reader(std::string_view bytes, FolderPath outerFolder) : _bytes(bytes), _tags(bytes) {
    _folders.push_back({std::make_shared<const FolderPath>(std::move(outerFolder)), false});
  }

  ReadText read() {
    _advance();
    while (_tag) _takeTag();
    if (!_isBookmarks)
      _result.problems.push_back(
          {1, "the file holds no bookmarks", "choose a bookmarks file in HTML form"});
    return std::move(_result);
  }

 private:
  struct Folder {
    std::shared_ptr<const FolderPath> path;
    bool isTooDeep = false;
  };

  void _advance() { _tag = _tags.next(); }

  // Tags are asked for in the order of the text, so this is linear in total.
  std::size_t _lineOf(std::size_t offset) {
    const std::string_view between = _bytes.substr(_lineOffset, offset - _lineOffset);
    _line += static_cast<std::size_t>(std::count(between.begin(), between.end(), '\n'));
    _lineOffset = offset;
    return _line;
  }

  void _fail(std::size_t line, std::string what, std::string remedy) {
    _result.problems.push_back({line, std::move(what), std::move(remedy)});
  }

  void _takeTag() {
    const HtmlTag tag = *_tag;
    if (tag.isBroken) {
      _fail(_lineOf(tag.begin), "the tag here is not closed",
            "close it with \">\", and its attributes with quotation marks");
      _item.reset();
      _advance();
      return;
    }
    if (tag.name == "A") return _takeBookmark(tag);
    _advance();
    if (tag.name == "DT") {
      _item = tag;
      return;
    }
    _item.reset();
    if (tag.name == "H3") _takeFolderName(tag);
    if (tag.name == "DL") _enterFolder();
    if (tag.name == "/DL" && _folders.size() > 1) _folders.pop_back();
  }

  // Passes over everything up to the next tag that ends a title or a description.
  void _passInline() {
    while (_tag && !_tag->isBroken && isInline(*_tag)) _advance();
  }

  void _takeFolderName(const HtmlTag& tag) {
    const std::size_t line = _lineOf(tag.begin);
    _passInline();
    const std::size_t end = _tag ? _tag->begin : _bytes.size();
    if (_tag && _tag->name == "/H3") _advance();
    const std::string name = resolvedEntities(trimmed(_bytes.substr(tag.end, end - tag.end)));
    if (!isText(name) || name.size() > kMaximumFolderName) {
      _fail(line, "the folder's name is not UTF-8 text of at most 1000 bytes",
            "correct the name; its bookmarks were put into the folder above");
      return;
    }
    _pendingName = name;
  }

  void _enterFolder() {
    _isBookmarks = true;
    Folder folder = _folders.back();
    if (!_pendingName.empty()) {
      if (folder.path->size() == kMaximumFolderDepth) {
        folder.isTooDeep = true;
      } else {
        FolderPath path = *folder.path;
        path.push_back(std::exchange(_pendingName, {}));
        folder.path = std::make_shared<const FolderPath>(std::move(path));
      }
    }
    _pendingName.clear();
    _folders.push_back(std::move(folder));
  }

  // The end of the <DD> description that follows, or `end` without one.
  std::size_t _descriptionEnd(std::size_t end) {
    if (!_tag || _tag->isBroken || _tag->name != "DD") return end;
    if (!trimmed(_bytes.substr(end, _tag->begin - end)).empty()) return end;
    _advance();
    _passInline();
    const std::size_t next = _tag ? _tag->begin : _bytes.size();
    const std::string_view text = trimmed(_bytes.substr(end, next - end));
    return static_cast<std::size_t>(text.data() + text.size() - _bytes.data());
  }

  void _takeBookmark(const HtmlTag& anchor) {
    _isBookmarks = true;
    const std::optional<HtmlTag> item = std::exchange(_item, std::nullopt);
    const bool isItem = item && trimmed(_bytes.substr(item->end, anchor.begin - item->end)).empty();
    const std::size_t begin = isItem ? item->begin : anchor.begin;
    const std::size_t line = _lineOf(begin);
    _advance();
    _passInline();
    if (!_tag || _tag->isBroken || _tag->name != "/A") {
      _fail(line, "the bookmark has no </A>", "add </A> after its title");
      return;
    }
    const std::size_t anchorEnd = _tag->end;
    _advance();
    _add(anchor, line, _bytes.substr(begin, _descriptionEnd(anchorEnd) - begin));
  }

  void _add(const HtmlTag& anchor, std::size_t line, std::string_view text) {
    const std::optional<std::string> address = anchor.attribute("HREF");
    if (!address || address->empty())
      return _fail(line, "the bookmark has no address", "give it an HREF attribute");
    if (!isText(text))
      return _fail(line, "the bookmark is not UTF-8 text", "save the file as UTF-8");
    if (text.size() > kMaximumRecordSize)
      return _fail(line, "the bookmark is larger than 16 MiB", "make its icon smaller");
    if (_folders.back().isTooDeep)
      return _fail(line, "the bookmark's folder is nested deeper than 64 levels",
                   "move the folder up");
    TextRecord record;
    record.dataclass = deviceimage::Dataclass::bookmarks;
    record.bytes = text;
    record.folder = _folders.back().path;
    record.uid = _uidOf(*record.folder, *address);
    record.modified = secondsOf(anchor.attribute("LAST_MODIFIED"));
    if (!record.modified) record.modified = secondsOf(anchor.attribute("ADD_DATE"));
    record.line = line;
    _result.records.push_back(std::move(record));
  }

  // No name holds a NUL byte, so different places give different texts. The top folder's content
  // lies in no folder of a file, whether it came in one or not.
  static std::string _uidOf(const FolderPath& folder, const std::string& address) {
    std::string identity;
    if (folder != FolderPath{std::string(kTopBookmarksFolder)})
      for (const std::string& name : folder) identity.append(name).push_back('\0');
    identity += '\0';
    return deviceimage::contentHash(identity + address);
  }

  std::string_view _bytes;
  HtmlTags _tags;
  std::optional<HtmlTag> _tag;   // the next one to be taken
  std::optional<HtmlTag> _item;  // the <DT> that came just before it
  std::vector<Folder> _folders;  // the lists that the reader is in; the first stands for the file
  std::string _pendingName;      // of the folder whose list comes next
  std::size_t _line = 1;
  std::size_t _lineOffset = 0;
  bool _isBookmarks = false;
  ReadText _result;
};

}  // namespace

ReadText readBookmarks(std::string_view bytes, FolderPath outerFolder) {
  return Reader(bytes, std::move(outerFolder)).read();
}

}  // namespace tools
