#include "QuillnetAccountTypeRemoval/ASSBasicAccount.h"

#include <utility>

#include "QuillnetAccountTypeRemoval/Assertions.h"
#include "platform/Services.h"

namespace accountsettings {

using propertylist::Dictionary;
using propertylist::Value;

namespace {

constexpr std::string_view kSourceFile = "ASSBasicAccount";
constexpr const char* kInitWithProperties = "-[ASSBasicAccount initWithProperties:]";

}  // namespace

AccountPtr ASSBasicAccount::init() {
  raiseAssertionFailure(kSourceFile, __LINE__, "Don't use this method");
}

AccountPtr ASSBasicAccount::accountWithTypeClass(const std::optional<std::string>& type,
                                                 const std::optional<std::string>& className) {
  return _initWithTypeClass(type, className);
}

AccountPtr ASSBasicAccount::accountWithProperties(const Dictionary& properties) {
  return initWithProperties(properties);
}

AccountPtr ASSBasicAccount::initWithProperties(const Dictionary& properties) {
  return _recordWithProperties<ASSBasicAccount>(properties);
}

AccountPtr ASSBasicAccount::_initWithTypeClass(const std::optional<std::string>& type,
                                               const std::optional<std::string>& className) {
  initialize();
  if (!className || className->empty())
    raiseAssertionFailure(kSourceFile, __LINE__, "The account class is required.");
  if (!_isValidAccountType(type))
    raiseAssertionFailure(kSourceFile, __LINE__, "The account type (%@) is not supported", type);
  Dictionary properties{{kAccountType, *type}, {kAccountClass, *className}};
  if (const std::optional<std::string> uid = createNewAccountUID()) {
    properties.set(kAccountIdentifier, *uid);
    properties.set(kAccountSyncIdentifier, *uid);
  }
  return initWithProperties(properties);
}

std::optional<ASSBasicAccount::CheckedProperties> ASSBasicAccount::_checkProperties(
    const Dictionary& properties) {
  const Value* type = properties.find(kAccountType);
  const propertylist::Text* typeName = type != nullptr ? type->asString() : nullptr;
  const bool typeIsValid = _isValidAccountType(
      typeName != nullptr ? std::optional<std::string_view>(*typeName) : std::nullopt);
  if (!typeIsValid)
    platform::logToSystem("[%s] Invalid account type: %@", kInitWithProperties, type);
  // A missing class is told also of properties whose type was refused already.
  const propertylist::Text* className = propertylist::findString(properties, kAccountClass);
  const bool classIsPresent = className != nullptr && !className->empty();
  if (!classIsPresent) platform::logToSystem("[%s] Missing account class.", kInitWithProperties);
  if (!typeIsValid || !classIsPresent) return std::nullopt;
  return CheckedProperties(properties);
}

ASSBasicAccount::ASSBasicAccount(const CheckedProperties& checked)
    : originalProperties_(checked.dictionary), properties_(checked.dictionary) {
  if (properties_.contains(kAccountIdentifier)) return;
  const std::optional<std::string> uid = createNewAccountUID();
  if (!uid) return;
  properties_.set(kAccountIdentifier, *uid);
  if (!properties_.contains(kAccountSyncIdentifier)) properties_.set(kAccountSyncIdentifier, *uid);
}

ASSBasicAccount::~ASSBasicAccount() {
  parentAccount_ = nullptr;
  originalProperties_ = Dictionary();
  properties_ = Dictionary();
  fullAccount_ = nullptr;
  syncAccount_ = nullptr;
}

std::optional<std::string> ASSBasicAccount::createNewAccountUID() {
  return platform::services().uuidGenerator.generateUUID();
}

const Value* ASSBasicAccount::accountPropertyForKey(std::string_view key) const {
  if (const Value* value = properties_.find(key)) return value;
  return parentAccount_ ? parentAccount_->accountPropertyForKey(key) : nullptr;
}

void ASSBasicAccount::setAccountPropertyForKey(const std::optional<Value>& value,
                                               std::string_view key) {
  if (key == kAccountClass || key == kAccountType) return;
  _forcedSetAccountPropertyForKey(value, key);
}

void ASSBasicAccount::_forcedSetAccountPropertyForKey(const std::optional<Value>& value,
                                                      std::string_view key) {
  if (value)
    properties_.set(key, *value);
  else
    properties_.remove(key);
}

void ASSBasicAccount::removeAccountPropertyForKey(std::string_view key) { properties_.remove(key); }

void ASSBasicAccount::setOriginalProperties(Dictionary properties) noexcept {
  originalProperties_ = std::move(properties);
}

std::optional<propertylist::Text> ASSBasicAccount::_textForKey(std::string_view key) const {
  const Value* value = accountPropertyForKey(key);
  const propertylist::Text* string = value != nullptr ? value->asString() : nullptr;
  return string != nullptr ? std::optional(*string) : std::nullopt;
}

std::optional<propertylist::Text> ASSBasicAccount::type() const {
  return _textForKey(kAccountType);
}

std::optional<propertylist::Text> ASSBasicAccount::identifier() const {
  return _textForKey(kAccountIdentifier);
}

std::optional<propertylist::Text> ASSBasicAccount::syncStoreIdentifier() const {
  return _textForKey(kAccountSyncIdentifier);
}

std::optional<propertylist::Text> ASSBasicAccount::accountClass() const {
  return _textForKey(kAccountClass);
}

std::optional<std::string> ASSBasicAccount::displayName() const {
  return _textForKey(kAccountDisplayName);
}

std::optional<std::string> ASSBasicAccount::typeString() const {
  return _textForKey(kAccountTypeString);
}

std::optional<std::string> ASSBasicAccount::shortTypeString() const {
  return _textForKey(kAccountShortTypeString);
}

void ASSBasicAccount::setAccountClass(const std::string& className) {
  if (accountClass() != className) _forcedSetAccountPropertyForKey(className, kAccountClass);
}

void ASSBasicAccount::setDisplayName(const std::string& name) {
  const propertylist::Text* current = propertylist::findString(properties_, kAccountDisplayName);
  if (current == nullptr || *current != name) properties_.set(kAccountDisplayName, name);
}

std::optional<propertylist::Text> ASSBasicAccount::parentAccountIdentifier() const {
  return parentAccount_ ? parentAccount_->identifier() : std::nullopt;
}

std::string ASSBasicAccount::description() const {
  return "<" + className() + ": " + std::string(identifier().value_or("(null)")) + ">";
}

bool isOfOneType(const ASSBasicAccount& account, const StringList& types) {
  const std::optional<propertylist::Text> type = account.type();
  return type && contains(types, *type);
}

}  // namespace accountsettings
