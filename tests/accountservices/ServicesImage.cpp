#include "tests/accountservices/ServicesImage.h"

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <stdexcept>

#include "propertylist/Writing.h"

namespace accountservices {

namespace files = std::filesystem;
using deviceimage::DeviceImage;

namespace {

constexpr const char* kTemporaryDirectoryVariable = "TMPDIR";
constexpr std::string_view kTimeForm = R"({"time": "0000-00-00T00:00:00Z", )";

std::string fileContent(const std::string& path) {
  std::ifstream file(path, std::fstream::binary);
  if (!file) throw std::runtime_error("cannot read " + path);
  return {std::istreambuf_iterator<char>(file), {}};
}

// The line without its time; the whole line when it does not begin with one.
std::string withoutTime(const std::string& line) {
  if (line.size() < kTimeForm.size()) return line;
  for (std::size_t i = 0; i < kTimeForm.size(); ++i) {
    const bool fits =
        kTimeForm[i] == '0' ? line[i] >= '0' && line[i] <= '9' : line[i] == kTimeForm[i];
    if (!fits) return line;
  }
  return "{" + line.substr(kTimeForm.size());
}

}  // namespace

ServicesImage::ServicesImage() {
  deviceimage::OpenedImage made = DeviceImage::create(_directory.path() + "/image");
  if (!made.image) throw std::runtime_error(made.error);
  _image = std::move(made.image);
  for (const std::string name :
       {"CalendarService.so", "ContactsService.so", "DeviceService.so", "MailService.so"})
    addBundle(name, std::string(BUILT_SERVICES) + "/" + name);
  const std::string resources = _directory.path() + "/resources";
  files::copy(SHIPPED_RESOURCES, resources, files::copy_options::recursive);
  deviceimage::ServiceOptions options;
  options.processName = "tester";
  options.resourceDirectory = resources;
  _services = std::make_unique<deviceimage::DeviceImageServices>(_image, std::move(options));
  platform::install(_services->services());
  // A save makes its temporary file there.
  if (const char* const earlier = ::getenv(kTemporaryDirectoryVariable))
    _earlierTemporaryDirectory = earlier;
  ::setenv(kTemporaryDirectoryVariable, _image->temporaryDirectory().c_str(), 1);
}

ServicesImage::~ServicesImage() {
  if (_earlierTemporaryDirectory)
    ::setenv(kTemporaryDirectoryVariable, _earlierTemporaryDirectory->c_str(), 1);
  else
    ::unsetenv(kTemporaryDirectoryVariable);
}

void ServicesImage::addBundle(const std::string& name, const std::string& builtFile) const {
  const std::string content = fileContent(builtFile);
  const platform::Status placed =
      _image->createFile(std::string(DeviceImage::kAccountServicesDirectory) + "/" + name,
                         {reinterpret_cast<const std::uint8_t*>(content.data()), content.size()});
  if (!placed.isSuccess()) throw std::runtime_error(placed.error->description);
}

void ServicesImage::removeBundle(const std::string& name) const { files::remove(bundlePath(name)); }

std::string ServicesImage::bundlePath(const std::string& name) const {
  return root() + "/System/Library/AccountServices/" + name;
}

void ServicesImage::addEntry(const std::string& type, const Dictionary& entry) const {
  const std::string file = _directory.path() + "/resources/AccountCreators.plist";
  Dictionary catalogue = *propertylist::readPropertyListFile(file).value->asDictionary();
  Array entries = *propertylist::findArray(catalogue, type);
  entries.append(entry);
  catalogue.set(type, entries);
  const propertylist::Bytes bytes = *propertylist::writeBinaryPropertyList(catalogue);
  std::ofstream(file, std::fstream::binary)
      .write(reinterpret_cast<const char*>(bytes.data()),
             static_cast<std::streamsize>(bytes.size()));
}

void ServicesImage::addNotifier(const std::string& bundle, const std::string& className) const {
  addEntry("CalDAV",
           {{"Type", "NotifierAccount"},
            {"Description", Dictionary{{"Supported Dataclasses", Array{kCalendars}},
                                       {"Framework", "System/Library/AccountServices/" + bundle},
                                       {"Class", className}}}});
}

void ServicesImage::writeAccounts(const Array& accounts) const {
  const platform::Status written = _image->writePropertyList(
      DeviceImage::kSettingsFile, Dictionary{{"Version", 12}, {"Accounts", accounts}});
  if (!written.isSuccess()) throw std::runtime_error(written.error->description);
}

Array ServicesImage::savedAccounts() const {
  const propertylist::FileReadResult read =
      propertylist::readPropertyListFile(_image->settingsFile());
  if (!read.value) throw std::runtime_error(read.error);
  return *propertylist::findArray(*read.value->asDictionary(), "Accounts");
}

Lines ServicesImage::leftovers() const {
  Lines names;
  for (const std::string& directory :
       {_image->temporaryDirectory(), _image->preferencesDirectory()})
    for (const files::directory_entry& entry : files::directory_iterator(directory))
      if (entry.path() != _image->settingsFile()) names.push_back(entry.path().filename());
  return names;
}

Lines ServicesImage::journal(std::string_view name) const {
  std::ifstream file(_image->absolutePath(name));
  Lines lines;
  for (std::string line; std::getline(file, line);) lines.push_back(withoutTime(line));
  return lines;
}

Dictionary account(const std::string& identifier, const std::string& type,
                   const std::string& dataclass, const Dictionary& more) {
  Dictionary made = {{"Identifier", identifier}, {"Type", type}, {"Class", "C"}};
  if (!dataclass.empty()) made.set("Enabled Dataclasses", Array{dataclass});
  for (const Dictionary::Entry& entry : more) made.set(entry.key(), entry.value());
  return made;
}

}  // namespace accountservices
