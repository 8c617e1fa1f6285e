#pragma once

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "propertylist/Arena.h"
#include "propertylist/BigEndian.h"
#include "propertylist/BinaryForm.h"
#include "propertylist/Reading.h"
#include "propertylist/Value.h"

namespace propertylist {

// One reading of a binary property list.
//
// It follows the references from the top object, checks everything that it reaches, and makes the
// value of each object once, in the arena: a leaf when it is reached, a container when it is
// reached with room for its members, which are put in one by one. It does not recurse.
class BinaryReader {
 public:
  // `bytes` outlives the reader.
  explicit BinaryReader(std::span<const std::uint8_t> bytes);
  ReadResult read();

 private:
  // What a marker announces.
  struct Header {
    std::uint8_t marker = 0;
    std::uint64_t count = 0;   // bytes, 16-bit units, members or pairs
    std::size_t at = 0;        // of the marker
    std::size_t contents = 0;  // behind marker and count
  };
  enum class State : std::uint8_t { unknown, open, done };
  // What is known of an object, by its number.
  struct Object {
    std::uint64_t bitsOrNode = 0;
    std::uint32_t values = 1;  // how many values it stands for with all that it holds
    std::uint16_t depth = 0;   // how many containers lie in one another, itself included
    Kind kind = Kind::dictionary;
    State state = State::unknown;  // open: some reference in it is still to be followed

    Arena::Raw raw() const { return Arena::scalar(kind, bitsOrNode); }
    void hold(const Arena::Raw& raw) {
      kind = raw.kind;
      bitsOrNode = raw.bits;
    }
    // Of what holds nothing further.
    void finish(const Arena::Raw& raw) {
      hold(raw);
      state = State::done;
    }
    bool isContainer() const { return kind == Kind::dictionary || kind == Kind::array; }
  };
  // A container on the way from the top to the object that is looked at.
  struct Step {
    Object* object;
    Header header;
    Arena::Raw container;
    std::uint64_t nextReference = 0;
    bool hasLongKey = false;
    bool isAscending = true;  // the keys
  };

  static constexpr unsigned kPairBits = 9;

  bool _readTrailer();
  bool _scan();
  bool _followKeys(Step& step);
  bool _followValue(Step& step);
  Object* _objectAt(std::size_t placeOfReference);
  bool _reach(Object& object, std::uint64_t number);
  bool _enter(Object& object, const Header& header, const Arena::Raw& container);
  bool _account(const Step& container, const Object& member);
  void _put(const Step& container, const Object& member);
  bool _close();
  void _sortDictionary(const Step& step);
  bool _areAscending(const Object& a, const Object& b);
  void _sortLongKeys();

  // Reads the count that a marker holds or that follows it.
  bool _readCount(Header& header) {
    header.count = header.marker & 0x0FU;
    return header.count != binary::kLongCount || _readLongCount(header);
  }
  bool _readLongCount(Header& header);
  // Checks that the contents, `count` times `sizeOfOne` bytes, lie before the offset table. Objects
  // may overlap, but not so that a small file stands for a large amount of bytes.
  bool _claim(const Header& header, std::size_t sizeOfOne) {
    const std::size_t room = _offsetTable - header.contents;
    const std::uint64_t size = std::min(header.count, std::uint64_t{room} + 1) * sizeOfOne;
    if (size > room) return _fail(header.at, "an object that does not end before the offset table");
    _bytesReached += header.contents - header.at + static_cast<std::size_t>(size);
    return _bytesReached <= _limit || _fail(header.at, "objects that overlap without measure");
  }

  bool _makeASCII(Object& object, const Header& header);
  bool _makeUTF16(Object& object, const Header& header);
  bool _makeFixed(Object& object, Header& header);
  bool _makeDate(Object& object, const Header& header);
  bool _makeInteger(Object& object, const Header& header);

  // `size` is at most 8.
  std::uint64_t _number(std::size_t at, std::size_t size) const {
    return bigEndianNumber(_bytes.data() + at, size);
  }
  // The same of what begins before the trailer, behind which there are always eight bytes: `unused`
  // is 64 without the number's bits.
  std::uint64_t _numberBeforeTrailer(std::size_t at, unsigned unused) const {
    return bigEndianNumber(_bytes.data() + at, 8) >> unused;
  }
  bool _fail(std::size_t at, const char* what);

  std::span<const std::uint8_t> _bytes;
  std::size_t _limit;  // of values, and of the bytes of all objects that are reached
  std::size_t _bytesReached = 0;
  std::size_t _offsetSize = 0;
  std::size_t _referenceSize = 0;
  unsigned _unusedOfOffset = 0;  // bits of 64
  unsigned _unusedOfReference = 0;
  std::size_t _offsetTable = 0;
  std::uint64_t _objectCount = 0;
  std::uint64_t _topObject = 0;
  Arena::Holder _arena;
  std::vector<Object> _objects;  // by number
  std::vector<Step> _way;
  std::vector<Arena::Raw> _withLongKeys;  // dictionaries that are not sorted yet
  // Pairs of keys that are in ascending order, by their numbers, at places that follow from these.
  std::array<std::uint64_t, std::size_t{1} << kPairBits> _ascending{};
  std::string _wide;  // room for a text that is being decoded
  ReadError _error;
};

}  // namespace propertylist
