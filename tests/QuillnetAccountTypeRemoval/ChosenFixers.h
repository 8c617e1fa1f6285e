#pragma once

#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {

// A fixer that answers as a test says and notes what it is asked, as "name: loading accounts 1" or
// "name: saved".
class ChosenFixer : public ASSRuntimeFixMailAccount {
 public:
  using Choice = std::function<FixVerdict(const AccountPtr&)>;
  ChosenFixer(std::string name, Lines& notes, Choice choice)
      : _name(std::move(name)), _notes(notes), _choice(std::move(choice)) {}

  FixVerdict fixBasicAccountIfNeededLoggingMessage(const AccountPtr& account,
                                                   std::string_view message) override {
    _notes.push_back(_name + ": " + std::string(message) + " " +
                     std::string(account->identifier().value_or("(null)")));
    return _choice(account);
  }
  void accountsHaveBeenSaved(bool saved) override {
    _notes.push_back(_name + (saved ? ": saved" : ": not saved"));
  }

 private:
  std::string _name;
  Lines& _notes;
  Choice _choice;
};

// A store with the fixers that a test gives it. It is empty until it is loaded.
class StoreWithFixers : public OpenStore {
 public:
  explicit StoreWithFixers(std::vector<RuntimeFixerPtr> fixers) : _fixers(std::move(fixers)) {}
  void load(const Array& accounts) { _initWithAccountsInfo(accounts); }
  void loadFile() { _initFromSettingsFile(); }

 protected:
  std::vector<RuntimeFixerPtr> _createRuntimeFixers() override { return _fixers; }

 private:
  std::vector<RuntimeFixerPtr> _fixers;
};

}  // namespace accountsettings
