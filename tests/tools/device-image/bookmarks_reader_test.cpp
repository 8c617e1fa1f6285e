#include "tools/device-image/import/BookmarksReader.h"

#include <gtest/gtest.h>

#include <string>

#include "tests/tools/device-image/ReaderMatchers.h"

namespace tools {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr std::string_view kFile = R"(<!DOCTYPE NETSCAPE-Bookmark-file-1>
<!-- Bookmarks -->
<META HTTP-EQUIV="Content-Type" CONTENT="text/html; charset=UTF-8">
<TITLE>Bookmarks</TITLE>
<H1>Bookmarks Menu</H1>

<DL><p>
    <DT><A HREF="https://a.example/" ADD_DATE="1795228800">Äpfel &amp; Birnen</A>
    <DT><H3 ADD_DATE="1" PERSONAL_TOOLBAR_FOLDER="true">R&amp;D &eacute;t&eacute;</H3>
    <DL><p>
        <DT><A HREF="https://b.example/?x=1&amp;y=2" ADD_DATE="1" LAST_MODIFIED="1795228801000"
               X-OWN="kept">Zwei<br>Zeilen</A>
        <DD>A description
            of two lines
        <DT><H3>Inner</H3>
        <DL><p>
            <dt><a href='https://c.example/'>日本語</a>
        </DL><p>
        <HR>
    </DL><p>
    <A HREF="https://d.example/">bare</A>
</DL><p>
)";

