// The XML form where it borders on what is no XML any more.
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <unistd.h>

#include <algorithm>

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
      {"another root", "<list><true/></plist>", "not a property list"},
      {"key in an array", "<plist><array><key>a</key></array></plist>",
       "a key outside of a dictionary"},
      {"key that ends as another of its length", "<plist><dict><key>a</kex><true/></dict></plist>",
       "an end tag that does not fit"},
      {"element of another first letter for an end tag",
       "<plist><dict><key>a<skey><true/></dict></plist>", "an element inside of a text"},
      {"end tag of a longer name", "<plist><dict><key>a</keys><true/></dict></plist>",
       "an end tag that does not fit"},
      {"element of capitals", "<plist><DICT/></plist>", "an unknown element"},
      {"element of one letter", "<plist><a/></plist>", "an unknown element"},
      {"element of three letters", "<plist><int/></plist>", "an unknown element"},
      {"element of four letters", "<plist><null/></plist>", "an unknown element"},
      {"element of five letters", "<plist><float/></plist>", "an unknown element"},
      {"element of six letters", "<plist><number/></plist>", "an unknown element"},
      {"element of seven letters", "<plist><boolean/></plist>", "an unknown element"},
      {"element of ten letters", "<plist><dictionary/></plist>", "an unknown element"},
      {"text before the end", "<plist><string>ab", "the end of the document is missing"},
      {"end of a section before the end", "<plist><string>a]]>",
       "the end of a section that has no beginning"},
      {"unknown entity before the end", "<plist><string>a&x;", "an entity that is not predefined"},
      {"element before the end", "<plist><string>a<b>", "an element inside of a text"},
      {"reference before the end", "<plist><string>a&lt;b", "the end of the document is missing"},
      {"bracket before the end", "<plist><string>a]", "the end of the document is missing"},
      {"return before the end", "<plist><string>a\r", "the end of the document is missing"},
      {"key that ends as a text", "<plist><dict><key>a</string><true/></dict></plist>",
       "an end tag that does not fit"},
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
      // Where a reading that went on behind the fault would find a whole document.
      {"instruction of a document", "<?<plist><true/></plist><!--?>-->",
       "a processing instruction that is not well formed"},
      {"instruction of a value", "<plist><?<true/><!--?>--></plist>",
       "a processing instruction that is not well formed"},
      {"instruction of an end tag", "<plist><string><?</string><!--?>--></plist>",
       "a processing instruction that is not well formed"},
      {"instruction behind the document type", "<!DOCTYPE plist><?<plist><true/></plist><!--?>-->",
       "a processing instruction that is not well formed"},
      {"instruction without a name",
       "<?"
       "?><plist><true/></plist>",
       "a processing instruction that is not well formed"},
      {"instruction of a blank", "<? a?><plist><true/></plist>",
       "a processing instruction that is not well formed"},
      {"declaration of a document", "<?xml <plist><true/></plist>",
       "a tag that is not well formed"},
      {"declaration that ends like a tag", "<?xml version='1.0'/><plist><true/></plist>",
       "a tag that is not well formed"},
      {"document type of a document", "<!DOCTYPE <plist><true/></plist>",
       "a document type without a name"},
      {"document type without an end", "<!DOCTYPE plist <plist><true/></plist>",
       "a document type that is not well formed"},
      {"document type glued to its name", "<!DOCTYPEplist><plist><true/></plist>",
       "a document type without a name"},
      {"address glued to its word", "<!DOCTYPE plist SYSTEM'd'><plist><true/></plist>",
       "a document type that is not well formed"},
      {"no address", "<!DOCTYPE plist SYSTEM ><plist><true/></plist>",
       "a document type that is not well formed"},
      {"address between letters", "<!DOCTYPE plist SYSTEM xax><plist><true/></plist>",
       "a document type that is not well formed"},
      {"comment that ends in another sign", "<!-- a --x<plist><true/></plist>",
       "two hyphens in a comment"},
      {"tag without an end", "<plist ", "a tag without an end"},
      {"tag of a digit", "<plist><1/></plist>", "markup that is no tag"},
      {"attribute without an equals sign", "<plist a'1'><true/></plist>",
       "a tag that is not well formed"},
      {"text that ends with another beginning", "<plist><string>x<string></plist>",
       "an element inside of a text"},
      {"reference of a colon", "<plist><string>&#x:;</string></plist>",
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
      {"line ends in a section", "<plist><string><![CDATA[\r\na\rb\n\r]]></string></plist>",
       "\na\nb\n\n"},
      {"return between the digits of data", "<plist><data>AQ&#13;ID</data></plist>",
       Bytes{1, 2, 3}},
      {"capital X of a hexadecimal number", "<plist><integer>0X1F</integer></plist>", 31},
      {"names of every sign", "<?a-b.c9_:\xC3\xA4Z?><?A?><?Z?><?_?><?:?><plist><true/></plist>",
       true},
      {"instruction that begins like a declaration", "<?xml-style a?><plist><true/></plist>", true},
      {"name of another script", "<?\xC3\xA4?><plist><true/></plist>", true},
      {"small digits of a reference", "<plist><string>&#xfa;</string></plist>", "\xC3\xBA"},
      {"an attribute that only a declaration goes by", "<plist encoding='x'><true/></plist>", true},
      {"capital digits of a reference", "<plist><string>&#x4F;</string></plist>", "O"},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    EXPECT_EQ(read(c.document).value, c.value) << read(c.document).error.description();
  }
}

TEST(XMLEdges, AreRefusedAtTheirPlace) {
  EXPECT_EQ(read("<!DOCTYPE plist SYSTEM \"x><plist/>").error.description(),
            "a document type that is not well formed in line 1, column 24");
}

// Every beginning of a document lies at the end of what memory there is: a look behind it would be
// the end of the process.
TEST(XMLEdges, AreReadWithoutALookBehindThem) {
  const std::string document =
      "<?xml version='1.0'?><!DOCTYPE plist PUBLIC 'a' \"b\"><!--c--><?d e?>"
      "<plist version = '1'><array><string>&amp;&#x41;<![CDATA[x]]></string><key/></array></plist>";
  const std::size_t page = static_cast<std::size_t>(::sysconf(_SC_PAGESIZE));
  void* const pages =
      ::mmap(nullptr, 2 * page, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
  ASSERT_NE(pages, MAP_FAILED);
  auto* const end = static_cast<std::uint8_t*>(pages) + page;
  ASSERT_EQ(::mprotect(end, page, PROT_NONE), 0);
  for (std::size_t size = 0; size <= document.size(); ++size) {
    SCOPED_TRACE(size);
    std::copy_n(document.begin(), size, end - size);
    EXPECT_EQ(readXMLPropertyList({end - size, size}).value, std::nullopt);
  }
  ::munmap(pages, 2 * page);
}

}  // namespace
}  // namespace propertylist
