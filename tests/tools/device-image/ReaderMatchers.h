#pragma once

#include <gmock/gmock.h>

#include <ostream>

#include "tools/device-image/import/TextRecord.h"

namespace tools {

inline std::ostream& operator<<(std::ostream& stream, const Problem& problem) {
  return stream << "line " << problem.line << ": " << problem.what << "; " << problem.remedy;
}

// A problem on that line whose description is `what`.
MATCHER_P2(ProblemAt, line, what, "") { return arg.line == std::size_t(line) && arg.what == what; }

}  // namespace tools
