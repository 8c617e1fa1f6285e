#include "platform/Services.h"

#include <optional>

#include "platform/InternalConsistencyFailure.h"

namespace platform {
namespace {

std::optional<Services> installedServices;

}  // namespace

void install(const Services& services) { installedServices.emplace(services); }

const Services& services() {
  if (!installedServices)
    throw InternalConsistencyFailure("No platform services are installed", "Services", __LINE__);
  return *installedServices;
}

}  // namespace platform
