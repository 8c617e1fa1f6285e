#include "tools/device-image/import/CardReader.h"

#include <gtest/gtest.h>

#include <chrono>
#include <string>

#include "tests/tools/device-image/ReaderMatchers.h"

namespace tools {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr std::string_view kAda =
    "BEGIN:VCARD\r\nVERSION:3.0\r\nUID:ada-1\r\nFN:Ada Müller\r\nN:Müller;Ada;;;\r\n"
    "X-UNKNOWN;TYPE=\"a:b;c\":kept\r\nREV:2026-11-21T02:40:00Z\r\nEND:VCARD\r\n";
constexpr std::string_view kBob =
    "begin:vcard\nversion:4.0\nitem1.FN:Bob\nUID:urn:uuid:b\nend:vcard\n";

TEST(Cards, KeepEachCardByteForByte) {
  const ReadText read = readCards(std::string(kAda) + std::string(kBob));
  ASSERT_THAT(read.problems, IsEmpty());
  ASSERT_EQ(read.records.size(), 2U);
  EXPECT_EQ(read.records[0].dataclass, deviceimage::Dataclass::contacts);
  EXPECT_EQ(read.records[0].bytes, kAda);
  EXPECT_EQ(read.records[0].uid, "ada-1");
  EXPECT_EQ(read.records[0].modified, 1795228800);
  EXPECT_EQ(read.records[0].line, 1U);
  EXPECT_EQ(read.records[1].bytes, kBob);
  EXPECT_EQ(read.records[1].uid, "urn:uuid:b");
  EXPECT_EQ(read.records[1].modified, std::nullopt);
  EXPECT_EQ(read.records[1].line, 9U);
}

TEST(Cards, LeaveBlankLinesAndAByteOrderMarkOutside) {
  const ReadText read =
      readCards("\xEF\xBB\xBF" + std::string(kBob) + "\n \r\n" + std::string(kAda) + "\n\n");
  ASSERT_THAT(read.problems, IsEmpty());
  ASSERT_EQ(read.records.size(), 2U);
  EXPECT_EQ(read.records[0].bytes, kBob);
  EXPECT_EQ(read.records[1].bytes, kAda);
}

TEST(Cards, KeepFoldsAndUnfoldThemToReadTheUID) {
  const std::string_view card =
      "BEGIN:VCARD\nVERSION:3.0\nUID:first\n -second\nFN:M\xC3\n \xBCller\nPHOTO;ENCODING=b:AAAA\n"
      "\tBBBB\nEND:VCARD\n";
  const ReadText read = readCards(card);
  ASSERT_THAT(read.problems, IsEmpty());
  ASSERT_EQ(read.records.size(), 1U);
  EXPECT_EQ(read.records[0].uid, "first-second");
  EXPECT_EQ(read.records[0].bytes, card);
}

TEST(Cards, GetTheLineEndThatTheEndOfAFileTookFromThem) {
  const ReadText unixCard = readCards("BEGIN:VCARD\nVERSION:3.0\nFN:A\nEND:VCARD");
  ASSERT_EQ(unixCard.records.size(), 1U);
  EXPECT_EQ(unixCard.records[0].bytes, "BEGIN:VCARD\nVERSION:3.0\nFN:A\nEND:VCARD\n");
  const ReadText card = readCards("BEGIN:VCARD\r\nVERSION:3.0\r\nFN:A\r\nEND:VCARD");
  ASSERT_EQ(card.records.size(), 1U);
  EXPECT_EQ(card.records[0].bytes, "BEGIN:VCARD\r\nVERSION:3.0\r\nFN:A\r\nEND:VCARD\r\n");
}

TEST(Cards, DeriveAMissingUIDFromTheBytes) {
  const ReadText read = readCards("BEGIN:VCARD\nVERSION:3.0\nFN:A\nEND:VCARD\n");
  ASSERT_EQ(read.records.size(), 1U);
  EXPECT_EQ(read.records[0].uid,
            "73d9b6c4d3132ef897b5bbdf75afa269d017fbf0ba452b7b46c2a61508cfa1bb");
}

struct BadCard {
  const char* name;
  std::string text;
  std::size_t line;
  const char* what;
};

TEST(Cards, OneBadCardSpoilsNoOther) {
  const BadCard kCases[] = {
      {"no end", "BEGIN:VCARD\nVERSION:3.0\nFN:X\n", 6,
       "the card that begins here has no END:VCARD"},
      {"old version", "BEGIN:VCARD\nVERSION:2.1\nFN:X\nEND:VCARD\n", 6,
       "the card's version is not 3.0 or 4.0"},
      {"no version", "BEGIN:VCARD\nFN:X\nEND:VCARD\n", 6, "the card has no VERSION"},
      {"no name", "BEGIN:VCARD\nVERSION:4.0\nEND:VCARD\n", 6, "the card has no name (FN or N)"},
      {"line without colon", "BEGIN:VCARD\nVERSION:4.0\nFN:X\nrubbish\nEND:VCARD\n", 9,
       "the line is no vCard property (NAME:VALUE)"},
      {"open quotation mark", "BEGIN:VCARD\nVERSION:4.0\nFN;A=\"x:X\nEND:VCARD\n", 8,
       "the line is no vCard property (NAME:VALUE)"},
      {"not UTF-8", "BEGIN:VCARD\nVERSION:4.0\nFN:\xFC\nEND:VCARD\n", 8,
       "the line is not UTF-8 text"},
      {"a NUL byte", std::string("BEGIN:VCARD\nVERSION:4.0\nFN:\0\nEND:VCARD\n", 39), 8,
       "the line is not UTF-8 text"},
      {"two UIDs", "BEGIN:VCARD\nVERSION:4.0\nUID:1\nUID:2\nFN:X\nEND:VCARD\n", 9,
       "the card has a second UID"},
      {"long UID",
       "BEGIN:VCARD\nVERSION:4.0\nFN:X\nUID:" + std::string(1001, 'x') + "\nEND:VCARD\n", 9,
       "the UID is longer than 1000 bytes"},
      {"text outside", "hello\nthere\n", 6, "the text here belongs to no card"},
      {"too large",
       "BEGIN:VCARD\nVERSION:4.0\nFN:X\nNOTE:" + std::string(kMaximumRecordSize, 'x') +
           "\nEND:VCARD\n",
       6, "the card is larger than 16 MiB"},
  };
  for (const BadCard& c : kCases) {
    SCOPED_TRACE(c.name);
    const ReadText read = readCards(std::string(kBob) + c.text + std::string(kAda));
    EXPECT_THAT(read.problems, ElementsAre(ProblemAt(c.line, c.what)));
    ASSERT_EQ(read.records.size(), 2U);
    EXPECT_EQ(read.records[0].bytes, kBob);
    EXPECT_EQ(read.records[1].bytes, kAda);
  }
}

TEST(Cards, AFileWithoutCardsIsAProblem) {
  for (const std::string_view text : {"", "\n \n"}) {
    const ReadText read = readCards(text);
    EXPECT_THAT(read.problems, ElementsAre(ProblemAt(1, "the file holds no card")));
  }
}

}  // namespace
}  // namespace tools
