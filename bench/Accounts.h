#pragma once

#include <cstddef>
#include <string>

#include "propertylist/Value.h"

// Settings files like those of devices, made up from a fixed seed: the same number of accounts is
// the same file on every machine and in every run.
namespace bench {

// The numbers of accounts that files are made with.
inline constexpr std::size_t kSizes[] = {8, 100, 1'000, 10'000, 100'000};

// The settings of one device: "Version" and "Accounts". An account has 12 to 20 keys, every seventh
// about one or two children; among the values are dates, data, numbers, nested containers, and
// names in several scripts.
propertylist::Dictionary settings(std::size_t accounts);

// The same, each made once in a process and kept. All of them are gone with the process.
struct Document {
  std::size_t accounts = 0;
  propertylist::Value value;
  propertylist::Bytes binary;
  std::string xml;
  // Equivalent JSON: data as base64, dates as seconds.
  std::string json;
};
const Document& document(std::size_t accounts);

}  // namespace bench
