#include "bench/Rows.h"

#include <cstdlib>
#include <sstream>
#include <vector>

#include "propertylist/Reading.h"

namespace bench {
namespace {

std::vector<std::size_t> sizes() {
  const char* const chosen = std::getenv("BENCH_SIZES");
  if (chosen == nullptr) return {std::begin(kSizes), std::end(kSizes)};
  std::vector<std::size_t> result;
  std::istringstream text(chosen);
  for (std::string size; std::getline(text, size, ',');) result.push_back(std::stoul(size));
  return result;
}

}  // namespace

void addSizeRows(const std::string& name, const SizeRow& row) {
  for (const std::size_t size : sizes()) {
    benchmark::RegisterBenchmark((name + "/" + std::to_string(size)).c_str(),
                                 [row, size](benchmark::State& state) { row(state, size); })
        ->Unit(benchmark::kNanosecond);
  }
}

void addRows(const std::string& name, const DocumentRow& row) {
  addSizeRows(name, [row](benchmark::State& state, std::size_t accounts) {
    row(state, document(accounts));
  });
}

void readBinary(benchmark::State& state, const Document& document) {
  if (propertylist::readBinaryPropertyList(document.binary).value != document.value)
    return state.SkipWithError("another value was read");
  for ([[maybe_unused]] auto iteration : state)
    benchmark::DoNotOptimize(propertylist::readBinaryPropertyList(document.binary));
}

int runRows(int argc, char** argv, const std::function<void()>& add) {
  benchmark::Initialize(&argc, argv);
  if (benchmark::ReportUnrecognizedArguments(argc, argv)) return 2;
  add();
  benchmark::RunSpecifiedBenchmarks();
  benchmark::Shutdown();
  return 0;
}

}  // namespace bench
