#include "tools/device-image/RetiredStores.h"

#include <fmt/format.h>

#include <algorithm>

#include "tools/common/ExitCode.h"
#include "tools/device-image/Records.h"

namespace tools {

using deviceimage::Store;

std::vector<Store> retiredStores(deviceimage::RecordStores& records,
                                 deviceimage::Dataclass dataclass,
                                 std::optional<deviceimage::Row> number) {
  deviceimage::RecordStores::Stores listed = records.listStores(dataclass);
  requireSuccess(listed.status, "nothing was done");
  std::erase_if(listed.stores, [&](const Store& store) {
    return !store.retired || (number && store.row != *number);
  });
  if (number && listed.stores.empty())
    throw CommandFailure(
        ExitCode::refused,
        fmt::format(
            "there is no retired {} store with the number {}; `device-image show` lists them",
            deviceimage::dataclassName(dataclass), *number));
  std::sort(listed.stores.begin(), listed.stores.end(), [](const Store& a, const Store& b) {
    return std::pair(a.retiredAt, a.row) < std::pair(b.retiredAt, b.row);
  });
  return std::move(listed.stores);
}

}  // namespace tools
