#pragma once

#include <string>

#include "QuillnetAccountTypeRemoval/AccountCreatorClasses.h"
#include "platform/ClassRegistry.h"

// What the test's bundles know of the test: a registered class object in which they note each call
// they get, and which says whether they are to fail.
namespace accountsettings {

class PLATFORM_EXPORT Diary : public platform::RuntimeClass {
 public:
  std::string className() const override { return "Diary"; }
  virtual void note(const std::string& line) = 0;
  // As "what(identifier of the account)"; "none" for no account.
  virtual void noteAccount(const std::string& what, const AccountPtr& account) = 0;
  virtual void noteChanges(const std::string& notifier, const propertylist::Array& changes) = 0;
  // True while creators are to answer null.
  virtual bool creationFails() const = 0;
};

inline Diary& diary() { return dynamic_cast<Diary&>(*platform::registeredClass("Diary")); }

// A full account of the test's bundles tells which way it was made.
class PLATFORM_EXPORT Origin {
 public:
  virtual ~Origin() = default;
  virtual std::string origin() const = 0;
};

}  // namespace accountsettings
