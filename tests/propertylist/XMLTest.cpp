#include <gtest/gtest.h>

#include <clocale>
#include <cmath>
#include <limits>

#include "propertylist/Reading.h"
#include "propertylist/Writing.h"

namespace propertylist {
namespace {

using namespace std::string_literals;

ReadResult read(const std::string& text) {
  return readPropertyList(Bytes(text.begin(), text.end()));
}

ReadResult readElement(const std::string& element) {
  return read("<plist version=\"1.0\">\n" + element + "\n</plist>\n");
}

TEST(XMLReader, ReadsElementsOfEveryKind) {
  const struct {
    const char* name;
    std::string element;
    Value value;
  } kCases[] = {
      {"text", "<string>a b</string>", "a b"},
      {"empty text", "<string></string>", ""},
      {"text with its blanks", "<string> a\n\tb </string>", " a\n\tb "},
      {"line ends", "<string>a\r\nb\rc</string>", "a\nb\nc"},
      {"line end by reference", "<string>a&#13;&#xD;</string>", "a\r\r"},
      {"predefined entities", "<string>&lt;&gt;&amp;&quot;&apos;</string>", "<>&\"'"},
      {"character references", "<string>&#228;&#x1F600;&#x00000041;</string>",
       "\xC3\xA4\xF0\x9F\x98\x80"
       "A"},
      {"section", "<string>a<![CDATA[<&amp;]]]]>b</string>", "a<&amp;]]b"},
      {"comment in a text", "<string>a<!-- x -->b<?p q?>c</string>", "abc"},
      {"integer", "<integer>42</integer>", 42},
      {"integer with blanks", "<integer> 42\n</integer>", 42},
      {"integer with zeros", "<integer>007</integer>", 7},
      {"negative hexadecimal", "<integer>-0x1f</integer>", -31},
      {"smallest integer", "<integer>-9223372036854775808</integer>",
       std::numeric_limits<std::int64_t>::min()},
      {"minus zero", "<integer>-0</integer>", 0},
      {"real", "<real>-2.25</real>", -2.25},
      {"real with exponent", "<real>1e+300</real>", 1e300},
      {"smallest real", "<real>5e-324</real>", 5e-324},
      {"real with plus", "<real>+1.5</real>", 1.5},
      {"minus zero real", "<real>-0.0</real>", -0.0},
      {"infinity", "<real>-infinity</real>", -INFINITY},
      {"short infinity", "<real>+INF</real>", INFINITY},
      {"not a number", "<real>nan</real>", std::numeric_limits<double>::quiet_NaN()},
      {"true", "<true/>", true},
      {"false", "<false></false>", false},
      {"date", "<date>2001-01-01T00:00:08Z</date>", Date{8}},
      {"leap day", "<date>2000-02-29T23:59:59Z</date>", Date{-26438401}},
      {"data", "<data>\n\tAQ ID\n\t</data>", Bytes{1, 2, 3}},
      {"data with one byte behind", "<data>AQ==</data>", Bytes{1}},
      {"data with two bytes behind", "<data>AQI=</data>", Bytes{1, 2}},
      {"array", "<array><integer>1</integer><!-- x --><string/></array>", Array{1, ""}},
      {"dictionary", "<dict> <key>b</key> <true/> <key>a</key> <array/> </dict>",
       Dictionary{{"a", Array()}, {"b", true}}},
      {"empty key", "<dict><key/><true/></dict>", Dictionary{{"", true}}},
      {"key twice", "<dict><key>a</key><true/><key>a</key><false/></dict>",
       Dictionary{{"a", false}}},
      {"attributes", "<string a='&lt;' b = \">\">x</string >", "x"},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    const ReadResult result = readElement(c.element);
    ASSERT_TRUE(result.value.has_value()) << result.error.description();
    EXPECT_EQ(*result.value, c.value) << describe(*result.value);
  }
}

TEST(XMLReader, RefusesElementsThatAreNotWellFormed) {
  const struct {
    const char* name;
    std::string element;
    const char* what;
    std::size_t column;  // in the second line
  } kCases[] = {
      {"empty integer", "<integer/>", "a value that is not well formed", 1},
      {"two signs", "<integer>+-5</integer>", "a value that is not well formed", 1},
      {"blank after the sign", "<integer>- 5</integer>", "a value that is not well formed", 1},
      {"hexadecimal without digits", "<integer>0x</integer>", "a value that is not well formed", 1},
      {"integer 2^64", "<integer>18446744073709551616</integer>", "a value that is not well formed",
       1},
      {"real with two signs", "<real>--1</real>", "a value that is not well formed", 1},
      {"hexadecimal real", "<real>0x1p3</real>", "a value that is not well formed", 1},
      {"real with text behind", "<real>1.5abc</real>", "a value that is not well formed", 1},
      {"real word", "<real>nano</real>", "a value that is not well formed", 1},
      {"month 13", "<date>2024-13-01T00:00:00Z</date>", "a value that is not well formed", 1},
      {"year 0", "<date>0000-01-01T00:00:00Z</date>", "a value that is not well formed", 1},
      {"date without zone", "<date>2024-01-01T00:00:00</date>", "a value that is not well formed",
       1},
      {"date with a letter", "<date>2024-01-01T00:0x:00Z</date>", "a value that is not well formed",
       1},
      {"data of other characters", "<data>A*==</data>", "a value that is not well formed", 1},
      {"data after padding", "<data>AQ==AQ==</data>", "a value that is not well formed", 1},
      {"only padding", "<data>====</data>", "a value that is not well formed", 1},
      {"text in true", "<true>1</true>", "a value that is not well formed", 1},
      {"text in an array", "<array>x</array>", "text outside of a value", 8},
      {"value without a key", "<dict><true/></dict>", "a value without a key", 7},
      {"property list in a property list", "<array><plist/></array>", "an unknown element", 8},
      {"other end tag", "<array></dict>", "an end tag that does not fit", 8},
      {"other end tag of a text", "<string>x</data>", "an end tag that does not fit", 10},
      {"end tag with attribute", "<array></array a='1'>", "an end tag that is not well formed", 8},
      {"attribute without quotes", "<string a=1>x</string>", "a tag that is not well formed", 11},
      {"attribute without blank", "<string a='1'b='2'/>", "a tag that is not well formed", 14},
      {"attribute with <", "<string a='<'/>", "a tag that is not well formed", 12},
      {"no name", "<>", "markup that is no tag", 1},
      {"section among elements", "<array><![CDATA[ ]]></array>", "markup that is no tag", 8},
      {"end of a section", "<string>a]]>b</string>", "the end of a section that has no beginning",
       10},
      {"section without end", "<string><![CDATA[x", "a section without an end", 9},
      {"comment without end", "<!-- x", "a comment without an end", 1},
      {"instruction without end", "<?x y", "a processing instruction without an end", 1},
      {"declaration in the middle", "<?xml version='1.0'?>",
       "a processing instruction that is not well formed", 1},
      {"surrogate by reference", "<string>&#xD83D;</string>",
       "a reference to a character that XML does not allow", 9},
      {"control character by reference", "<string>&#1;</string>",
       "a reference to a character that XML does not allow", 9},
      {"reference without digits", "<string>&#x;</string>",
       "a reference to a character that XML does not allow", 9},
      {"reference with other digits", "<string>&#1f;</string>",
       "a character reference that is no number", 9},
      {"ampersand alone", "<string>a & b</string>", "a reference without an end", 11},
      {"control character", "<string>a\x01</string>", "a character that XML does not allow", 10},
      {"overlong UTF-8", "<string>\xC0\xAF</string>", "not UTF-8", 9},
      {"no character U+FFFF", "<string>\xEF\xBF\xBF</string>",
       "a character that XML does not allow", 9},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    const ReadResult result = readElement(c.element);
    EXPECT_EQ(result.value, std::nullopt);
    EXPECT_EQ(result.error.what, c.what);
    EXPECT_EQ(result.error.line, 2U);
    EXPECT_EQ(result.error.column, c.column);
    EXPECT_EQ(result.error.byteOffset, std::nullopt);
  }
}

TEST(XMLReader, TakesOneDocumentWithItsPrologAndNothingElse) {
  const struct {
    const char* name;
    std::string text;
    const char* error;  // null when it is read as true
  } kCases[] = {
      {"bare", "<plist><true/></plist>", nullptr},
      {"declaration",
       "<?xml version='1.0' encoding='utf-8' standalone='yes' ?><plist><true/></plist>", nullptr},
      {"ASCII", "<?xml version='1.0' encoding='US-ASCII'?><plist><true/></plist>", nullptr},
      {"everything",
       "\xEF\xBB\xBF<?xml version='1.0'?>\n<!-- a --><?b c?><!DOCTYPE plist SYSTEM 'd'>"
       "<!-- e --><plist> <true/> </plist> <!-- f --> <?g?>\n",
       nullptr},
      {"document type without addresses", "<!DOCTYPE plist><plist><true/></plist>", nullptr},
      {"other encoding", "<?xml version='1.0' encoding='UTF-16'?><plist><true/></plist>",
       "an encoding other than UTF-8 in line 1, column 40"},
      {"empty", "", "the end of the document is missing in line 1, column 1"},
      {"blanks", " \n ", "the end of the document is missing in line 2, column 2"},
      {"no value", "<plist/>", "a property list without a value in line 1, column 1"},
      {"nothing in it", "<plist></plist>", "a property list without a value in line 1, column 8"},
      {"declaration after a blank", " <?xml version='1.0'?><plist><true/></plist>",
       "a processing instruction that is not well formed in line 1, column 2"},
      {"document type twice", "<!DOCTYPE plist><!DOCTYPE plist><plist><true/></plist>",
       "markup that is no tag in line 1, column 17"},
      {"document type with an empty part", "<!DOCTYPE plist []><plist><true/></plist>",
       "a document type with declarations of its own in line 1, column 17"},
      {"document type without a name", "<!DOCTYPE><plist><true/></plist>",
       "a document type without a name in line 1, column 10"},
      {"document type with one address too few", "<!DOCTYPE plist PUBLIC 'a'><plist/>",
       "a document type that is not well formed in line 1, column 27"},
      {"second root", "<plist><true/></plist><plist/>",
       "something behind the property list in line 1, column 23"},
      {"open root", "<plist><true/>", "the end of the document is missing in line 1, column 15"},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    const ReadResult result = read(c.text);
    if (c.error == nullptr) {
      EXPECT_EQ(result.value, Value(true)) << result.error.description();
    } else {
      EXPECT_EQ(result.value, std::nullopt);
      EXPECT_EQ(result.error.description(), c.error);
    }
  }
}

TEST(XMLReader, SharesEqualKeys) {
  const Value value = *readElement(
                           "<array><dict><key>k</key><true/></dict>"
                           "<dict><key>k</key><true/></dict></array>")
                           .value;
  const Array& array = *value.asArray();
  EXPECT_EQ(&array[0].asDictionary()->begin()->key(), &array[1].asDictionary()->begin()->key());
}

TEST(XMLReader, RefusesEveryPrefixOfAGoodList) {
  const std::string good = *writeXMLPropertyList(Dictionary{{"a", Array{1, "<", Bytes{1}}}});
  for (std::size_t size = 0; size + 1 < good.size(); ++size) {
    EXPECT_EQ(read(good.substr(0, size)).value, std::nullopt) << size;
  }
}

TEST(XMLWriter, WritesOneElementALine) {
  EXPECT_EQ(*writeXMLPropertyList(Dictionary{{"list", Array{1, -2.5, "<&>", Array()}},
                                             {"when", Date{8.75}},
                                             {"yes", true},
                                             {"bytes", Bytes{1, 2, 3, 4}},
                                             {"none", Dictionary()}}),
            "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
            "<plist version=\"1.0\">\n"
            "<dict>\n"
            "\t<key>bytes</key>\n"
            "\t<data>AQIDBA==</data>\n"
            "\t<key>list</key>\n"
            "\t<array>\n"
            "\t\t<integer>1</integer>\n"
            "\t\t<real>-2.5</real>\n"
            "\t\t<string>&lt;&amp;&gt;</string>\n"
            "\t\t<array/>\n"
            "\t</array>\n"
            "\t<key>none</key>\n"
            "\t<dict/>\n"
            "\t<key>when</key>\n"
            "\t<date>2001-01-01T00:00:08Z</date>\n"
            "\t<key>yes</key>\n"
            "\t<true/>\n"
            "</dict>\n"
            "</plist>\n");
}

TEST(XMLWriter, GivesNothingForWhatTheFormCannotHold) {
  const struct {
    const char* name;
    Value value;
  } kCases[] = {
      {"NUL", "a\0b"s},
      {"control character", "\x1F"},
      {"no character U+FFFE", "\xEF\xBF\xBE"},
      {"key with a control character", Dictionary{{"\x01", 1}}},
      {"date after the year 9999", Date{252423993600}},
      {"date before the year 1", Date{-63113904001}},
      {"a NaN with other bits", std::bit_cast<double>(0xFFF8000000000000U)},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    EXPECT_EQ(writeXMLPropertyList(c.value), std::nullopt);
    EXPECT_TRUE(writeBinaryPropertyList(c.value).has_value());
  }
}

TEST(XMLForm, GivesBackWhatWasWritten) {
  const Value value(Array{"a\rb\n\t ", " x ", "]]>", "&amp;", 0.1, 5e-324, -0.0, INFINITY,
                          std::numeric_limits<double>::quiet_NaN(), 18446744073709551615U,
                          std::numeric_limits<std::int64_t>::min(), Date{-1}, Bytes{}, Bytes{255},
                          "\xF0\x9F\x98\x80", Dictionary{{"<", Dictionary{{"", ""}}}}});
  const std::string text = writeXMLPropertyList(value).value();
  EXPECT_EQ(read(text).value, value) << text;
}

}  // namespace
}  // namespace propertylist
