// A bundle with a notifier of each kind.

#include "tests/creators/Diary.h"

namespace accountsettings {
namespace {

// Hears of changes only.
class ChangesNotifier : public platform::RuntimeClass, public AccountChangesNotifier {
 public:
  explicit ChangesNotifier(std::string name) : _name(std::move(name)) {
    platform::registerClass(*this);
  }
  std::string className() const override { return _name; }
  void noteAccountChanges(const propertylist::Array& changes) override {
    diary().noteChanges(_name, changes);
  }

 private:
  std::string _name;
};

// Hears of everything.
class FullNotifier : public ChangesNotifier,
                     public AccountWillChangeNotifier,
                     public AccountDidChangeNotifier {
 public:
  FullNotifier() : ChangesNotifier("FullNotifier") {}
  void accountWillChangeForDataclass(const std::string& accountIdentifier,
                                     std::string_view dataclass) override {
    diary().note("willChange(" + accountIdentifier + ", " + std::string(dataclass) + ")");
  }
  void accountDidChangeForDataclass(const std::string& accountIdentifier,
                                    std::string_view dataclass) override {
    diary().note("didChange(" + accountIdentifier + ", " + std::string(dataclass) + ")");
  }
};

class DeafClass : public platform::RuntimeClass {
 public:
  DeafClass() { platform::registerClass(*this); }
  std::string className() const override { return "DeafClass"; }
};

ChangesNotifier changesNotifier("ChangesNotifier");
ChangesNotifier otherNotifier("OtherNotifier");
FullNotifier fullNotifier;
DeafClass deafClass;

}  // namespace
}  // namespace accountsettings
