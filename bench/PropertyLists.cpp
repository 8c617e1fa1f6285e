// What it costs to read, write, compare and change lists like the settings file, by its accounts.
#include <benchmark/benchmark.h>

#include <string>

#include "propertylist/Reading.h"
#include "propertylist/Writing.h"

namespace {

using namespace propertylist;

Dictionary account(std::size_t number) {
  const std::string identifier = "8F2B4E60-0000-4000-8000-" + std::to_string(100000000000 + number);
  return {{"Identifier", identifier},
          {"Type", "Exchange"},
          {"Class", "BasicAccount"},
          {"DisplayName", "Account " + std::to_string(number)},
          {"Username", "user" + std::to_string(number) + "@example.com"},
          {"Enabled Dataclasses", Array{"Mail", "Contacts", "Calendars", "Reminders", "Notes"}},
          {"Port", 993},
          {"SSLEnabled", true},
          {"Created", Date{static_cast<double>(number)}},
          {"ChildAccounts", Array{Dictionary{{"Identifier", identifier + "-child"},
                                             {"Type", "CardDAV"},
                                             {"Class", "BasicAccount"}}}}};
}

Value settings(const benchmark::State& state) {
  std::vector<Value> accounts;
  for (std::int64_t i = 0; i < state.range(0); ++i) {
    accounts.emplace_back(account(static_cast<std::size_t>(i)));
  }
  return Dictionary{{"Version", 12}, {"Accounts", Array(std::move(accounts))}};
}

void readBinary(benchmark::State& state) {
  const Bytes bytes = *writeBinaryPropertyList(settings(state));
  for ([[maybe_unused]] auto iteration : state) {
    benchmark::DoNotOptimize(readBinaryPropertyList(bytes));
  }
  state.SetComplexityN(state.range(0));
}

void readXML(benchmark::State& state) {
  const std::string text = *writeXMLPropertyList(settings(state));
  const Bytes bytes(text.begin(), text.end());
  for ([[maybe_unused]] auto iteration : state) {
    benchmark::DoNotOptimize(readXMLPropertyList(bytes));
  }
  state.SetComplexityN(state.range(0));
}

void writeBinary(benchmark::State& state) {
  const Value value = settings(state);
  for ([[maybe_unused]] auto iteration : state) {
    benchmark::DoNotOptimize(writeBinaryPropertyList(value));
  }
  state.SetComplexityN(state.range(0));
}

void writeXML(benchmark::State& state) {
  const Value value = settings(state);
  for ([[maybe_unused]] auto iteration : state) {
    benchmark::DoNotOptimize(writeXMLPropertyList(value));
  }
  state.SetComplexityN(state.range(0));
}

// Two lists that were read from two files and share nothing.
void compareEqual(benchmark::State& state) {
  const Bytes bytes = *writeBinaryPropertyList(settings(state));
  const Value a = *readBinaryPropertyList(bytes).value;
  const Value b = *readBinaryPropertyList(bytes).value;
  for ([[maybe_unused]] auto iteration : state) benchmark::DoNotOptimize(a == b);
  state.SetComplexityN(state.range(0));
}

// Keys that come in ascending order, as when a dictionary is made from another one.
void setAscendingKeys(benchmark::State& state) {
  const std::int64_t count = state.range(0);
  for ([[maybe_unused]] auto iteration : state) {
    Dictionary dictionary;
    for (std::int64_t i = 0; i < count; ++i) dictionary.set(std::to_string(1000000 + i), i);
    benchmark::DoNotOptimize(dictionary);
  }
  state.SetComplexityN(count);
}

void sizes(benchmark::internal::Benchmark* benchmark) {
  benchmark->RangeMultiplier(4)->Range(64, 16384)->Complexity()->Unit(benchmark::kMicrosecond);
}

BENCHMARK(readBinary)->Apply(sizes);
BENCHMARK(readXML)->Apply(sizes);
BENCHMARK(writeBinary)->Apply(sizes);
BENCHMARK(writeXML)->Apply(sizes);
BENCHMARK(compareEqual)->Apply(sizes);
BENCHMARK(setAscendingKeys)->Apply(sizes);

}  // namespace

BENCHMARK_MAIN();
