#include "tools/device-image/import/CalendarReader.h"

#include <gtest/gtest.h>

#include <string>

#include "deviceimage/ContentHash.h"
#include "tests/tools/device-image/ReaderMatchers.h"

namespace tools {
namespace {

using deviceimage::Dataclass;
using testing::ElementsAre;
using testing::IsEmpty;

const std::string kHead = "BEGIN:VCALENDAR\r\nVERSION:2.0\r\nPRODID:-//x//EN\r\nNAME:Büro\r\n";
const std::string kTail = "END:VCALENDAR\r\n";
const std::string kParis =
    "BEGIN:VTIMEZONE\r\nTZID:Europe/Paris\r\nBEGIN:STANDARD\r\nDTSTART:19701025T030000\r\n"
    "TZOFFSETFROM:+0200\r\nTZOFFSETTO:+0100\r\nEND:STANDARD\r\nEND:VTIMEZONE\r\n";
const std::string kTokyo =
    "BEGIN:VTIMEZONE\r\nTZID:Asia/Tokyo\r\nBEGIN:STANDARD\r\nDTSTART:19700101T000000\r\n"
    "TZOFFSETFROM:+0900\r\nTZOFFSETTO:+0900\r\nEND:STANDARD\r\nEND:VTIMEZONE\r\n";
const std::string kWeekly =
    "BEGIN:VEVENT\r\nUID:weekly\r\nDTSTAMP:20261101T000000Z\r\n"
    "DTSTART;TZID=Europe/Paris:20261102T090000\r\nRRULE:FREQ=WEEKLY\r\nX-OWN;A=\"b:c\":d\r\n"
    "BEGIN:VALARM\r\nACTION:DISPLAY\r\nTRIGGER:-PT5M\r\nEND:VALARM\r\nEND:VEVENT\r\n";
const std::string kException =
    "BEGIN:VEVENT\r\nUID:weekly\r\nLAST-MODIFIED:20261121T024000Z\r\n"
    "RECURRENCE-ID;TZID=Europe/Paris:20261109T090000\r\nDTSTART;TZID=\"Asia/"
    "Tokyo\":20261110T090000\r\n"
    "SUMMARY:folded\r\n  here\r\nEND:VEVENT\r\n";
const std::string kOnce =
    "BEGIN:VEVENT\r\nUID:once\r\nDTSTART;VALUE=DATE:20261224\r\nEND:VEVENT\r\n";
const std::string kTask = "BEGIN:VTODO\r\nUID:task\r\nSUMMARY:Milch\r\nEND:VTODO\r\n";

TEST(Calendars, KeepACalendarWithOneRecordByteForByte) {
  const std::string kCalendars[] = {
      kHead + kParis + kTokyo + kWeekly + kException + kTail,
      // Whatever else the calendar holds stays with its only record.
      kHead + kOnce + "BEGIN:X-OWN\r\nA:b\r\nEND:X-OWN\r\nX-LATE:yes\r\n" + kTail,
  };
  for (const std::string& calendar : kCalendars) {
    const ReadText read = readCalendars(calendar);
    EXPECT_THAT(read.problems, IsEmpty());
    ASSERT_EQ(read.records.size(), 1U);
    EXPECT_EQ(read.records[0].bytes, calendar);
    EXPECT_EQ(read.records[0].dataclass, Dataclass::calendars);
  }
}

TEST(Calendars, AreTheSameWhateverStandsAroundThemInAFile) {
  const std::string kUnix = "BEGIN:VCALENDAR\nVERSION:2.0\nBEGIN:VTODO\nUID:1\nEND:VTODO\n";
  const struct {
    const char* name;
    std::string file, calendar;
  } kCases[] = {
      {"byte order mark", "\xEF\xBB\xBF" + kHead + kTask + kTail, kHead + kTask + kTail},
      {"empty lines", "\r\n" + kHead + kTask + kTail + "\r\n", kHead + kTask + kTail},
      {"no line end", kHead + kTask + "END:VCALENDAR", kHead + kTask + kTail},
      {"half a line end", kHead + kTask + "END:VCALENDAR\r", kHead + kTask + kTail},
      {"another line end", kUnix + "END:VCALENDAR", kUnix + "END:VCALENDAR\n"},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    const ReadText read = readCalendars(c.file);
    EXPECT_THAT(read.problems, IsEmpty());
    ASSERT_EQ(read.records.size(), 1U);
    EXPECT_EQ(read.records[0].bytes, c.calendar);
  }
  const ReadText divided = readCalendars(kHead + kOnce + kTask + "END:VCALENDAR");
  ASSERT_EQ(divided.records.size(), 2U);
  EXPECT_EQ(divided.records[0].bytes, kHead + kOnce + kTail);
  EXPECT_EQ(divided.records[1].bytes, kHead + kTask + kTail);
}

TEST(Calendars, DivideAFileIntoOneCalendarForEachUID) {
  const ReadText read =
      readCalendars(kHead + kParis + kTokyo + kWeekly + kOnce + kException + kTask + kTail);
  ASSERT_THAT(read.problems, IsEmpty());
  ASSERT_EQ(read.records.size(), 3U);
  EXPECT_EQ(read.records[0].uid, "weekly");
  EXPECT_EQ(read.records[0].bytes, kHead + kParis + kTokyo + kWeekly + kException + kTail);
  EXPECT_EQ(read.records[0].modified, 1795228800);
  EXPECT_EQ(read.records[0].line, 21U);
  EXPECT_EQ(read.records[1].uid, "once");
  EXPECT_EQ(read.records[1].bytes, kHead + kOnce + kTail);
  EXPECT_EQ(read.records[1].modified, std::nullopt);
  EXPECT_EQ(read.records[2].uid, "task");
  EXPECT_EQ(read.records[2].bytes, kHead + kTask + kTail);
  EXPECT_EQ(read.records[2].dataclass, Dataclass::reminders);
}

TEST(Calendars, WhatWasDividedReadsBackToTheSameRecords) {
  const ReadText divided = readCalendars(kHead + kParis + kWeekly + kOnce + kTask + kTail);
  std::string stream;
  for (const TextRecord& record : divided.records) stream += record.bytes;
  const ReadText again = readCalendars(stream);
  EXPECT_THAT(again.problems, IsEmpty());
  ASSERT_EQ(again.records.size(), 3U);
  for (std::size_t i = 0; i < 3; ++i) {
    EXPECT_EQ(again.records[i].bytes, divided.records[i].bytes);
    EXPECT_EQ(again.records[i].uid, divided.records[i].uid);
  }
}

TEST(Calendars, AnEventAndAToDoOfOneUIDAreTwoRecords) {
  const ReadText read = readCalendars(
      kHead + kTask + "BEGIN:VEVENT\nUID:task\nDTSTART:20260101\nEND:VEVENT\n" + kTail);
  ASSERT_THAT(read.problems, IsEmpty());
  ASSERT_EQ(read.records.size(), 2U);
  EXPECT_EQ(read.records[0].dataclass, Dataclass::reminders);
  EXPECT_EQ(read.records[1].dataclass, Dataclass::calendars);
}

TEST(Calendars, AComponentWithoutUIDIsARecordOfItsOwn) {
  const std::string nameless = "BEGIN:VTODO\r\nSUMMARY:?\r\nEND:VTODO\r\n";
  const std::string other = "BEGIN:VTODO\r\nSUMMARY:!\r\nEND:VTODO\r\n";
  const ReadText read = readCalendars(kHead + nameless + other + kTail);
  ASSERT_THAT(read.problems, IsEmpty());
  ASSERT_EQ(read.records.size(), 2U);
  EXPECT_EQ(read.records[0].bytes, kHead + nameless + kTail);
  EXPECT_EQ(read.records[0].uid, deviceimage::contentHash(kHead + nameless + kTail));
  EXPECT_NE(read.records[0].uid, read.records[1].uid);
}

TEST(Calendars, AnEmptyCalendarHoldsNothingAndIsNoProblem) {
  const ReadText read = readCalendars(kHead + kParis + kTail);
  EXPECT_THAT(read.records, IsEmpty());
  EXPECT_THAT(read.problems, IsEmpty());
}

struct BadPart {
  const char* name;
  std::string text;
  std::size_t line;
  const char* what;
};

TEST(Calendars, OneBadRecordSpoilsNoOther) {
  const BadPart kCases[] = {
      {"event without end", "BEGIN:VEVENT\r\nUID:x\r\nDTSTART:20260101\r\n", 9,
       "the VEVENT that begins here has no END:VEVENT"},
      {"alarm without end",
       "BEGIN:VEVENT\r\nUID:x\r\nDTSTART:20260101\r\nBEGIN:VALARM\r\nEND:VEVENT\r\n", 13,
       "END:VALARM is missing before this line"},
      {"event without start", "BEGIN:VEVENT\r\nUID:x\r\nEND:VEVENT\r\n", 9,
       "the event has no DTSTART"},
      {"no property", "BEGIN:VTODO\r\nUID:x\r\nrubbish\r\nEND:VTODO\r\n", 11,
       "the line is no iCalendar property (NAME:VALUE)"},
      {"not UTF-8", "BEGIN:VTODO\r\nUID:x\r\nSUMMARY:\xE9\r\nEND:VTODO\r\n", 11,
       "the line is not UTF-8 text"},
      {"two UIDs", "BEGIN:VTODO\r\nUID:x\r\nUID:y\r\nEND:VTODO\r\n", 11,
       "the component has a second UID"},
      {"journal", "BEGIN:VJOURNAL\r\nUID:x\r\nEND:VJOURNAL\r\n", 9,
       "the VJOURNAL here is no event and no to-do"},
      {"end without begin", "END:VALARM\r\n", 9, "this END has no BEGIN before it"},
      {"bad line of the calendar", "rubbish\r\n", 9,
       "the line is no iCalendar property (NAME:VALUE)"},
      {"bad exception",
       "BEGIN:VTODO\r\nUID:x\r\nEND:VTODO\r\nBEGIN:VTODO\r\nUID:x\r\n?\r\nEND:VTODO\r\n", 14,
       "the line is no iCalendar property (NAME:VALUE)"},
  };
  for (const BadPart& c : kCases) {
    SCOPED_TRACE(c.name);
    const ReadText read = readCalendars(kHead + kOnce + c.text + kTask + kTail);
    EXPECT_THAT(read.problems, ElementsAre(ProblemAt(c.line, c.what)));
    ASSERT_EQ(read.records.size(), 2U);
    EXPECT_EQ(read.records[0].bytes, kHead + kOnce + kTail);
    EXPECT_EQ(read.records[1].bytes, kHead + kTask + kTail);
  }
}

TEST(Calendars, ACalendarThatIsCutOffKeepsItsWholeRecords) {
  const ReadText read = readCalendars(kHead + kOnce + kTask + "BEGIN:VTODO\r\nUID:lost\r\n");
  EXPECT_THAT(read.problems,
              ElementsAre(ProblemAt(1, "the calendar that begins here has no END:VCALENDAR"),
                          ProblemAt(13, "the VTODO that begins here has no END:VTODO")));
  ASSERT_EQ(read.records.size(), 2U);
  EXPECT_EQ(read.records[0].bytes, kHead + kOnce + kTail);
  EXPECT_EQ(read.records[1].bytes, kHead + kTask + kTail);
}

TEST(Calendars, AFileThatIsCutOffBeforeALineEndGivesWholeRecords) {
  const std::string record = kHead + kOnce + kTail;
  const std::string cut = kHead + kOnce;
  for (const std::size_t missing : {1U, 2U}) {  // of the last line end
    const ReadText read = readCalendars(cut.substr(0, cut.size() - missing));
    ASSERT_EQ(read.records.size(), 1U);
    EXPECT_EQ(read.records[0].bytes, record);
  }
  const ReadText read = readCalendars("BEGIN:VCALENDAR\nVERSION:2.0\n" + kTask + "X-LAST:1");
  ASSERT_EQ(read.records.size(), 1U);
  EXPECT_EQ(read.records[0].bytes,
            "BEGIN:VCALENDAR\nVERSION:2.0\nX-LAST:1\n" + kTask + "END:VCALENDAR\n");
}

TEST(Calendars, AnotherVersionIsRefusedAndTheNextCalendarRead) {
  const ReadText read = readCalendars("BEGIN:VCALENDAR\nVERSION:1.0\nEND:VCALENDAR\n" + kHead +
                                      kTask + kTail + "x\n");
  EXPECT_THAT(read.problems, ElementsAre(ProblemAt(1, "the calendar's VERSION is not 2.0"),
                                         ProblemAt(13, "the text here belongs to no calendar")));
  ASSERT_EQ(read.records.size(), 1U);
  EXPECT_EQ(read.records[0].bytes, kHead + kTask + kTail);
}

TEST(Calendars, NestingIsBounded) {
  std::string deep = "BEGIN:VTODO\r\nUID:deep\r\n";
  for (int i = 0; i < 100'000; ++i) deep += "BEGIN:X\r\n";
  const ReadText read = readCalendars(kHead + deep + "END:VTODO\r\n" + kTask + kTail);
  EXPECT_THAT(read.problems,
              ElementsAre(ProblemAt(14, "the component is nested deeper than 8 levels")));
  ASSERT_EQ(read.records.size(), 1U);
  EXPECT_EQ(read.records[0].bytes, kHead + kTask + kTail);
}

TEST(Calendars, DividingIsBoundedByTheFileSize) {
  // Two megabytes of properties, which each of 4000 records would repeat.
  std::string file = kHead;
  for (int i = 0; i < 2048; ++i) file += "X-LONG:" + std::string(1000, 'x') + "\n";
  for (int i = 0; i < 4000; ++i) file += "BEGIN:VTODO\nUID:" + std::to_string(i) + "\nEND:VTODO\n";
  const ReadText read = readCalendars(file + kTail);
  EXPECT_EQ(read.records.size() + read.problems.size(), 4000U);
  EXPECT_GT(read.records.size(), 16U);
  EXPECT_LT(read.records.size(), 64U);
  EXPECT_THAT(read.problems.front(),
              ProblemAt(read.problems.front().line,
                        "the file grows too large when it is divided into records"));
}

TEST(Calendars, AFileWithoutCalendarIsAProblem) {
  EXPECT_THAT(readCalendars("").problems, ElementsAre(ProblemAt(1, "the file holds no calendar")));
}

}  // namespace
}  // namespace tools
