// A bundle with notifiers that do not return from what they are told.

#include <csignal>
#include <cstdlib>
#include <functional>
#include <string>
#include <utility>

#include "QuillnetAccountTypeRemoval/AccountCreatorClasses.h"
#include "platform/InternalConsistencyFailure.h"

namespace {

class FaultyNotifier : public platform::RuntimeClass,
                       public accountsettings::AccountChangesNotifier {
 public:
  FaultyNotifier(std::string name, std::function<void()> fault)
      : _name(std::move(name)), _fault(std::move(fault)) {
    platform::registerClass(*this);
  }
  std::string className() const override { return _name; }
  void noteAccountChanges(const propertylist::Array&) override { _fault(); }

 private:
  std::string _name;
  std::function<void()> _fault;
};

FaultyNotifier raising("RaisingNotifier", [] {
  throw platform::InternalConsistencyFailure("the notifier is broken", "FaultyNotifiers", 7);
});
FaultyNotifier aborting("AbortingNotifier", [] { std::abort(); });
FaultyNotifier killed("KilledNotifier", [] { std::raise(SIGKILL); });

}  // namespace
