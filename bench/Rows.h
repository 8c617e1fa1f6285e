#pragma once

#include <benchmark/benchmark.h>

#include <cstddef>
#include <functional>
#include <string>

#include "bench/Accounts.h"

namespace bench {

// Registers a row for each number of accounts that this run is about: all of kSizes, or those in
// BENCH_SIZES, separated by commas. The document is made when the row first runs.
using DocumentRow = std::function<void(benchmark::State& state, const Document& document)>;
void addRows(const std::string& name, const DocumentRow& row);
// The same for rows that want the number alone.
using SizeRow = std::function<void(benchmark::State& state, std::size_t accounts)>;
void addSizeRows(const std::string& name, const SizeRow& row);

// Registers what `add` adds and runs what the command line asks for; the program's exit code.
int runRows(int argc, char** argv, const std::function<void()>& add);

// Reads the binary form and nothing else, once it is sure that this gives the document's value.
void readBinary(benchmark::State& state, const Document& document);

// The peers of the readers and the writer.
void addJSONPeers();
void addXMLPeers();

}  // namespace bench
