// What it costs to move the records of an account into the local store, with the commit.
#include "bench/Records.h"

#include <benchmark/benchmark.h>

#include <filesystem>
#include <memory>
#include <stdexcept>

#include "bench/Rows.h"
#include "deviceimage/DeviceImage.h"
#include "deviceimage/DeviceImageServices.h"
#include "deviceimage/RecordStores.h"
#include "platform/testing/TemporaryDirectory.h"

namespace bench {
namespace {

using deviceimage::Dataclass;
using deviceimage::DeviceImage;

constexpr const char* kAccount = "Quillnet:bench";

struct Records {
  Dataclass dataclass;
  platform::SyncDataType type;
  const char* kind;
};
constexpr Records kContacts{Dataclass::contacts, platform::SyncDataType::contacts, "contact"};
constexpr Records kEvents{Dataclass::calendars, platform::SyncDataType::calendars, "event"};

std::string contentOf(Dataclass dataclass, const std::string& uid, std::size_t number) {
  const std::string n = std::to_string(number);
  if (dataclass == Dataclass::contacts) {
    return "BEGIN:VCARD\r\nVERSION:3.0\r\nUID:" + uid + "\r\nN:Müller" + n + ";Jürgen;;;\r\n" +
           "FN:Jürgen Müller" + n + "\r\nEMAIL;TYPE=HOME:j" + n + "@example.com\r\n" +
           "TEL;TYPE=CELL:+49 170 " + n + "\r\nADR:;;Hauptstraße " + n +
           ";Köln;;50667;Deutschland\r\nNOTE:Met at the fair\r\nEND:VCARD\r\n";
  }
  return "BEGIN:VCALENDAR\r\nVERSION:2.0\r\nPRODID:-//bench//EN\r\nBEGIN:VEVENT\r\nUID:" + uid +
         "\r\nDTSTAMP:20260101T000000Z\r\nDTSTART:20260601T090000Z\r\nDTEND:20260601T100000Z\r\n" +
         "SUMMARY:Besprechung " + n + "\r\nLOCATION:Raum " + n +
         "\r\nRRULE:FREQ=WEEKLY;COUNT=10\r\nEND:VEVENT\r\nEND:VCALENDAR\r\n";
}

// An image with one account's records, and a copy of it for each move.
class Image {
 public:
  Image(const Records& records, std::size_t count) {
    const auto made = DeviceImage::create(_path("full"));
    if (made.image == nullptr) throw std::runtime_error(made.error);
    deviceimage::RecordStores stores(made.image, deviceimage::RecordStores::Access::readWrite);
    std::vector<deviceimage::NewRecord> added;
    for (std::size_t i = 0; i < count; ++i) {
      const std::string uid = "record-" + std::to_string(i) + "@example.com";
      const auto modified = static_cast<std::int64_t>(1'700'000'000 + i);
      added.push_back({{"Imported"}, uid, contentOf(records.dataclass, uid, i), modified});
    }
    if (!stores.addRecords(records.dataclass, kAccount, added).status.isSuccess())
      throw std::runtime_error("the records cannot be added");
  }

  // The path of a fresh copy; the last one is gone.
  std::string freshCopy() const {
    std::filesystem::remove_all(_path("copy"));
    std::filesystem::copy(_path("full"), _path("copy"), std::filesystem::copy_options::recursive);
    return _path("copy");
  }

 private:
  std::string _path(const std::string& name) const { return _directory.path() + "/" + name; }
  platform::TemporaryDirectory _directory;
};

// The services of the image at `path`, without a log.
std::unique_ptr<deviceimage::DeviceImageServices> servicesOf(const std::string& path) {
  const auto opened = DeviceImage::open(path);
  if (opened.image == nullptr) throw std::runtime_error(opened.error);
  deviceimage::ServiceOptions options;
  options.writesLog = false;
  return std::make_unique<deviceimage::DeviceImageServices>(opened.image, options);
}

bool moveHere(const std::string& path, const Records& records) {
  const auto services = servicesOf(path);
  platform::SyncDataSource& sources = services->services().syncDataSource;
  const auto name = sources.dataclassNameForSyncType(records.type);
  const auto from = sources.createDataSource(name, kAccount, std::nullopt).source;
  const auto into = sources.createDataSource(name, std::nullopt, std::nullopt).source;
  return sources.migrateRecords(from, into).isSuccess() && sources.commit(into).isSuccess() &&
         sources.removeStore(from, false).isSuccess() &&
         sources.deleteDataSource(from).isSuccess() && sources.deleteDataSource(into).isSuccess();
}

// Whether the local store of the image at `path` has so many records.
bool areLocal(std::size_t count, const std::string& path, const Records& records) {
  const auto services = servicesOf(path);
  platform::SyncDataSource& sources = services->services().syncDataSource;
  const auto name = sources.dataclassNameForSyncType(records.type);
  const auto local = sources.createDataSource(name, std::nullopt, std::nullopt).source;
  const auto counted = sources.countRecords(local);
  return sources.deleteDataSource(local).isSuccess() && counted.status.isSuccess() &&
         static_cast<std::size_t>(counted.count) == count;
}

void addMoves(const std::string& name, const Records& records) {
  addSizeRows(name + "/own", [records](benchmark::State& state, std::size_t count) {
    const Image image(records, count);
    for ([[maybe_unused]] auto iteration : state) {
      state.PauseTiming();
      const std::string path = image.freshCopy();
      state.ResumeTiming();
      const bool isMoved = moveHere(path, records);
      state.PauseTiming();
      if (!isMoved || !areLocal(count, path, records)) return state.SkipWithError("not moved");
      state.ResumeTiming();
    }
  });
  addSizeRows(name + "/sqlite3", [records](benchmark::State& state, std::size_t count) {
    const Image image(records, count);
    for ([[maybe_unused]] auto iteration : state) {
      state.PauseTiming();
      const std::string path =
          image.freshCopy() + "/" + std::string(DeviceImage::databaseFile(records.type));
      state.ResumeTiming();
      const auto moved = moveWithTheLibrary(path, kAccount, records.kind);
      if (static_cast<std::size_t>(moved) != count) return state.SkipWithError("not moved");
    }
  });
}

}  // namespace
}  // namespace bench

int main(int argc, char** argv) {
  using namespace bench;
  return runRows(argc, argv, [] {
    addMoves("move contacts", kContacts);
    addMoves("move events", kEvents);
  });
}
