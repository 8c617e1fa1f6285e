#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include "propertylist/BigEndian.h"
#include "propertylist/Reading.h"
#include "propertylist/Value.h"

namespace propertylist {

// One reading of a binary property list.
//
// It goes over the objects twice. The first pass follows the references from the top object, checks
// everything, and lists the objects that are reached with what they hold before themselves; the
// second makes the values in that order, each object's once. Neither recurses.
class BinaryReader {
 public:
  // `bytes` outlives the reader.
  explicit BinaryReader(std::span<const std::uint8_t> bytes);
  ReadResult read();

 private:
  // What a marker announces; all of it lies between the magic and the offset table.
  struct Header {
    std::uint8_t marker = 0;   // with its low half zero where that is a count
    std::uint64_t count = 0;   // bytes, 16-bit units, members or pairs
    std::size_t at = 0;        // of the marker
    std::size_t contents = 0;  // behind marker and count
  };
  // An object that is reached from the top.
  struct Object {
    Header header;
    std::uint64_t values = 1;   // how many values it stands for with all that it holds
    std::size_t depth = 0;      // how many containers lie in one another, itself included
    bool isOpen = false;        // some reference in it is still to be followed
    bool isKey = false;         // listed in _keys
    std::uint32_t keyRank = 0;  // the place of a key's text among the texts of all keys
    std::optional<Value> value;
  };
  // A container on the way from the top to the object that is looked at.
  struct Step {
    std::uint32_t object;
    std::uint64_t nextReference;
  };

  bool _readTrailer();
  bool _scan();
  bool _follow(Step step, std::vector<Step>& way);
  std::optional<std::uint32_t> _reach(std::uint64_t number, std::size_t from, bool& isNew);
  void _close(std::uint32_t object);
  bool _account(Object& container, const Object& member, std::size_t containersAbove);

  std::optional<Header> _readHeader(std::size_t at);
  bool _readCount(Header& header);
  std::optional<std::uint64_t> _sizeOf(const Header& header) const;
  bool _checkLeaf(const Header& header);
  bool _checkInteger(const Header& header);
  bool _checkUTF16(const Header& header);

  void _rankKeys();
  void _build(Object& object);
  Value _leaf(const Header& header) const;
  Value _array(const Header& header) const;
  Value _dictionary(const Header& header) const;
  std::string _text(const Header& header) const;

  static bool _isContainer(const Header& header);
  static bool _isString(const Header& header);
  static std::uint64_t _referenceCount(const Header& header);
  std::uint64_t _number(std::size_t at, std::size_t size) const {
    return bigEndianNumber(_bytes.data() + at, size);
  }
  std::size_t _placeOfReference(const Header& header, std::uint64_t index) const;
  const Object& _member(const Header& header, std::uint64_t index) const;
  bool _fail(std::size_t at, std::string what);

  std::span<const std::uint8_t> _bytes;
  std::size_t _limit;  // of values, and of the bytes of all objects that are reached
  std::size_t _bytesReached = 0;
  std::size_t _offsetSize = 0;
  std::size_t _referenceSize = 0;
  std::size_t _offsetTable = 0;
  std::uint64_t _objectCount = 0;
  std::uint64_t _topObject = 0;
  std::vector<std::uint32_t> _objectOfNumber;  // index in _objects and 1, or 0
  std::vector<Object> _objects;                // in the order in which they are reached
  std::vector<std::uint32_t> _order;           // in the order in which they are made
  std::vector<std::uint32_t> _keys;            // the objects that are keys
  ReadError _error;
};

}  // namespace propertylist
