#include "tools/device-image/import/NotesReader.h"

#include <gtest/gtest.h>

#include <string>

#include "deviceimage/ContentHash.h"
#include "tests/tools/device-image/ReaderMatchers.h"

namespace tools {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

TEST(Notes, AFileIsOneNoteKeptByteForByte) {
  struct Case {
    const char* name;
    std::string text;
    std::string uid;  // empty: derived
    std::optional<std::int64_t> modified;
  };
  const Case kCases[] = {
      {"with headers",
       "Subject: Einkauf\r\nUID: n-1\r\nDate: Sat, 21 Nov 2026 02:40:00 +0000\r\n\r\nMilch\r\n",
       "n-1", 1795228800},
      {"ISO date", "date: 2026-11-21T02:40:00Z\nuid: n-2\n\n\nbody: x", "n-2", 1795228800},
      {"folded header", "Subject: long\n title\nUID: n-3\n\nx\n", "n-3", std::nullopt},
      {"headers alone", "UID: n-4\nSubject: empty\n", "n-4", std::nullopt},
      {"no headers", "Buy milk\n\nUID: no\n", "", std::nullopt},
      {"a UID in the text", "Subject: x\n\nUID: no\n", "", std::nullopt},
      {"headers that are none", "Subject: x\nnot a header\n\nUID: no\n", "", std::nullopt},
      {"bad date", "UID: n-5\nDate: soon\n\nx", "n-5", std::nullopt},
      {"a form feed", "page one\n\f\npage two\n", "", std::nullopt},
  };
  for (const Case& c : kCases) {
    SCOPED_TRACE(c.name);
    const ReadText read = readNotes(c.text);
    EXPECT_THAT(read.problems, IsEmpty());
    ASSERT_EQ(read.records.size(), 1U);
    EXPECT_EQ(read.records[0].dataclass, deviceimage::Dataclass::notes);
    EXPECT_EQ(read.records[0].bytes, c.text);
    EXPECT_EQ(read.records[0].uid, c.uid.empty() ? deviceimage::contentHash(c.text) : c.uid);
    EXPECT_EQ(read.records[0].modified, c.modified);
  }
}

TEST(Notes, ADigestHoldsOneNoteInEachPart) {
  const ReadText read = readNotes(
      "MIME-Version: 1.0\nContent-Type: multipart/digest; boundary=\"b:1\"\n\n"
      "--b:1\n\nUID: one\n\nfirst\n\n--b:1\n\nsecond, without a line "
      "end\n--b:1\n\n\r\nthird\r\n\n--b:1--\n");
  ASSERT_THAT(read.problems, IsEmpty());
  ASSERT_EQ(read.records.size(), 3U);
  EXPECT_EQ(read.records[0].bytes, "UID: one\n\nfirst\n");
  EXPECT_EQ(read.records[0].uid, "one");
  EXPECT_EQ(read.records[0].line, 6U);
  EXPECT_EQ(read.records[1].bytes, "second, without a line end");
  EXPECT_EQ(read.records[2].bytes, "\r\nthird\r\n");
}

TEST(Notes, OneBadPartOfADigestSpoilsNoOther) {
  const ReadText read = readNotes(
      "Content-Type: multipart/digest; boundary=b\n\n--b\n\none\n--b\nno empty "
      "line\n--b\n\n\xFF\n--b\n\n\n"
      "--b\n\ntwo\n");
  EXPECT_THAT(read.problems, ElementsAre(ProblemAt(7, "the part does not begin with an empty line"),
                                         ProblemAt(10, "the note is not UTF-8 text"),
                                         ProblemAt(13, "the note is empty"),
                                         ProblemAt(14, "the digest has no end")));
  ASSERT_EQ(read.records.size(), 1U);
  EXPECT_EQ(read.records[0].bytes, "one");
}

TEST(Notes, WhatIsNoTextIsAProblem) {
  EXPECT_THAT(readNotes("").problems, ElementsAre(ProblemAt(1, "the note is empty")));
  EXPECT_THAT(readNotes(" \n\t").problems, ElementsAre(ProblemAt(1, "the note is empty")));
  EXPECT_THAT(readNotes("gr\xFC\xDF").problems,
              ElementsAre(ProblemAt(1, "the note is not UTF-8 text")));
  EXPECT_THAT(readNotes(std::string(kMaximumRecordSize + 1, 'x')).problems,
              ElementsAre(ProblemAt(1, "the note is larger than 16 MiB")));
  EXPECT_THAT(readNotes("UID: " + std::string(1001, 'x') + "\n\nx").problems,
              ElementsAre(ProblemAt(1, "the UID is longer than 1000 bytes")));
}

}  // namespace
}  // namespace tools
