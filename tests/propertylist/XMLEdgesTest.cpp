// The XML form where it borders on what is no XML any more.
#include <gtest/gtest.h>

#include "propertylist/Reading.h"

namespace propertylist {
namespace {

ReadResult read(const std::string& text) {
  return readXMLPropertyList(Bytes(text.begin(), text.end()));
}

TEST(XMLEdges, AreRefusedWithTheReason) {
  const struct {
    const char* name;
    std::string document;
    const char* what;
  } kCases[] = {
      {"end tag for a root", "</plist>", "not a property list"},
      {"other end tag of the root", "<plist><true/></dict>", "an end tag that does not fit"},
      {"comment behind without end", "<plist><true/></plist><!-- x", "a comment without an end"},
      {"key without a dictionary", "<plist><key>a</key></plist>", "a key outside of a dictionary"},
      {"minute 60", "<plist><date>2001-01-01T00:60:00Z</date></plist>",
       "a value that is not well formed"},
      {"second 60", "<plist><date>2001-01-01T00:00:60Z</date></plist>",
       "a value that is not well formed"},
      {"real with two points", "<plist><real>1.5.2</real></plist>",
       "a value that is not well formed"},
      {"negative not a number", "<plist><real>-nan</real></plist>",
       "a value that is not well formed"},
      {"integer of a sign", "<plist><integer>-</integer></plist>",
       "a value that is not well formed"},
      {"half of a declaration", "<?xml", "a processing instruction without an end"},
      {"document type of blanks", "<!DOCTYPE ><plist/>", "a document type without a name"},
      {"comment after the document type", "<!DOCTYPE plist><!-- x", "a comment without an end"},
      {"address without quotes", "<!DOCTYPE plist SYSTEM x><plist/>",
       "a document type that is not well formed"},
      {"address without an end", "<!DOCTYPE plist SYSTEM \"x><plist/>",
       "a document type that is not well formed"},
      {"word behind the document type", "<!DOCTYPE plist x><plist/>",
       "a document type that is not well formed"},
      {"instruction of a brace", "<?{?><plist/>",
       "a processing instruction that is not well formed"},
      {"instruction of a bracket", "<?[?><plist/>",
       "a processing instruction that is not well formed"},
      {"instruction glued to a sign", "<?p+ q?><plist/>",
       "a processing instruction that is not well formed"},
      {"attribute without a name", "<plist =\"1\"><true/></plist>",
       "a tag that is not well formed"},
      {"attribute without an end", "<plist a=\"1", "a tag that is not well formed"},
      {"attribute with an unknown entity", "<plist a=\"&x;\"><true/></plist>",
       "an entity that is not predefined"},
      {"reference of a sign", "<plist><string>&#-1;</string></plist>",
       "a character reference that is no number"},
      {"reference of other letters", "<plist><string>&#xg;</string></plist>",
       "a character reference that is no number"},
      {"reference of other capitals", "<plist><string>&#xG;</string></plist>",
       "a character reference that is no number"},
      {"reference behind the letters", "<plist><string>&#x~;</string></plist>",
       "a character reference that is no number"},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    const ReadResult result = read(c.document);
    EXPECT_EQ(result.value, std::nullopt);
    EXPECT_EQ(result.error.what, c.what);
  }
}

TEST(XMLEdges, AreReadWhereTheFormAllowsThem) {
  const struct {
    const char* name;
    std::string document;
    Value value;
  } kCases[] = {
      {"return at the end of a text", "<plist><string>a\r</string></plist>", "a\n"},
      {"capital X of a hexadecimal number", "<plist><integer>0X1F</integer></plist>", 31},
      {"names of every sign", "<?a-b.c9_:\xC3\xA4Z?><?_?><?:?><plist><true/></plist>", true},
      {"instruction that begins like a declaration", "<?xml-style a?><plist><true/></plist>", true},
      {"name of another script", "<?\xC3\xA4?><plist><true/></plist>", true},
      {"capital digits of a reference", "<plist><string>&#x4F;</string></plist>", "O"},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    EXPECT_EQ(read(c.document).value, c.value) << read(c.document).error.description();
  }
}

}  // namespace
}  // namespace propertylist
