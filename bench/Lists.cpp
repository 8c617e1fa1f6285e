// What it costs to read and write settings in each form, here and with the libraries that somebody
// would pick instead. Every program of this folder names its rows "operation/who/accounts".
#include <benchmark/benchmark.h>

#include <cstring>
#include <memory>
#include <span>

#include "bench/Rows.h"
#include "propertylist/Reading.h"
#include "propertylist/Writing.h"

namespace bench {
namespace {

void readXML(benchmark::State& state, const Document& document) {
  const std::span bytes(reinterpret_cast<const std::uint8_t*>(document.xml.data()),
                        document.xml.size());
  if (propertylist::readXMLPropertyList(bytes).value != document.value)
    return state.SkipWithError("another value was read");
  for ([[maybe_unused]] auto iteration : state)
    benchmark::DoNotOptimize(propertylist::readXMLPropertyList(bytes));
}

// What was read, as the peers write what they have read.
void writeBinary(benchmark::State& state, const Document& document) {
  const auto read = propertylist::readBinaryPropertyList(document.binary);
  for ([[maybe_unused]] auto iteration : state)
    benchmark::DoNotOptimize(propertylist::writeBinaryPropertyList(*read.value));
}

// Two lists that were read apart and share nothing.
void compare(benchmark::State& state, const Document& document) {
  const auto other = propertylist::readBinaryPropertyList(document.binary);
  if (!(document.value == *other.value)) return state.SkipWithError("not equal");
  for ([[maybe_unused]] auto iteration : state)
    benchmark::DoNotOptimize(document.value == *other.value);
}

// Into memory that is not cleared first: each byte is written once, which is the floor.
void copyBytes(benchmark::State& state, const Document& document) {
  const std::size_t size = document.binary.size();
  for ([[maybe_unused]] auto iteration : state) {
    const auto copy = std::make_unique_for_overwrite<std::uint8_t[]>(size);
    std::memcpy(copy.get(), document.binary.data(), size);
    benchmark::DoNotOptimize(copy.get());
    benchmark::ClobberMemory();
  }
}

}  // namespace
}  // namespace bench

int main(int argc, char** argv) {
  using namespace bench;
  return runRows(argc, argv, [] {
    addRows("read binary/own", readBinary);
    addRows("read XML/own", readXML);
    addRows("write binary/own", writeBinary);
    addRows("compare/own", compare);
    addRows("read binary/memcpy", copyBytes);
    addJSONPeers();
    addXMLPeers();
  });
}
