#include "propertylist/Arena.h"

#include <new>

namespace propertylist {
namespace {

// Small enough that the allocator keeps it for the next file instead of giving it back.
constexpr std::size_t kLargestChunk = std::size_t{64} << 10U;
constexpr std::size_t kSmallestChunk = 512;

}  // namespace

Arena::Arena(std::size_t expectedSize)
    : Owner(true), _chunkSize(std::clamp(expectedSize, kSmallestChunk, kLargestChunk)) {}

void* Arena::_allocateChunk(std::size_t size) {
  // NOLINTNEXTLINE(modernize-avoid-c-arrays)
  std::unique_ptr<std::byte[]> chunk(new std::byte[size]);
  _chunks.push_back(std::move(chunk));
  return _chunks.back().get();
}

void* Arena::_allocateFromNewChunk(std::size_t size) {
  if (size > _chunkSize / 4) return _allocateChunk(size);
  _next = static_cast<std::byte*>(_allocateChunk(_chunkSize)) + size;
  _left = _chunkSize - size;
  _chunkSize = kLargestChunk;
  return _next - size;
}

Arena::Raw Arena::newData(std::span<const std::uint8_t> data) {
  Raw raw;
  raw.kind = Kind::data;
  raw.setNode(&_datas.emplace_back(this, Bytes(data.begin(), data.end())));
  return raw;
}

Arena::Raw Arena::newArray(std::size_t size) {
  Raw raw;
  raw.kind = Kind::array;
  if (size == 0) return raw;
  auto* const memory =
      static_cast<std::byte*>(_allocate(sizeof(Array::Node) + size * sizeof(Value)));
  auto* const members = reinterpret_cast<Value*>(memory + sizeof(Array::Node));
  raw.setNode(new (memory) Array::Node(this, members, size));
  return raw;
}

Arena::Raw Arena::newDictionary(std::size_t size) {
  Raw raw;
  raw.kind = Kind::dictionary;
  if (size == 0) return raw;
  auto* const memory = static_cast<std::byte*>(
      _allocate(sizeof(Dictionary::Node) + size * sizeof(Dictionary::Entry)));
  auto* const entries = reinterpret_cast<Dictionary::Entry*>(memory + sizeof(Dictionary::Node));
  raw.setNode(new (memory) Dictionary::Node(this, entries, size));
  return raw;
}

Value Arena::value(const Raw& raw) {
  const bool hasNode = raw.kind == Kind::dictionary || raw.kind == Kind::array ||
                       raw.kind == Kind::string || raw.kind == Kind::data;
  if (hasNode && raw.bits != 0) retain();
  return {raw.kind, raw.bits};
}

}  // namespace propertylist
