// The half of exchange.py that is made of the code under test. Each line of the exchange is a JSON
// object: "form" is "binary" or "xml", "file" the property list in base64, "value" what it holds.
//
//   propertylist-exchange write COUNT SEED   writes lines for COUNT random values, by turns of a
//   form propertylist-exchange check              reads lines; fails at the first list that is not
//   its value
#include <iostream>
#include <string>

#include "propertylist/Reading.h"
#include "propertylist/Writing.h"
#include "tests/propertylist/JSONValues.h"
#include "tests/propertylist/RandomValues.h"

namespace {

using namespace propertylist;
using nlohmann::json;

int writeLines(unsigned long count, unsigned long seed) {
  RandomValues binaryValues(seed, RandomValues::Form::binary);
  RandomValues xmlValues(seed, RandomValues::Form::xml);
  for (unsigned long i = 0; i < count; ++i) {
    const bool isBinary = i % 2 == 0;
    const Value value = isBinary ? binaryValues.next() : xmlValues.next();
    std::optional<std::string> file;
    if (isBinary) {
      if (const auto bytes = writeBinaryPropertyList(value))
        file.emplace(bytes->begin(), bytes->end());
    } else {
      file = writeXMLPropertyList(value);
    }
    if (!file) {
      std::cerr << "not written: " << describe(value) << "\n";
      return 1;
    }
    const json line{{"form", isBinary ? "binary" : "xml"},
                    {"file", base64(*file)},
                    {"value", jsonFromValue(value)}};
    std::cout << line.dump() << "\n";
  }
  return 0;
}

int checkLines() {
  unsigned long count = 0;
  std::string text;
  while (std::getline(std::cin, text)) {
    const json line = json::parse(text);
    const std::string file = bytesOfBase64(line["file"].get<std::string>());
    const Bytes bytes(file.begin(), file.end());
    const ReadResult result =
        line["form"] == "binary" ? readBinaryPropertyList(bytes) : readXMLPropertyList(bytes);
    if (result.value != valueFromJSON(line["value"])) {
      std::cerr << "not read as its value: " << text << "\n" << result.error.description() << "\n";
      return 1;
    }
    ++count;
  }
  std::cout << count << "\n";
  return 0;
}

}  // namespace

int main(int count, char** arguments) {
  const std::string command = count > 1 ? arguments[1] : "";
  if (command == "write" && count == 4) {
    return writeLines(std::stoul(arguments[2]), std::stoul(arguments[3]));
  }
  if (command == "check" && count == 2) return checkLines();
  std::cerr << "usage: propertylist-exchange write COUNT SEED | check\n";
  return 2;
}
