#include "platform/InternalConsistencyFailure.h"

#include <utility>

namespace platform {

InternalConsistencyFailure::InternalConsistencyFailure(const std::string& message,
                                                       std::string sourceFile, int line)
    : std::runtime_error(message), _sourceFile(std::move(sourceFile)), _line(line) {}

InternalConsistencyFailure::~InternalConsistencyFailure() = default;

}  // namespace platform
