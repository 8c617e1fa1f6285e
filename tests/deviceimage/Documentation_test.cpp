// What docs/device-image.md says is true of a sample image.
#include <gmock/gmock.h>

#include <array>
#include <cstdio>
#include <fstream>

#include "deviceimage/Database.h"
#include "deviceimage/DeviceImageServices.h"
#include "tests/deviceimage/TemporaryImage.h"

namespace deviceimage {
namespace {

std::string documentation() {
  std::ifstream file(std::string(TEST_DATA_DIR) + "/../../docs/device-image.md");
  return {std::istreambuf_iterator<char>(file), {}};
}

std::string outputOf(const std::string& command) {
  std::string output;
  FILE* const pipe = ::popen((command + " 2>&1").c_str(), "r");
  if (pipe == nullptr) return "no shell";
  std::array<char, 4096> chunk{};
  for (std::size_t count = 1; count > 0;) {
    count = std::fread(chunk.data(), 1, chunk.size(), pipe);
    output.append(chunk.data(), count);
  }
  ::pclose(pipe);
  return output;
}

// The image that the document's answers are about.
void fill(const TemporaryImage& image) {
  RecordStores stores = image.stores();
  const auto add = [&](Dataclass dataclass, const std::optional<std::string>& account,
                       const std::vector<NewRecord>& records) {
    ASSERT_TRUE(stores.addRecords(dataclass, account, records).status.isSuccess());
  };
  add(Dataclass::contacts, "Quillnet:ada",
      {record("ada", "BEGIN:VCARD\nFN:Ada\nEND:VCARD", 1'500'000'000),
       record("bo", "BEGIN:VCARD\nFN:Bo\nEND:VCARD", 1'500'000'000)});
  add(Dataclass::contacts, std::nullopt,
      {record("ada", "BEGIN:VCARD\nFN:Ada Byron\nEND:VCARD", 1'000'000'000)});
  add(Dataclass::bookmarks, std::nullopt,
      {record("1", "https://one.example", 1, {"Work", "Plans"}),
       record("2", "https://two.example", 1, {"Work"})});
  DeviceImageServices services(image.image);
  platform::SyncDataSource& sources = services.services().syncDataSource;
  const auto local = sources.createDataSource("Contacts", std::nullopt, std::nullopt).source;
  const auto service = sources.createDataSource("Contacts", "Quillnet:ada", std::nullopt).source;
  ASSERT_TRUE(sources.migrateRecords(service, local).isSuccess());
  ASSERT_TRUE(sources.commit(local).isSuccess());
  ASSERT_TRUE(sources.removeStore(service, false).isSuccess());
}

// The text from `from` on up to the next "```", with `from` moved behind that.
std::string block(const std::string& text, std::size_t& from) {
  const std::size_t end = text.find("```", from);
  std::string inside = text.substr(from, end - from);
  from = end + 3;
  return inside;
}

std::string replaced(std::string text, const std::string& from, const std::string& to) {
  for (std::size_t at = text.find(from); at != std::string::npos;
       at = text.find(from, at + to.size()))
    text.replace(at, from.size(), to);
  return text;
}

TEST(DeviceImageDocument, AnswersItsOwnQuestions) {
  const TemporaryImage image;
  fill(image);
  const std::string text = documentation();
  const std::string question = "```sh\n";
  const std::string answer = "\n\n```text\n";
  int questions = 0;
  for (std::size_t at = text.find(question); at != std::string::npos;
       at = text.find(question, at)) {
    at += question.size();
    const std::string command = block(text, at);
    SCOPED_TRACE(command);
    ASSERT_EQ(text.substr(at, answer.size()), answer);
    at += answer.size();
    EXPECT_EQ(outputOf(replaced(command, "IMAGE", image.root().string())), block(text, at));
    ++questions;
  }
  EXPECT_EQ(questions, 6);
}

TEST(DeviceImageDocument, NamesEveryTableAndColumn) {
  const TemporaryImage image;
  const std::unique_ptr<Database> database =
      Database::openOrCreate(*image.image, platform::ContactsSyncType);
  const std::string text = documentation();
  Statement columns(*database,
                    "SELECT t.name, c.name FROM sqlite_schema t JOIN pragma_table_info(t.name) c "
                    "WHERE t.type = 'table' AND t.name NOT LIKE 'sqlite_%'");
  int count = 0;
  for (; columns.step(); ++count) {
    EXPECT_THAT(text, testing::HasSubstr("### " + columns.text(0) + "\n"));
    EXPECT_THAT(text, testing::HasSubstr("`" + columns.text(1) + "`"));
  }
  EXPECT_EQ(count, 28);
}

TEST(DeviceImageDocument, NamesEveryFileOfANewImage) {
  const TemporaryImage image;
  const std::string text = documentation();
  for (const auto& entry : std::filesystem::recursive_directory_iterator(image.root())) {
    if (!entry.is_regular_file()) continue;
    const std::string name = entry.path().lexically_relative(image.root()).string();
    EXPECT_THAT(text, testing::HasSubstr("`" + name + "`"));
  }
  for (const Dataclass dataclass : kDataclasses)
    EXPECT_THAT(text,
                testing::HasSubstr(
                    "`" + std::string(DeviceImage::databaseFile(syncTypeOf(dataclass))) + "`"));
}

}  // namespace
}  // namespace deviceimage
