#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "propertylist/Arena.h"
#include "propertylist/BigEndian.h"
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
  // What a marker announces; all of it lies between the magic and the offset table.
  struct Header {
    std::uint8_t marker = 0;   // with its low half zero where that is a count
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
    State state : 4 = State::unknown;  // open: some reference in it is still to be followed
    bool isNegative : 4 = false;

    Arena::Raw raw() const { return Arena::scalar(kind, bitsOrNode, isNegative); }
    void hold(const Arena::Raw& raw) {
      kind = raw.kind;
      isNegative = raw.isNegative;
      bitsOrNode = raw.bits;
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
  };

  static constexpr std::size_t kPairs = 256;  // a power of two

  bool _readTrailer();
  bool _scan();
  bool _followKey(Step& step);
  bool _followValue(Step& step);
  Object* _objectAt(std::size_t placeOfReference);
  bool _reach(Object& object, std::uint64_t number);
  bool _account(const Step& container, const Object& member);
  void _put(const Step& container, const Object& member);
  bool _close();
  void _sortDictionary(const Step& step);
  bool _areAscending(const Text& a, const Text& b);
  void _sortLongKeys();

  bool _readHeader(std::size_t at, Header& header);
  bool _readCount(Header& header);
  std::optional<std::uint64_t> _sizeOf(const Header& header) const;
  bool _checkLeaf(const Header& header);
  bool _checkInteger(const Header& header);
  bool _decodeUTF16(const Header& header);

  Arena::Raw _make(const Header& header);
  Arena::Raw _integer(const Header& header) const;

  std::uint64_t _number(std::size_t at, std::size_t size) const {
    return bigEndianNumber(_bytes.data() + at, size);
  }
  bool _fail(std::size_t at, std::string what);

  std::span<const std::uint8_t> _bytes;
  std::size_t _limit;  // of values, and of the bytes of all objects that are reached
  std::size_t _bytesReached = 0;
  std::size_t _offsetSize = 0;
  std::size_t _referenceSize = 0;
  std::size_t _offsetTable = 0;
  std::uint64_t _objectCount = 0;
  std::uint64_t _topObject = 0;
  Arena::Holder _arena;
  std::vector<Object> _objects;  // by number
  std::vector<Step> _way;
  std::vector<Arena::Raw> _withLongKeys;  // dictionaries that are not sorted yet
  // Pairs of keys that are in ascending order, at places that follow from their addresses.
  std::array<std::pair<const Text*, const Text*>, kPairs> _ascending;
  std::string _wide;  // the text that was decoded last, and room behind it
  std::size_t _wideSize = 0;
  ReadError _error;
};

}  // namespace propertylist
