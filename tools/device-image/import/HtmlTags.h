#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace tools {

// One tag of an HTML text. `begin` and `end` are its offsets, the angle brackets included.
struct HtmlTag {
  std::string name;  // upper case, with a "/" in front for an end tag: "A", "/DL", "!DOCTYPE"
  std::string_view attributes;
  std::size_t begin = 0;
  std::size_t end = 0;
  bool isBroken = false;  // it has no ">", or a quotation mark that its line does not close

  // The value of an attribute, its entities resolved; empty when there is none of that name.
  std::optional<std::string> attribute(std::string_view attributeName) const;
};

// Walks the tags of a text, which outlives it. A comment is passed over. A broken tag (or comment)
// ends where it is seen to be broken, and the walk goes on from there, so that it costs no other
// tag.
class HtmlTags {
 public:
  explicit HtmlTags(std::string_view bytes) : _bytes(bytes) {}
  std::optional<HtmlTag> next();

 private:
  std::string_view _bytes;
  std::size_t _position = 0;
  bool _hasOpenComment = false;
};

// The text with its character references resolved: "&amp;", "&#233;", "&eacute;". What is none that
// is known stays as it is.
std::string resolvedEntities(std::string_view text);

// The text as HTML: "&", "<", ">" and quotation marks are written as references.
std::string escapedForHtml(std::string_view text);

}  // namespace tools
