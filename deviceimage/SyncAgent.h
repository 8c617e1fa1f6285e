#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "deviceimage/Dataclass.h"
#include "deviceimage/DeviceImage.h"
#include "propertylist/Value.h"

namespace deviceimage {

// How the platform's sync agents name the stores of service accounts.
//
// The Quillnet agent serves one account name, which it keeps as the string "AccountName" in its own
// preferences; its stores are "Quillnet:" and that name, whichever Quillnet account asks. Its
// calendars (events, not reminders) lie under the identifier of the account's child with the class
// "MobileCalDAVAccount", when it has one. Every other account's stores go by its "Sync Identifier",
// else by its "Identifier"; an empty text counts as none.
class SyncAgent {
 public:
  static constexpr std::string_view kApplication = "com.vantor.OTASyncAgent";
  static constexpr std::string_view kAccountNameKey = "AccountName";
  static constexpr std::string_view kQuillnetStorePrefix = "Quillnet:";

  // Reads the agent's preferences anew. What cannot be read counts as absent.
  explicit SyncAgent(const DeviceImage& image);
  explicit SyncAgent(std::optional<std::string> accountName);

  // The Quillnet agent's account name; empty when it has none that is a string.
  const std::optional<std::string>& accountName() const { return _accountName; }

  // The Quillnet agent's own store: "Quillnet:" and the account name; empty without a name.
  const std::optional<std::string>& quillnetStoreIdentifier() const { return _quillnetStore; }

  // The store that holds the dataclass's records of the top-level account with these properties
  // (one entry of the settings file's "Accounts"). Empty when the account has no identifier, or is
  // a Quillnet account and the agent has no name. Among several calendar children the one with the
  // smallest identifier counts. A text of the account or of this agent.
  std::optional<std::string_view> storeIdentifier(const propertylist::Dictionary& account,
                                                  Dataclass dataclass) const;

  // Whether accounts of this type belong to the Quillnet service ("Quillnet", "VantorAccount").
  static bool isQuillnetType(std::string_view accountType);

 private:
  std::optional<std::string> _accountName;
  std::optional<std::string> _quillnetStore;
};

}  // namespace deviceimage
