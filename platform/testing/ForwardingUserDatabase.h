#pragma once

#include "platform/UserDatabase.h"

namespace platform {

// Hands every operation on to `next`, which outlives it. A test overrides the one it is about.
class ForwardingUserDatabase : public UserDatabase {
 public:
  explicit ForwardingUserDatabase(UserDatabase& next) : _next(next) {}

  std::optional<uid_t> userIdentifierForName(std::string_view name) override {
    return _next.userIdentifierForName(name);
  }
  std::optional<gid_t> groupIdentifierForName(std::string_view name) override {
    return _next.groupIdentifierForName(name);
  }
  std::string homeDirectory() override { return _next.homeDirectory(); }

 private:
  UserDatabase& _next;
};

}  // namespace platform