TEST(Bookmarks, KeepEachBookmarkAsItStands) {
  const ReadText read = readBookmarks(kFile);
  ASSERT_THAT(read.problems, IsEmpty());
  ASSERT_EQ(read.records.size(), 4U);
  EXPECT_EQ(read.records[0].bytes,
            R"(<DT><A HREF="https://a.example/" ADD_DATE="1795228800">Äpfel &amp; Birnen</A>)");
  EXPECT_EQ(
      read.records[1].bytes,
      R"(<DT><A HREF="https://b.example/?x=1&amp;y=2" ADD_DATE="1" LAST_MODIFIED="1795228801000"
               X-OWN="kept">Zwei<br>Zeilen</A>
        <DD>A description
            of two lines)");
  EXPECT_EQ(read.records[2].bytes, "<dt><a href='https://c.example/'>日本語</a>");
  EXPECT_EQ(read.records[3].bytes, R"(<A HREF="https://d.example/">bare</A>)");
}

TEST(Bookmarks, KnowTheirFoldersDatesAndLines) {
  const ReadText read = readBookmarks(kFile);
  ASSERT_EQ(read.records.size(), 4U);
  EXPECT_THAT(*read.records[0].folder, IsEmpty());
  EXPECT_THAT(*read.records[1].folder, ElementsAre("R&D été"));
  EXPECT_THAT(*read.records[2].folder, ElementsAre("R&D été", "Inner"));
  EXPECT_THAT(*read.records[3].folder, IsEmpty());
  EXPECT_EQ(read.records[0].modified, 1795228800);
  EXPECT_EQ(read.records[1].modified, 1795228801);
  EXPECT_EQ(read.records[2].modified, std::nullopt);
  EXPECT_EQ(read.records[0].line, 8U);
  EXPECT_EQ(read.records[1].line, 11U);
  EXPECT_EQ(read.records[2].line, 17U);
  EXPECT_EQ(read.records[3].line, 21U);
}

TEST(Bookmarks, HaveAUIDThatDependsOnFolderAndAddressAlone) {
  const auto uidOf = [](const std::string& text) {
    const ReadText read = readBookmarks(text);
    return read.records.size() == 1 ? read.records[0].uid : "";
  };
  const std::string first = uidOf("<DL><DT><A HREF=\"x\">one</A></DL>");
  EXPECT_EQ(first.size(), 64U);
  EXPECT_EQ(uidOf("<DL>\n<DT><A ADD_DATE=\"3\" HREF=\"x\">renamed</A></DL>"), first);
  EXPECT_NE(uidOf("<DL><DT><A HREF=\"y\">one</A></DL>"), first);
  EXPECT_NE(uidOf("<DL><DT><H3>F</H3><DL><DT><A HREF=\"x\">one</A></DL></DL>"), first);
}

TEST(Bookmarks, LieInTheFolderThatTheFileIsPutInto) {
  const std::string inWork = "<DL><DT><H3>Work</H3><DL><DT><A HREF=\"x\">x</A></DL></DL>";
  const ReadText moved = readBookmarks("<DL><DT><A HREF=\"x\">x</A></DL>", {"Work"});
  ASSERT_EQ(moved.records.size(), 1U);
  EXPECT_THAT(*moved.records[0].folder, ElementsAre("Work"));
  EXPECT_EQ(moved.records[0].uid, readBookmarks(inWork).records.at(0).uid);
  EXPECT_THAT(*readBookmarks(inWork, {"Old"}).records.at(0).folder, ElementsAre("Old", "Work"));
}

TEST(Bookmarks, OfTheTopFolderAreThoseOfNoFolder) {
  const std::string top = readBookmarks("<DL><DT><A HREF=\"x\">x</A></DL>").records.at(0).uid;
  const std::string inside = "<DL><DT><H3>Bookmarks</H3><DL><DT><A HREF=\"x\">x</A></DL></DL>";
  EXPECT_EQ(readBookmarks(inside).records.at(0).uid, top);
  EXPECT_NE(readBookmarks(inside, {"Work"}).records.at(0).uid, top);
  EXPECT_NE(readBookmarks(inside, {"Bookmarks"}).records.at(0).uid, top);
}

struct BadBookmark {
  const char* name;
  std::string text;
  const char* what;
};

TEST(Bookmarks, OneBadBookmarkSpoilsNoOther) {
  const BadBookmark kCases[] = {
      {"no address", "<DT><A ADD_DATE=\"1\">x</A>", "the bookmark has no address"},
      {"empty address", "<DT><A HREF=\"\">x</A>", "the bookmark has no address"},
      {"no end", "<DT><A HREF=\"x\">x", "the bookmark has no </A>"},
      {"open quotation mark", "<DT><A HREF=\"x>x</A>", "the tag here is not closed"},
      {"open tag", "<DT><A HREF=\"x\"", "the tag here is not closed"},
      {"not UTF-8", "<DT><A HREF=\"x\">\xE4</A>", "the bookmark is not UTF-8 text"},
      {"open comment", "<!-- never closed", "the tag here is not closed"},
      {"too large", "<DT><A HREF=\"x\">" + std::string(kMaximumRecordSize, 'x') + "</A>",
       "the bookmark is larger than 16 MiB"},
      {"folder name not UTF-8", "<DT><H3>\xE4</H3>",
       "the folder's name is not UTF-8 text of at most 1000 bytes"},
  };
  for (const BadBookmark& c : kCases) {
    SCOPED_TRACE(c.name);
    const ReadText read = readBookmarks("<DL>\n<DT><A HREF=\"1\">a</A>\n" + c.text +
                                        "\n<DT><A HREF=\"2\">b</A>\n</DL>\n");
    EXPECT_THAT(read.problems, ElementsAre(ProblemAt(3, c.what)));
    ASSERT_EQ(read.records.size(), 2U);
    EXPECT_EQ(read.records[0].bytes, "<DT><A HREF=\"1\">a</A>");
    EXPECT_EQ(read.records[1].bytes, "<DT><A HREF=\"2\">b</A>");
  }
}

TEST(Bookmarks, FoldersMayNestToABound) {
  std::string text;
  for (int i = 0; i < 100'000; ++i) text += "<DL><DT><H3>f</H3>";
  text += "<DL><DT><A HREF=\"deep\">x</A></DL>";
  for (int i = 0; i < 100'000; ++i) text += "</DL>";
  const ReadText read = readBookmarks(text + "<DL><DT><A HREF=\"x\">x</A></DL>");
  EXPECT_THAT(read.problems,
              ElementsAre(ProblemAt(1, "the bookmark's folder is nested deeper than 64 levels")));
  ASSERT_EQ(read.records.size(), 1U);
  EXPECT_THAT(*read.records[0].folder, IsEmpty());
}

TEST(Bookmarks, AFileWithoutAnyIsAProblem) {
  for (const std::string_view text : {"", "hello", "<html></html>"})
    EXPECT_THAT(readBookmarks(text).problems,
                ElementsAre(ProblemAt(1, "the file holds no bookmarks")));
  EXPECT_THAT(readBookmarks("<DL><p></DL>").problems, IsEmpty());
}

}  // namespace
}  // namespace tools
