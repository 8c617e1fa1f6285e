// Changes binary property lists by their structure: what was an object, a reference, an entry of
// the offset table or a number of the trailer still is one afterwards, or just stopped being one.
// Plain changes of bytes seldom get past the trailer and the table.
#include <algorithm>
#include <cstring>
#include <random>
#include <vector>

#include "propertylist/BinaryForm.h"
#include "propertylist/Value.h"

extern "C" std::size_t LLVMFuzzerMutate(std::uint8_t* data, std::size_t size, std::size_t most);

namespace {

using namespace propertylist::binary;
using propertylist::Bytes;
using Random = std::minstd_rand;

std::size_t below(Random& random, std::size_t limit) { return limit == 0 ? 0 : random() % limit; }

std::uint64_t numberAt(const Bytes& bytes, std::size_t at, std::size_t size) {
  std::uint64_t number = 0;
  for (std::size_t i = 0; i < size; ++i) number = number << 8U | bytes[at + i];
  return number;
}

void append(Bytes& bytes, std::uint64_t number, std::size_t size) {
  for (std::size_t i = size; i > 0; --i)
    bytes.push_back(i > 8 ? std::uint8_t{0} : static_cast<std::uint8_t>(number >> (8 * (i - 1))));
}

// A file taken apart: the bytes of each object, by number, and the trailer's numbers.
struct List {
  std::vector<Bytes> objects;
  std::size_t offsetSize = 1;
  std::size_t referenceSize = 1;
  std::uint64_t topObject = 0;
};

// Empty when trailer and offset table do not fit into the file.
std::vector<std::size_t> offsetsIn(const Bytes& file, List& list) {
  if (file.size() < kMagic.size() + kTrailerSize) return {};
  const std::size_t trailer = file.size() - kTrailerSize;
  const std::uint64_t count = numberAt(file, trailer + kObjectCountAt, 8);
  const std::uint64_t table = numberAt(file, trailer + kOffsetTableAt, 8);
  const std::size_t offsetSize = file[trailer + kOffsetSizeAt];
  const std::size_t referenceSize = file[trailer + kReferenceSizeAt];
  if (offsetSize == 0 || offsetSize > 16 || referenceSize == 0 || table > trailer ||
      count > (trailer - table) / offsetSize)
    return {};
  list.offsetSize = offsetSize;
  list.referenceSize = referenceSize;
  list.topObject = numberAt(file, trailer + kTopObjectAt, 8);
  std::vector<std::size_t> offsets;
  for (std::uint64_t i = 0; i < count; ++i) {
    const std::uint64_t offset = numberAt(file, table + i * list.offsetSize, list.offsetSize);
    offsets.push_back(std::min(offset, table));
  }
  offsets.push_back(table);
  return offsets;
}

// An object ends where the next one begins.
List takenApart(const Bytes& file) {
  List list;
  const std::vector<std::size_t> offsets = offsetsIn(file, list);
  std::vector<std::size_t> sorted = offsets;
  std::sort(sorted.begin(), sorted.end());
  for (std::size_t i = 0; i + 1 < offsets.size(); ++i) {
    const std::size_t end = *std::upper_bound(sorted.begin(), sorted.end() - 1, offsets[i]);
    const auto begin = file.begin();
    list.objects.emplace_back(begin + static_cast<std::ptrdiff_t>(offsets[i]),
                              begin + static_cast<std::ptrdiff_t>(end));
  }
  return list;
}

Bytes putTogether(const List& list) {
  Bytes file(kMagic.begin(), kMagic.end());
  std::vector<std::size_t> offsets;
  for (const Bytes& object : list.objects) {
    offsets.push_back(file.size());
    file.insert(file.end(), object.begin(), object.end());
  }
  const std::size_t table = file.size();
  for (const std::size_t offset : offsets) append(file, offset, list.offsetSize);
  append(file, 0, kOffsetSizeAt);
  append(file, list.offsetSize, 1);
  append(file, list.referenceSize, 1);
  append(file, offsets.size(), 8);
  append(file, list.topObject, 8);
  append(file, table, 8);
  return file;
}

// A new object of any type, often a container that names objects of the list.
Bytes newObject(const List& list, Random& random) {
  static const Bytes kMarkers = {kFalse, kTrue,  kInteger | 3U, kReal | 3U,  kDate,  kData,
                                 kASCII, kUTF16, kArray,        kDictionary, kArray, kDictionary};
  Bytes object = {kMarkers[below(random, kMarkers.size())]};
  const std::uint8_t type = object[0] & 0xF0U;
  const std::size_t count = below(random, 5);
  if (type == kArray || type == kDictionary) {
    object[0] |= static_cast<std::uint8_t>(count);
    for (std::size_t i = type == kArray ? count : 2 * count; i > 0; --i)
      append(object, below(random, list.objects.size() + 1), list.referenceSize);
  } else if (type == kData || type == kASCII || type == kUTF16) {
    object[0] |= static_cast<std::uint8_t>(count);
    for (std::size_t i = type == kUTF16 ? 2 * count : count; i > 0; --i)
      object.push_back(static_cast<std::uint8_t>(random()));
  } else if (object[0] > kTrue) {
    append(object, random(), 8);
  }
  return object;
}

void changeBytes(Bytes& bytes) {
  const std::size_t size = bytes.size();
  bytes.resize(size + 16);
  bytes.resize(LLVMFuzzerMutate(bytes.data(), size, bytes.size()));
}

// Lets a container name another object, in the place of one of its references or of its count.
void changeReference(List& list, Bytes& object, Random& random) {
  if (object.size() <= list.referenceSize) return changeBytes(object);
  const std::size_t index = below(random, (object.size() - 1) / list.referenceSize);
  Bytes reference;
  append(reference, below(random, list.objects.size() + 1), list.referenceSize);
  std::copy(reference.begin(), reference.end(),
            object.begin() + static_cast<std::ptrdiff_t>(1 + index * list.referenceSize));
}

void change(List& list, Random& random) {
  Bytes& object = list.objects[below(random, list.objects.size())];
  switch (random() % 9) {
    case 0:
    case 1:
      return changeReference(list, object, random);
    case 2:
      return list.objects.push_back(newObject(list, random));
    case 3:
      object = newObject(list, random);
      return;
    case 4:
      return list.objects.push_back(Bytes(object));
    case 5:
      return std::swap(object, list.objects[below(random, list.objects.size())]);
    case 6:
      object[0] = static_cast<std::uint8_t>((object[0] & 0xF0U) | (random() & 0x0FU));
      return;
    case 7:
      list.topObject = below(random, list.objects.size() + 1);
      return;
    default:
      return changeBytes(object);
  }
}

// Lets one of the numbers behind the objects say something else.
void changeTableOrTrailer(Bytes& file, Random& random) {
  const std::size_t table = numberAt(file, file.size() - kTrailerSize + kOffsetTableAt, 8);
  Bytes end(file.begin() + static_cast<std::ptrdiff_t>(table), file.end());
  const std::size_t at = below(random, end.size());
  end[at] = static_cast<std::uint8_t>(end[at] + (random() % 2 == 0 ? 1 : random()));
  std::copy(end.begin(), end.end(), file.begin() + static_cast<std::ptrdiff_t>(table));
}

}  // namespace

extern "C" std::size_t LLVMFuzzerCustomMutator(std::uint8_t* data, std::size_t size,
                                               std::size_t most, unsigned seed) {
  Random random(seed);
  if (random() % 8 == 0) return LLVMFuzzerMutate(data, size, most);
  List list = takenApart(Bytes(data, data + size));
  for (std::size_t i = 1 + below(random, 3); i > 0; --i) {
    std::erase_if(list.objects, [](const Bytes& object) { return object.empty(); });
    if (list.objects.empty()) list.objects.push_back(newObject(list, random));
    change(list, random);
  }
  Bytes file = putTogether(list);
  if (random() % 4 == 0) changeTableOrTrailer(file, random);
  if (file.size() > most) return LLVMFuzzerMutate(data, size, most);
  std::memcpy(data, file.data(), file.size());
  return file.size();
}
