#pragma once

#include <compare>
#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

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
  // A text, for a string or a key, or any other value.
  struct Object {
    const Value* value;
    const std::string* text;
    std::size_t firstReference = 0;  // of a container, in _references
    std::size_t depth = 0;           // of a container: containers around it and itself
  };
  // A leaf of fixed size.
  struct Scalar {
    Kind kind;
    std::uint64_t bits;
    bool isNegative;  // tells a negative integer from a large one
    // NOLINTNEXTLINE(modernize-use-nullptr): no pointer is here
    friend auto operator<=>(const Scalar&, const Scalar&) = default;
  };

  bool _number();
  bool _numberMembers(std::size_t container);
  std::optional<Number> _numberOf(const Value& value, std::size_t depth);
  std::optional<Number> _numberOfText(const std::string& text);
  Number _numberOfData(const Bytes& data, const Value& value);
  std::optional<Number> _numberOfScalar(const Value& value);
  Number _add(const Object& object);

  void _put(const Object& object);
  void _putText(const std::string& text);
  void _putInteger(const Value& integer);
  void _putReferences(const Object& container, std::size_t count);
  void _putHead(std::uint8_t type, std::uint64_t count);
  void _putCount(std::uint64_t count);
  void _putNumber(std::uint64_t number, std::size_t size);
  void _putOffsetsAndTrailer();

  const Value& _value;
  std::vector<Object> _objects;
  std::vector<Number> _references;
  // Numbers by content; a long text or data is looked up by its address first. The contents are
  // ordered, not hashed, because whoever wrote a file that was read may have chosen ones that
  // collide.
  std::map<std::string_view, Number> _texts;
  std::map<std::string_view, Number> _datas;
  std::unordered_map<const void*, Number> _byAddress;
  std::map<Scalar, Number> _scalars;
  std::vector<std::uint64_t> _offsets;
  std::size_t _referenceSize = 1;
  Bytes _bytes;
};

}  // namespace propertylist
