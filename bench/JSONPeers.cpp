// RapidJSON, nlohmann-json and simdjson on the equivalent document, each used as its manual begins.
#include <rapidjson/document.h>
#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>
#include <simdjson.h>

#include <nlohmann/json.hpp>

#include "bench/Rows.h"

namespace bench {
namespace {

void readRapidJSON(benchmark::State& state, const Document& document) {
  for ([[maybe_unused]] auto iteration : state) {
    rapidjson::Document read;
    read.Parse(document.json.c_str());
    if (read.HasParseError()) return state.SkipWithError("not read");
    benchmark::DoNotOptimize(read);
  }
}

void writeRapidJSON(benchmark::State& state, const Document& document) {
  rapidjson::Document read;
  read.Parse(document.json.c_str());
  if (read.HasParseError()) return state.SkipWithError("not read");
  for ([[maybe_unused]] auto iteration : state) {
    rapidjson::StringBuffer text;
    rapidjson::Writer<rapidjson::StringBuffer> writer(text);
    read.Accept(writer);
    benchmark::DoNotOptimize(text.GetString());
  }
}

void readNlohmann(benchmark::State& state, const Document& document) {
  for ([[maybe_unused]] auto iteration : state)
    benchmark::DoNotOptimize(nlohmann::json::parse(document.json));
}

void writeNlohmann(benchmark::State& state, const Document& document) {
  const auto read = nlohmann::json::parse(document.json);
  for ([[maybe_unused]] auto iteration : state) benchmark::DoNotOptimize(read.dump());
}

// A tape without a value of its own for each node; the numbers and texts are read, the keys not
// looked up. One parser reads every document, as the manual advises, and keeps its memory.
void readSimdjson(benchmark::State& state, const Document& document) {
  const simdjson::padded_string text(document.json);
  simdjson::dom::parser parser;
  for ([[maybe_unused]] auto iteration : state) {
    simdjson::dom::element read;
    if (parser.parse(text).get(read) != simdjson::SUCCESS) return state.SkipWithError("not read");
    benchmark::DoNotOptimize(read);
  }
}

}  // namespace

void addJSONPeers() {
  addRows("read binary/RapidJSON", readRapidJSON);
  addRows("read binary/nlohmann-json", readNlohmann);
  addRows("read binary/simdjson", readSimdjson);
  addRows("write binary/RapidJSON", writeRapidJSON);
  addRows("write binary/nlohmann-json", writeNlohmann);
}

}  // namespace bench
