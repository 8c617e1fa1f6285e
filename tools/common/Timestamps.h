#pragma once

#include <cstdint>
#include <optional>
#include <string_view>

namespace tools {

// The instant of an ISO 8601 date, in the basic or the extended form: "20261121",
// "20261121T024000Z", "2026-11-21T02:40:00.5+01:00". Seconds since 1970; a time without a zone
// counts as UTC, a date as its first second. Empty when the text is no such date.
std::optional<std::int64_t> secondsOfISODate(std::string_view text);

// The instant of a date in a message header: "Sat, 21 Nov 2026 02:40:00 +0100".
std::optional<std::int64_t> secondsOfMessageDate(std::string_view text);

}  // namespace tools
