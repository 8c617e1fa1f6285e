// The small parts that the readers share: lines, dates, tags and character references.
#include <gtest/gtest.h>

#include <optional>
#include <string>

#include "tools/common/Timestamps.h"
#include "tools/device-image/import/ContentLines.h"
#include "tools/device-image/import/HtmlTags.h"
#include "tools/device-image/import/TextLines.h"

namespace tools {
namespace {

TEST(TextLines, KnowWhereEachLineBeginsAndEnds) {
  TextLines lines("a\r\n\nb\rc");
  const auto first = lines.next();
  EXPECT_EQ(first->text, "a");
  EXPECT_EQ(first->end, 3U);
  const auto second = lines.next();
  EXPECT_EQ(second->text, "");
  EXPECT_EQ(second->number, 2U);
  const auto third = lines.next();
  EXPECT_EQ(third->text, "b\rc");
  EXPECT_EQ(third->begin, 4U);
  EXPECT_EQ(third->end, 7U);
  EXPECT_FALSE(lines.next());
}

TEST(Text, IsUTF8WithoutNUL) {
  struct Case {
    const char* name;
    std::string text;
    bool expected;
  };
  const Case kCases[] = {
      {"empty", "", true},
      {"ASCII", "abc\t", true},
      {"two to four bytes", "\xC3\xA9\xE2\x82\xAC\xF0\x9F\x98\x80", true},
      {"largest", "\xF4\x8F\xBF\xBF", true},
      {"NUL", std::string(1, '\0'), false},
      {"lone continuation", "\x80", false},
      {"cut off", "\xE2\x82", false},
      {"overlong slash", "\xC0\xAF", false},
      {"overlong of three", "\xE0\x80\xAF", false},
      {"overlong of four", "\xF0\x80\x80\xAF", false},
      {"surrogate", "\xED\xA0\x80", false},
      {"above the last", "\xF4\x90\x80\x80", false},
      {"bad third byte", "\xE2\x82\x41", false},
  };
  for (const Case& c : kCases) EXPECT_EQ(isText(c.text), c.expected) << c.name;
}

TEST(Dates, InISOForm) {
  struct Case {
    const char* text;
    std::optional<std::int64_t> seconds;
  };
  const Case kCases[] = {
      {"19700101T000000Z", 0},
      {"20261121T024000Z", 1795228800},
      {"2026-11-21T02:40:00Z", 1795228800},
      {"2026-11-21T03:40:00.25+01:00", 1795228800},
      {"2026-11-20T213000-0510", 1795228800},
      {"2026-11-21T02:40", 1795228800},
      {"20261121", 1795219200},
      {"2026-11-21", 1795219200},
      {"19691231T235959Z", -1},
      {"20260229", std::nullopt},
      {"20261121T250000Z", std::nullopt},
      {"20261121T024000Zx", std::nullopt},
      {"20261121x", std::nullopt},
      {"yesterday", std::nullopt},
      {"", std::nullopt},
  };
  for (const Case& c : kCases) EXPECT_EQ(secondsOfISODate(c.text), c.seconds) << c.text;
}

TEST(Dates, InMessageForm) {
  struct Case {
    const char* text;
    std::optional<std::int64_t> seconds;
  };
  const Case kCases[] = {
      {"Sat, 21 Nov 2026 02:40:00 +0000", 1795228800},
      {"21 Nov 2026 03:40:00 +0100 (somewhere)", 1795228800},
      {"Sat, 21 nov 2026 02:40 GMT", 1795228800},
      {"Sat, 31 Feb 2026 02:40:00 +0000", std::nullopt},
      {"Sat, 21 Nov", std::nullopt},
      {"", std::nullopt},
  };
  for (const Case& c : kCases) EXPECT_EQ(secondsOfMessageDate(c.text), c.seconds) << c.text;
}

TEST(ContentLines, ReadParametersThatHoldColonsAndSemicolons) {
  ContentLines lines("home.Tel;TYPE=\"a:b;c\";tzid=Europe/Paris:+33 1\n");
  const auto line = lines.next();
  EXPECT_EQ(line->name, "TEL");
  EXPECT_EQ(line->value, "+33 1");
  EXPECT_EQ(line->parameter("type"), "a:b;c");
  EXPECT_EQ(line->parameter("TZID"), "Europe/Paris");
  EXPECT_EQ(line->parameter("X"), std::nullopt);
}

TEST(Entities, AreResolvedOnce) {
  EXPECT_EQ(resolvedEntities("a &amp;lt; b &lt;i&gt; &quot;&apos;&#39;"), "a &lt; b <i> \"''");
  EXPECT_EQ(resolvedEntities("&eacute;&Auml;&nbsp;&yuml;&#8364;&#x20AC;&#128512;"), "éÄ\u00A0ÿ€€😀");
  EXPECT_EQ(resolvedEntities("R&D; & &unknown; &#xD800; &#0; &#1114112; &"),
            "R&D; & &unknown; &#xD800; &#0; &#1114112; &");
  EXPECT_EQ(resolvedEntities("&&amp;&amp"), "&&&amp");
}

TEST(Entities, EscapingIsUndoneByResolving) {
  EXPECT_EQ(escapedForHtml("a<b> & \"c\" é"), "a&lt;b&gt; &amp; &quot;c&quot; é");
  EXPECT_EQ(resolvedEntities(escapedForHtml("a<b> & \"c\" é &amp;")), "a<b> & \"c\" é &amp;");
}

TEST(HtmlTags, GiveAttributesInEveryWayOfWriting) {
  HtmlTags tags("x <!-- <A> --> <A HREF=\"a>b&amp;c\" add_date=12 SHORTCUT='s' FLAG>t</A>");
  const auto tag = tags.next();
  EXPECT_EQ(tag->name, "A");
  EXPECT_EQ(tag->attribute("href"), "a>b&c");
  EXPECT_EQ(tag->attribute("ADD_DATE"), "12");
  EXPECT_EQ(tag->attribute("shortcut"), "s");
  EXPECT_EQ(tag->attribute("flag"), "");
  EXPECT_EQ(tag->attribute("title"), std::nullopt);
  EXPECT_EQ(tags.next()->name, "/A");
  EXPECT_FALSE(tags.next());
}

TEST(HtmlTags, ABrokenTagEndsWhereTheNextBeginsOrItsLineEnds) {
  HtmlTags tags("<A HREF=\"open>x</A>\n<B\n<C <!-- <D>");
  EXPECT_TRUE(tags.next()->isBroken);
  const auto b = tags.next();
  EXPECT_EQ(b->name, "B");
  EXPECT_TRUE(b->isBroken);
  EXPECT_TRUE(tags.next()->isBroken);
  EXPECT_TRUE(tags.next()->isBroken);
  const auto d = tags.next();
  EXPECT_EQ(d->name, "D");
  EXPECT_FALSE(d->isBroken);
}

}  // namespace
}  // namespace tools
