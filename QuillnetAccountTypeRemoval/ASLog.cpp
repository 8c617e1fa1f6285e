#include "QuillnetAccountTypeRemoval/ASLog.h"

#include <atomic>
#include <optional>

#include "QuillnetAccountTypeRemoval/PropertyNumbers.h"
#include "platform/Services.h"

namespace accountsettings {
namespace {

// Two threads that come first at once may both read the preference; both store the same answer.
std::atomic<bool> loggingSwitchRead = false;
std::atomic<bool> loggingEnabled = false;

}  // namespace

bool getASLoggingEnabled() {
  if (loggingSwitchRead.load(std::memory_order_acquire)) return loggingEnabled.load();
  const std::optional<propertylist::Value> value =
      platform::services().preferences.readDefault("ASLoggingEnabled");
  const bool enabled = booleanValue(value ? &*value : nullptr);
  loggingEnabled.store(enabled);
  loggingSwitchRead.store(true, std::memory_order_release);
  return enabled;
}

}  // namespace accountsettings
