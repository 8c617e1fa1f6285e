#pragma once

#include <string>
#include <vector>

#include "propertylist/Value.h"

namespace tools {

// Something in a settings file that is not as it should be.
struct Oddity {
  std::string place;       // "Accounts[3].ChildAccounts[0]"; empty for the file as a whole
  std::string identifier;  // of the account, when it has one
  std::string key;         // the property, when it is about one
  std::string text;        // what is odd, to be read behind the place
  // What the library makes of it: it works as it stands; the library passes the entry over, or
  // cannot tell it from another; a save leaves the entry out, or mixes it up with another.
  enum class Effect { none, passedOver, lost };
  Effect effect = Effect::none;
};

// "Accounts[3] (Q1): Type: "Nope" is unknown; ...".
std::string describe(const Oddity& oddity);

// Every oddity of the settings file's root, in the order of the file. The library judges which
// entries make accounts; its services are installed (AccountStore.h), and its log lines go there.
std::vector<Oddity> findOddities(const propertylist::Dictionary& root);

}  // namespace tools
