#pragma once

#include <map>
#include <string>

#include "platform/UserDatabase.h"
#include "platform/testing/FakeService.h"

namespace platform {

// Users and groups as a test fills them.
class InMemoryUserDatabase : public UserDatabase, public FakeService {
 public:
  std::map<std::string, uid_t, std::less<>> users;
  std::map<std::string, gid_t, std::less<>> groups;
  std::string home = "/var/mobile";

  std::optional<uid_t> userIdentifierForName(std::string_view name) override {
    if (_fails("userIdentifierForName", {name})) return std::nullopt;
    const auto found = users.find(name);
    if (found == users.end()) return std::nullopt;
    return found->second;
  }
  std::optional<gid_t> groupIdentifierForName(std::string_view name) override {
    if (_fails("groupIdentifierForName", {name})) return std::nullopt;
    const auto found = groups.find(name);
    if (found == groups.end()) return std::nullopt;
    return found->second;
  }
  std::string homeDirectory() override {
    _received("homeDirectory", {});
    return home;
  }
};

}  // namespace platform
