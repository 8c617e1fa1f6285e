#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string_view>
#include <vector>

#include "propertylist/TextTable.h"
#include "propertylist/Value.h"

namespace propertylist {

// One writing of a binary property list.
//
// The objects are numbered level by level from the top, each container once for every place where
// it stands and each leaf once for its content, so the numbers follow from the value alone and not
// from what its storage shares.
class BinaryWriter {
 public:
  // `value` outlives the writer.
  explicit BinaryWriter(const Value& value) : _value(value) {}
  std::optional<Bytes> write();

 private:
  using Number = std::uint32_t;
  static constexpr Number kNoNumber = ~Number{0};
  // A text, for a string or a key, or any other value.
  class Object {
   public:
    explicit Object(const Text& text) : _isText(true), _content(&text) {}
    explicit Object(const Value& value, std::uint16_t d = 0) : depth(d), _content(&value) {}
    bool isText() const { return _isText; }
    const Text& text() const { return *static_cast<const Text*>(_content); }
    // It is no text.
    const Value& value() const { return *static_cast<const Value*>(_content); }
    const void* place() const { return _content; }

    std::uint32_t firstReference = 0;  // of a container, in _references
    std::uint16_t depth = 0;           // of a container: containers around it and itself

   private:
    bool _isText = false;
    const void* _content;
  };
  // Where a text stands in memory, and its number; see _recentAt.
  struct Recent {
    const Text* text = nullptr;
    Number number = 0;
  };
  // The same of a long text or data.
  struct Place {
    const void* content;
    Number number;
  };

  void _makeRoomFor(std::size_t values);
  std::size_t _expectedSize() const;
  bool _number();
  bool _numberMembers(std::size_t container);
  template <typename Members, typename ValueOf>
  bool _referToValues(const Members& members, std::uint32_t depth, const ValueOf& valueOf);
  // A hash of 0 is not known yet.
  std::uint64_t _hashAhead(const Value& value);
  Recent& _recentAt(const Text& text);
  Number _numberOf(const Value& value, std::uint32_t depth, std::uint64_t hash = 0);
  Number _numberOfText(const Text& text, std::uint64_t hash = 0);
  Number _numberOfNewText(const Text& text, std::uint64_t hash);
  Number _numberOfData(const Bytes& data, const Value& value);
  Number _numberOfScalar(const Value& value, std::uint64_t hash);
  Number _numberAt(const void* content) const;
  void _remember(const void* content, Number number);
  Number _add(const Object& object);

  bool _put(const Object& object);
  bool _putText(std::string_view text);
  bool _putWideText(std::string_view text);
  void _putInteger(const Value& integer);
  void _putReferences(const Object& container, std::size_t count);
  void _putHead(std::uint8_t type, std::uint64_t count);
  void _putCount(std::uint64_t count);
  void _putNumber(std::uint64_t number, std::size_t size);
  void _putBytes(const void* bytes, std::size_t size);
  // Room for so many bytes more, which count as written.
  std::uint8_t* _room(std::size_t size) {
    if (size > _left) _makeMoreRoom(size);
    std::uint8_t* const room = _next;
    _next += size;
    _left -= size;
    return room;
  }
  void _makeMoreRoom(std::size_t size);
  // The last ones that were written.
  void _giveBack(std::size_t size) {
    _next -= size;
    _left += size;
  }
  // Of what is written.
  std::size_t _end() const { return static_cast<std::size_t>(_next - _bytes.data()); }
  void _putOffsetsAndTrailer();

  const Value& _value;
  std::vector<Object> _objects;
  std::vector<Number> _references;
  // Numbers by content; a long text or data is looked up by its address first.
  TextTable _texts;
  TextTable _datas;
  TextTable _scalars;
  std::vector<Place> _places;
  TextTable _placesByAddress;
  std::vector<Recent> _recent;
  Bytes _wide;                          // the text that is being put, in UTF-16
  std::vector<std::uint32_t> _offsets;  // no file is larger than they can tell
  std::size_t _contentBytes = 0;        // of all texts and data
  bool _hasMany = false;
  std::size_t _referenceSize = 1;
  Bytes _bytes;
  std::uint8_t* _next = nullptr;  // in _bytes, where there is room for so many more
  std::size_t _left = 0;
};

}  // namespace propertylist
