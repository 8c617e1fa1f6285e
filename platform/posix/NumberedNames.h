#pragma once

#include <charconv>
#include <optional>
#include <string_view>
#include <system_error>

namespace platform {

// The number with which `name` goes on after `prefix`, as std::to_string writes it; empty for any
// other name, and for the number 0, which no side copy has.
inline std::optional<unsigned> numberAfter(std::string_view prefix, std::string_view name) {
  if (!name.starts_with(prefix)) return std::nullopt;
  name.remove_prefix(prefix.size());
  unsigned number = 0;
  const char* const end = name.data() + name.size();
  const auto [stop, error] = std::from_chars(name.data(), end, number);
  const bool isPlain = error == std::errc() && stop == end && !name.starts_with('0');
  return isPlain ? std::optional(number) : std::nullopt;
}

}  // namespace platform
