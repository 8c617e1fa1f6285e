#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <sstream>

#include "propertylist/Reading.h"
#include "propertylist/Writing.h"
#include "tests/propertylist/JSONValues.h"
#include "tests/propertylist/SmallStack.h"

namespace propertylist {
namespace {

using nlohmann::json;

const std::filesystem::path kData = TEST_DATA_DIR;

std::string contentsOf(const std::filesystem::path& path) {
  std::ifstream file(path, std::fstream::binary);
  if (!file) throw std::runtime_error("cannot open " + path.string());
  return {std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
}

Bytes bytesOf(const std::string& text) { return {text.begin(), text.end()}; }

// A name of letters, digits and underscores, as GoogleTest wants it.
std::string caseName(std::string text) {
  std::replace_if(
      text.begin(), text.end(), [](char c) { return std::isalnum(c) == 0; }, '_');
  return text;
}

// Good files

std::vector<std::string> sampleNames() {
  std::vector<std::string> names;
  for (const auto& entry : std::filesystem::directory_iterator(kData / "propertylists")) {
    if (entry.path().extension() == ".json") names.push_back(entry.path().stem().string());
  }
  std::sort(names.begin(), names.end());
  return names;
}

// The program that made the binary samples stored 0.0 and -0.0 as one object, so the sign of a zero
// is whichever came first there.
Value withoutSignsOfZeros(const Value& value) {
  if (value.asReal() == 0.0) return 0.0;
  if (const Array* const array = value.asArray()) {
    Array result;
    for (const Value& member : *array) result.append(withoutSignsOfZeros(member));
    return result;
  }
  const Dictionary* const dictionary = value.asDictionary();
  if (dictionary == nullptr) return value;
  Dictionary result;
  for (const auto& entry : *dictionary) result.set(entry.key(), withoutSignsOfZeros(entry.value()));
  return result;
}

class SampleFiles : public testing::TestWithParam<std::string> {};

TEST_P(SampleFiles, ReadToTheirDescribedValueInBothForms) {
  const std::filesystem::path folder = kData / "propertylists";
  const Value expected = valueFromJSON(json::parse(contentsOf(folder / (GetParam() + ".json"))));
  const FileReadResult xml = readPropertyListFile((folder / (GetParam() + ".xml.plist")).string());
  ASSERT_TRUE(xml.value.has_value()) << xml.error;
  EXPECT_EQ(*xml.value, expected) << describe(*xml.value);
  const FileReadResult binary =
      readPropertyListFile((folder / (GetParam() + ".binary.plist")).string());
  ASSERT_TRUE(binary.value.has_value()) << binary.error;
  EXPECT_EQ(withoutSignsOfZeros(*binary.value), withoutSignsOfZeros(expected))
      << describe(*binary.value);
}

INSTANTIATE_TEST_SUITE_P(All, SampleFiles, testing::ValuesIn(sampleNames()),
                         [](const auto& test) { return caseName(test.param); });

TEST(SampleFiles, AreSixteen) { EXPECT_EQ(sampleNames().size(), 16U); }

// Malformed and odd files

struct Row {
  std::string file;
  bool isAccepted;
  std::string why;
};

void PrintTo(const Row& row, std::ostream* stream) { *stream << row.file << ": " << row.why; }

std::vector<Row> rows() {
  std::vector<Row> result;
  std::istringstream index(contentsOf(kData / "malformed" / "index.tsv"));
  std::string line;
  std::getline(index, line);  // the names of the columns
  while (std::getline(index, line)) {
    std::istringstream columns(line);
    Row row;
    std::string expect;
    std::getline(columns, row.file, '\t');
    std::getline(columns, expect, '\t');
    std::getline(columns, row.why);
    row.isAccepted = expect == "accept";
    if (!row.isAccepted && expect != "reject") throw std::runtime_error("bad row: " + line);
    result.push_back(row);
  }
  return result;
}

// expected.json writes values as [kind, content], other than the good files' descriptions do.
Value valueOfPair(const json& pair) {
  const std::string kind = pair[0].get<std::string>();
  const json& content = pair[1];
  if (kind == "int") return valueFromJSON({{"integer", content}});
  if (kind == "bool") return content.get<bool>();
  if (kind == "data") {
    Bytes data;
    const std::string digits = content.get<std::string>();
    for (std::size_t i = 0; i < digits.size(); i += 2) {
      data.push_back(static_cast<std::uint8_t>(std::stoul(digits.substr(i, 2), nullptr, 16)));
    }
    return data;
  }
  if (kind == "array") {
    Array array;
    for (const json& member : content) array.append(valueOfPair(member));
    return array;
  }
  if (kind == "dict") {
    Dictionary dictionary;
    for (const json& entry : content) {
      dictionary.set(entry[0].get<std::string>(), valueOfPair(entry[1]));
    }
    return dictionary;
  }
  return valueFromJSON({{kind, content}});
}

// Read once, for those who run all cases in one process.
const json& expectedOfOddFiles() {
  static const json expected = json::parse(contentsOf(kData / "malformed" / "expected.json"));
  return expected;
}

class OddFiles : public testing::TestWithParam<Row> {};

TEST_P(OddFiles, AreReadOrRefusedAsTheIndexSays) {
  const Row& row = GetParam();
  const Bytes bytes = bytesOf(contentsOf(kData / "malformed" / row.file));
  ReadResult result;
  const double seconds = runOnSmallStack([&] { result = readPropertyList(bytes); });
  EXPECT_LT(seconds, 1.0);
  ASSERT_EQ(result.value.has_value(), row.isAccepted) << result.error.description();
  if (!row.isAccepted) {
    EXPECT_NE(result.error.what, "");
    EXPECT_TRUE(result.error.byteOffset.has_value() != result.error.line.has_value());
    return;
  }
  const json& expected = expectedOfOddFiles();
  if (expected.contains(row.file)) {
    EXPECT_EQ(*result.value, valueOfPair(expected[row.file])) << describe(*result.value);
  }
}

INSTANTIATE_TEST_SUITE_P(All, OddFiles, testing::ValuesIn(rows()),
                         [](const auto& test) { return caseName(test.param.file); });

std::vector<Row> acceptedRows() {
  std::vector<Row> accepted;
  for (const Row& row : rows()) {
    if (row.isAccepted) accepted.push_back(row);
  }
  return accepted;
}

class AcceptedFiles : public testing::TestWithParam<Row> {};

TEST_P(AcceptedFiles, AreComparedDescribedWrittenAndDroppedOnASmallStack) {
  const Row& row = GetParam();
  const Bytes bytes = bytesOf(contentsOf(kData / "malformed" / row.file));
  const double seconds = runOnSmallStack([&] {
    const Value value = *readPropertyList(bytes).value;
    const Value again = *readPropertyList(bytes).value;
    EXPECT_EQ(value, again);
    EXPECT_EQ(describe(value), describe(again));
    const std::optional<Bytes> binary = writeBinaryPropertyList(value);
    ASSERT_TRUE(binary.has_value());
    EXPECT_EQ(readBinaryPropertyList(*binary).value, value);
    if (const std::optional<std::string> xml = writeXMLPropertyList(value)) {
      EXPECT_EQ(readXMLPropertyList(bytesOf(*xml)).value, value);
    }
  });
  EXPECT_LT(seconds, 1.0);
}

INSTANTIATE_TEST_SUITE_P(All, AcceptedFiles, testing::ValuesIn(acceptedRows()),
                         [](const auto& test) { return caseName(test.param.file); });

TEST(OddFiles, AllHaveARowInTheIndex) {
  std::size_t files = 0;
  for (const auto& entry : std::filesystem::directory_iterator(kData / "malformed")) {
    if (entry.path().extension() == ".plist") ++files;
  }
  EXPECT_EQ(rows().size(), files);
  EXPECT_EQ(files, 123U);
}

TEST(OddFiles, HaveAnExpectedValueForEachAcceptedOneButTheDeepest) {
  const json& expected = expectedOfOddFiles();
  std::vector<std::string> without;
  for (const Row& row : rows()) {
    if (row.isAccepted && !expected.contains(row.file)) without.push_back(row.file);
  }
  EXPECT_EQ(without, std::vector<std::string>{"b19_depth_at_limit.plist"});
}

}  // namespace
}  // namespace propertylist
