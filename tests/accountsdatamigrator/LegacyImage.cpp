#include "tests/accountsdatamigrator/LegacyImage.h"

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>

#include "QuillnetAccountTypeRemoval/AccountsDataMigrator.h"
#include "propertylist/Reading.h"
#include "propertylist/Writing.h"

namespace accountsdatamigrator {

namespace files = std::filesystem;

LegacyTest::LegacyTest() {
  const files::path migrators = image.path("System/Library/DataClassMigrators");
  files::create_directories(migrators);
  files::copy(BUILT_MIGRATOR, migrators / "AccountMigrator.migrator");
  files::remove(image.path(kSettingsFile));
  installServices(SHIPPED_RESOURCES);
  ::setenv("TMPDIR", image.image->temporaryDirectory().c_str(), 1);
}

LegacyTest::~LegacyTest() { ::unsetenv("TMPDIR"); }

void LegacyTest::installServices(const std::optional<std::string>& resources) {
  deviceimage::ServiceOptions options;
  options.processName = "tester";
  options.resourceDirectory = resources;
  options.logSink = [this](std::string_view line) { _log.emplace_back(line); };
  _services = std::make_unique<deviceimage::DeviceImageServices>(image.image, std::move(options));
  platform::install(_services->services());
}

bool LegacyTest::execute() const {
  platform::ClassRegistry& registry = platform::services().classRegistry;
  const platform::CodeBundlePtr bundle = registry.loadCodeBundle(
      image.path("System/Library/DataClassMigrators/AccountMigrator.migrator"));
  auto* const migratorClass = dynamic_cast<accountsettings::AccountsDataMigratorClass*>(
      registry.classNamed("AccountsDataMigrator"));
  return bundle != nullptr && migratorClass != nullptr &&
         migratorClass->init()->executeMigrationSteps();
}

void LegacyTest::write(std::string_view file, const Dictionary& root) const {
  const propertylist::Bytes bytes = *propertylist::writeBinaryPropertyList(root);
  writeBytes(file, std::string(bytes.begin(), bytes.end()));
}

void LegacyTest::writeBytes(std::string_view file, const std::string& bytes) const {
  files::create_directories(image.path(file).parent_path());
  std::ofstream(image.path(file), std::fstream::binary) << bytes;
}

std::optional<std::string> LegacyTest::bytesOf(std::string_view file) const {
  std::ifstream stream(image.path(file), std::fstream::binary);
  if (!stream) return std::nullopt;
  return std::string(std::istreambuf_iterator<char>(stream), {});
}

Dictionary LegacyTest::settings() const {
  const auto read = propertylist::readPropertyListFile(image.path(kSettingsFile));
  return read.value ? *read.value->asDictionary() : Dictionary();
}

Array LegacyTest::accounts() const {
  const Dictionary root = settings();
  const Array* const list = propertylist::findArray(root, "Accounts");
  return list == nullptr ? Array() : *list;
}

Lines LegacyTest::temporaryFiles() const {
  Lines names;
  for (const auto& entry : files::directory_iterator(image.path("tmp")))
    if (entry.path().filename() != "AccountMigrationInProgress")
      names.push_back(entry.path().filename());
  return names;
}

Lines LegacyTest::log() const {
  constexpr std::string_view kAddress = "migrateNewAccountsInfo=";
  const std::string root = image.image->rootPath();
  Lines lines = _log;
  for (std::string& line : lines) {
    if (const std::size_t at = line.find(kAddress); at != std::string::npos)
      line = line.substr(0, at + kAddress.size()) + "ADDRESS";
    for (std::size_t at = line.find(root); at != std::string::npos; at = line.find(root))
      line.replace(at, root.size(), "IMAGE");
  }
  return lines;
}

}  // namespace accountsdatamigrator
