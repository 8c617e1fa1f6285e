#pragma once

#include <string>
#include <vector>

#include "propertylist/Value.h"

namespace tools {

// Something in a settings file that is not as it should be.
struct Oddity {
  std::string place;         // "Accounts[3].ChildAccounts[0]"; empty for the file as a whole
  std::string identifier;    // of the account, when it has one
  std::string key;           // the property, when it is about one
  std::string text;          // what is odd, to be read behind the place
  bool savingLoses = false;  // the library's next save leaves something out or mixes it up
};

// Every oddity of the settings file's root, in the order of the file. The library judges which
// entries make accounts; its services are installed (AccountStore.h), and its log lines go there.
std::vector<Oddity> findOddities(const propertylist::Dictionary& root);

}  // namespace tools
