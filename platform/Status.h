#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <utility>

namespace platform {

// What went wrong, for the system log. No code may depend on the wording.
struct Error {
  std::string description;
};

// How one call of a platform service ended: a code, 0 for success and anything else of the
// service's own choice, and maybe an error object. The two are independent, because services hand
// back an error with a success now and then, and a failure without one; callers say which of the
// two they look at.
struct [[nodiscard]] Status {
  int code = 0;
  std::optional<Error> error;

  static Status success() { return {}; }
  // `code` is not 0.
  static Status failure(int code, std::string description) {
    return {code, Error{std::move(description)}};
  }
  bool isSuccess() const { return code == 0; }
  // Drops the outcome on purpose; `reason` tells the reader why.
  void ignore([[maybe_unused]] std::string_view reason) const {}
};

}  // namespace platform
