#pragma once

#include <optional>
#include <string_view>

#include "propertylist/Value.h"

// What the sample services hear goes to journals of the device image that the installed platform
// services stand for. A note that cannot be written becomes a line of the system log. Any thread.
namespace accountservices {

// What one refresh was asked for, and what was answered.
struct Refresh {
  std::string_view service;
  std::string_view account;
  std::string_view request;                   // "container", "container list" or "containers"
  std::optional<std::string_view> container;  // of a "container" request
  std::string_view dataclass;
  bool isUserRequested = false;
  bool answer = false;
};

// One line for each change record (QuillnetAccountTypeRemoval/AccountChanges.h), numbered within
// the call.
void journalChanges(std::string_view notifier, const propertylist::Array& changes);
// `change` is "will change" or "did change".
void journalDataclassChange(std::string_view notifier, std::string_view change,
                            std::string_view account, std::string_view dataclass);
void journalRefresh(const Refresh& refresh);

}  // namespace accountservices
