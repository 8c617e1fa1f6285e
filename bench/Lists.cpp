// What it costs to read and write settings in each form, here and with the libraries that somebody
// would pick instead. Every program of this folder names its rows "operation/who/accounts".
#include <benchmark/benchmark.h>

#include <cstring>

#include "bench/Rows.h"
#include "propertylist/Reading.h"
#include "propertylist/Writing.h"

namespace bench {
namespace {

void readBinary(benchmark::State& state, const Document& document) {
  for ([[maybe_unused]] auto iteration : state)
    benchmark::DoNotOptimize(propertylist::readBinaryPropertyList(document.binary));
}

void readXML(benchmark::State& state, const Document& document) {
  const auto* const bytes = reinterpret_cast<const std::uint8_t*>(document.xml.data());
  for ([[maybe_unused]] auto iteration : state)
    benchmark::DoNotOptimize(propertylist::readXMLPropertyList({bytes, document.xml.size()}));
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
  for ([[maybe_unused]] auto iteration : state)
    benchmark::DoNotOptimize(document.value == *other.value);
}

void copyBytes(benchmark::State& state, const Document& document) {
  for ([[maybe_unused]] auto iteration : state) {
    propertylist::Bytes copy(document.binary.size());
    std::memcpy(copy.data(), document.binary.data(), copy.size());
    benchmark::DoNotOptimize(copy.data());
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
