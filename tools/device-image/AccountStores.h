#pragma once

#include <optional>
#include <string>

#include "deviceimage/Dataclass.h"
#include "deviceimage/DeviceImage.h"
#include "deviceimage/RecordStores.h"

namespace tools {

// A store that the user chose: the device-local one, or an account's.
struct ChosenStore {
  std::optional<std::string> storeIdentifier;  // empty: the device-local store
  std::string description;                     // for messages
};

// The store of the account with that identifier in the settings file, named as the sync agents name
// it; without an account the device-local one. Ends the command when there is no such account, or
// when its store has no name.
ChosenStore chooseStore(const deviceimage::DeviceImage& image, deviceimage::Dataclass dataclass,
                        const std::string& account);

// What `--account` and `store` of the reports call a store: "local", or the identifier of the
// account that it serves. A store whose account is gone goes by its own identifier.
class StoreNames {
 public:
  explicit StoreNames(const deviceimage::DeviceImage& image);
  ~StoreNames();
  std::string nameOf(const deviceimage::Store& store) const;

 private:
  class Accounts;
  std::unique_ptr<Accounts> _accounts;
};

}  // namespace tools
