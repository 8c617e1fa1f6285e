#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "propertylist/Reading.h"

namespace propertylist {

// Whether XML 1.0 allows this character at all.
bool isXMLCharacter(char32_t codePoint);

// Takes an XML document apart, from its beginning to its end. What a document type declares is
// never read: the predefined entities and character references are the only ones, and a document
// type with declarations of its own is an error.
//
// After a failure the scanner is only asked for its error.
class XMLScanner {
 public:
  struct Tag {
    std::size_t at = 0;  // where it begins
    std::string_view name;
    bool isEnd = false;    // </name>
    bool isEmpty = false;  // <name/>
  };

  // `text` outlives the scanner.
  explicit XMLScanner(std::string_view text) : _text(text) {}

  // Checks the characters of the whole document and reads all that comes before its first tag.
  bool readProlog();
  // Reads what may stand between tags: blanks, comments and processing instructions.
  bool skipBlanks();
  // Reads a tag, with its attributes, at which the document stands.
  std::optional<Tag> readTag();
  // Reads the end tag of that name when it stands here in its usual form, without blanks. Where it
  // does not, readTag reads what does.
  bool acceptEndTag(std::string_view name);
  // Reads the text up to the next tag, comments and processing instructions left out. The text is
  // there until the next one is read.
  bool readText(std::string_view& text);
  bool isAtEnd() const { return _at == _text.size(); }

  // Gives the failure its place: where the scanner stands, or where a tag begins. Both false.
  bool fail(std::string what) { return _failAt(_at, std::move(what)); }
  bool fail(const Tag& tag, std::string what) { return _failAt(tag.at, std::move(what)); }
  const ReadError& error() const { return _error; }

 private:
  bool _failAt(std::size_t at, std::string what);
  bool _checkCharacters();
  bool _checkCharactersUpTo(std::size_t end, std::size_t& position);
  bool _isAtTag() const;
  bool _readRestOfText(std::string& text);
  bool _readDeclaration();
  bool _readDocumentType();
  bool _skipComment();
  bool _skipInstruction();
  bool _readAttributes(std::string_view end, std::string* encoding);
  bool _readAttribute(std::string_view& name, std::string& value);
  bool _readReference(std::string& text);
  bool _readCharacterReference(std::string_view digits, std::string& text);
  bool _readSection(std::string& text);
  std::string_view _readName();
  std::optional<std::string_view> _readLiteral();
  bool _readBlanks();
  bool _isAt(std::string_view token) const { return _text.substr(_at).starts_with(token); }
  bool _accept(std::string_view token);

  std::string_view _text;
  std::size_t _at = 0;
  std::string _madeText;  // what does not stand in the document as it is
  ReadError _error;
};

}  // namespace propertylist
