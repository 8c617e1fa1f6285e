// A notifier bundle: hears of changed accounts, and writes what it hears to the system log.

#include "QuillnetAccountTypeRemoval/AccountCreatorClasses.h"
#include "platform/SystemLog.h"

namespace {

class SampleNotifier : public platform::RuntimeClass,
                       public accountsettings::AccountChangesNotifier {
 public:
  SampleNotifier() { platform::registerClass(*this); }
  std::string className() const override { return "SampleNotifier"; }
  void noteAccountChanges(const propertylist::Array& changes) override {
    for (const propertylist::Value& change : changes)
      platform::logToSystem("SampleNotifier heard of %@", change);
  }
};

// Made, and thereby registered, while the bundle is loaded; never destroyed, because the registry
// answers it until the process is gone.
SampleNotifier& notifier = *new SampleNotifier;

}  // namespace
