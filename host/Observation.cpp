#include "host/Observation.h"

#include <algorithm>
#include <string_view>

namespace host {
namespace {

unsigned valueOfDigit(char digit) {
  return static_cast<unsigned>(digit <= '9' ? digit - '0' : digit - 'a' + 10);
}

// Half the memory of the text, and there may be very many records.
std::string bytesOfHexadecimal(std::string_view text) {
  std::string bytes;
  bytes.reserve(text.size() / 2);
  for (std::size_t index = 0; index + 1 < text.size(); index += 2)
    bytes.push_back(
        static_cast<char>(valueOfDigit(text[index]) << 4U | valueOfDigit(text[index + 1])));
  return bytes;
}

bool isUnreadable(deviceimage::Dataclass dataclass,
                  const std::vector<UnusableDatabase>& leftAlone) {
  const auto path = deviceimage::DeviceImage::databaseFile(deviceimage::syncTypeOf(dataclass));
  return std::any_of(leftAlone.begin(), leftAlone.end(), [&](const UnusableDatabase& database) {
    return database.path == path && !database.isReadable;
  });
}

std::string failureText(const platform::Status& status) {
  return status.error ? status.error->description : "error " + std::to_string(status.code);
}

}  // namespace

Observation observe(const deviceimage::DeviceImage& image, deviceimage::RecordStores& stores,
                    const std::vector<UnusableDatabase>& leftAlone) {
  Observation observation;
  observation.settings = readSettings(image);
  for (const deviceimage::Dataclass dataclass : deviceimage::kDataclasses) {
    if (isUnreadable(dataclass, leftAlone)) {
      observation.unseen.insert(dataclass);
      continue;
    }
    const auto listed = stores.listStores(dataclass);
    if (!listed.status.isSuccess()) {
      observation.error = failureText(listed.status);
      return observation;
    }
    for (const deviceimage::Store& store : listed.stores) {
      ObservedStore observed{dataclass, store.account, store.retired, {}};
      const platform::Status visited = stores.visitRecords(
          dataclass, store.row, false,
          [&observed](const deviceimage::Record& record, std::string_view /*content*/) {
            observed.records.push_back({record.uid, bytesOfHexadecimal(record.contentHash),
                                        record.conflictCopyOf.value_or("")});
            return true;
          });
      if (!visited.isSuccess()) {
        observation.error = failureText(visited);
        return observation;
      }
      observation.stores.push_back(std::move(observed));
    }
  }
  return observation;
}

}  // namespace host
