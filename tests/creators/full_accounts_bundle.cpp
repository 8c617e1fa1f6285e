// A bundle with one creator of full accounts of each form.

#include "tests/creators/Diary.h"

namespace accountsettings {
namespace {

class FullAccount : public AccountFullAccountProtocol, public Origin {
 public:
  explicit FullAccount(std::string origin) : _origin(std::move(origin)) {}
  void setParentAccount(const AccountPtr& parent) override {
    diary().noteAccount("setParentAccount", parent);
  }
  std::string origin() const override { return _origin; }

 private:
  std::string _origin;
};

class NamedClass : public platform::RuntimeClass, public FullAccountClass {
 public:
  NamedClass() { platform::registerClass(*this); }
  std::string className() const override { return "NamedClass"; }
  FullAccountPtr initWithProperties(const propertylist::Dictionary& properties) override {
    const propertylist::Text* identifier = propertylist::findString(properties, "Identifier");
    diary().note("initWithProperties(" + std::string(identifier != nullptr ? *identifier : "none") +
                 ")");
    if (diary().creationFails()) return nullptr;
    return std::make_shared<FullAccount>("by the class");
  }
};

NamedClass namedClass;

class NamingCreator : public platform::RuntimeClass, public FullAccountClassCreator {
 public:
  NamingCreator() { platform::registerClass(*this); }
  std::string className() const override { return "NamingCreator"; }
  platform::RuntimeClass* classForAccountType(std::string_view type) override {
    diary().note("classForAccountType(" + std::string(type) + ")");
    return &namedClass;
  }
};

class MakingCreator : public platform::RuntimeClass, public FullAccountCreator {
 public:
  MakingCreator() { platform::registerClass(*this); }
  std::string className() const override { return "MakingCreator"; }
  FullAccountPtr accountWithBasicAccount(const AccountPtr& account) override {
    diary().noteAccount("accountWithBasicAccount", account);
    if (diary().creationFails()) return nullptr;
    return std::make_shared<FullAccount>("by the creator");
  }
};

// Offers both ways; the first one names no class for mail accounts.
class BothWaysCreator : public platform::RuntimeClass,
                        public FullAccountClassCreator,
                        public FullAccountCreator {
 public:
  BothWaysCreator() { platform::registerClass(*this); }
  std::string className() const override { return "BothWaysCreator"; }
  platform::RuntimeClass* classForAccountType(std::string_view type) override {
    return type == "Mail" ? nullptr : &namedClass;
  }
  FullAccountPtr accountWithBasicAccount(const AccountPtr&) override {
    diary().note("the second way was asked");
    return std::make_shared<FullAccount>("by the creator");
  }
};

class NoCreator : public platform::RuntimeClass {
 public:
  NoCreator() { platform::registerClass(*this); }
  std::string className() const override { return "NoCreator"; }
};

NamingCreator namingCreator;
MakingCreator makingCreator;
BothWaysCreator bothWaysCreator;
NoCreator noCreator;

}  // namespace
}  // namespace accountsettings
