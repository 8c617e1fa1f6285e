#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "QuillnetAccountTypeRemoval/AccountConstants.h"
#include "QuillnetAccountTypeRemoval/AccountCreatorClasses.h"
#include "QuillnetAccountTypeRemoval/StringLists.h"
#include "platform/LogFormat.h"
#include "propertylist/Value.h"

namespace accountsettings {

// The record of one account: its properties, the properties it was made from (the base of the
// three-way merge at a save), the link to its parent, and its companions, the full and sync
// account. What its type can do comes from the catalogues, two resources that are read once per
// process. "Per process" is by this copy of the library, here and below: a program and each plug-in
// in its process that holds the library read their own catalogues.
//
// Records are shared by reference and compared by identity; two records with equal properties are
// two accounts. A child holds its parent. A record is used from one thread at a time; the class
// operations may be called from any thread.
class ASSBasicAccount : public platform::Describable,
                        public std::enable_shared_from_this<ASSBasicAccount> {
 public:
  // Properties that were found fit to make a record from.
  class CheckedProperties {
    friend class ASSBasicAccount;
    explicit CheckedProperties(const propertylist::Dictionary& properties)
        : dictionary(properties) {}
    propertylist::Dictionary dictionary;
  };

  // For the static operations below, which alone can check properties.
  explicit ASSBasicAccount(const CheckedProperties& checked);
  // Releases the parent, the original properties, the properties, the full account and the sync
  // account, in this order: companions may look at nothing of a record that is going away.
  ~ASSBasicAccount() override;
  ASSBasicAccount(const ASSBasicAccount&) = delete;
  ASSBasicAccount& operator=(const ASSBasicAccount&) = delete;

  // --- Making records ---

  // A new account of a type and class, with one new UID as identifier and sync identifier. An
  // InternalConsistencyFailure for an empty class or a type that the catalogue lacks.
  static AccountPtr accountWithTypeClass(const std::optional<std::string>& type,
                                         const std::optional<std::string>& className);
  static AccountPtr accountWithProperties(const propertylist::Dictionary& properties);
  // A record with a copy of `properties`; null, with a log line for each reason, when their type is
  // not in the catalogue or their class is missing or empty. Properties without an identifier get a
  // new UID as identifier, and as sync identifier when that is missing too; originalProperties
  // stays as given, so that the next save sees the UID as new. A sync identifier is never added to
  // an identifier.
  static AccountPtr initWithProperties(const propertylist::Dictionary& properties);
  // Forbidden: always an InternalConsistencyFailure.
  static AccountPtr init();
  // A new UUID as text; empty when the platform can make none.
  static std::optional<std::string> createNewAccountUID();

  // --- Properties ---

  // The record's own value, else its parent's, and so on up; null when nobody has one. Valid until
  // one of these records changes.
  const propertylist::Value* accountPropertyForKey(std::string_view key) const;
  // Stores the value, or removes the key when there is no value. Does nothing at all for "Type" and
  // "Class".
  void setAccountPropertyForKey(const std::optional<propertylist::Value>& value,
                                std::string_view key);
  // Removes the key from the record's own properties, "Type" and "Class" included.
  void removeAccountPropertyForKey(std::string_view key);
  // The record's own properties, live: a change through the reference is a change of the record.
  propertylist::Dictionary& properties() { return properties_; }
  const propertylist::Dictionary& properties() const { return properties_; }
  // What a save writes for this record. A subclass may narrow it.
  virtual const propertylist::Dictionary& propertiesToSave() const { return properties_; }
  // The properties that the record was made from or last saved with.
  const propertylist::Dictionary& originalProperties() const { return originalProperties_; }
  void setOriginalProperties(propertylist::Dictionary properties) noexcept;

  // Strings of the record or, where it has none, of its parent. A value that is no string counts as
  // none. A Text belongs to the record that has it, until that one changes or goes: whoever goes on
  // to change accounts takes it as a std::string.
  std::optional<propertylist::Text> type() const;
  virtual std::optional<propertylist::Text> identifier() const;
  virtual std::optional<propertylist::Text> syncStoreIdentifier() const;
  std::optional<propertylist::Text> accountClass() const;
  virtual std::optional<std::string> displayName() const;
  std::optional<std::string> typeString() const;
  std::optional<std::string> shortTypeString() const;

  // Writes the class, past the guard of setAccountPropertyForKey, unless it is the record's class
  // already, own or inherited.
  void setAccountClass(const std::string& className);
  // Writes the name unless the record's own name equals it; a parent's name is not looked at.
  void setDisplayName(const std::string& name);

  const AccountPtr& parentAccount() const { return parentAccount_; }
  virtual void setParentAccount(const AccountPtr& parent) { parentAccount_ = parent; }
  std::optional<propertylist::Text> parentAccountIdentifier() const;

  // The name of the record's own class, as log lines print it; not the property "Class".
  virtual std::string className() const { return "ASSBasicAccount"; }
  // Class name and identifier, and nothing private.
  std::string description() const override;

  // --- The catalogue of account types and dataclasses ---

  // Loads the catalogue of account types, once per process. Every initialiser and every class
  // operation but init, createNewAccountUID, isMultitaskingEnabled and allSupportedDataclasses does
  // so first. An InternalConsistencyFailure when the resource is missing or unreadable; the next
  // call tries again.
  static void initialize();
  // Whether the device runs several applications at once; without it there are no notes to sync.
  static bool isMultitaskingEnabled();
  // The fourteen dataclasses in the order in which they are listed everywhere.
  static const StringList& allSupportedDataclasses();
  // What the type supports, in the order of the resource; empty for an unknown type.
  static std::optional<StringList> supportedDataclassesForAccountType(std::string_view type);
  // What a user may choose when a dataclass of the type is turned on or off; one list serves every
  // dataclass of the type. For a dataclass with one store only, without the last "Keep Local Data".
  static std::optional<StringList> userActionsToEnableDataclassForAccountType(
      std::string_view dataclass, std::string_view type);
  static std::optional<StringList> userActionsToDisableDataclassForAccountType(
      std::string_view dataclass, std::string_view type);
  // A copy without the last "Keep Local Data"; earlier ones stay.
  static StringList removeActionsIncompatibleWithSingleStoreDataclass(const StringList& actions);
  static std::optional<StringList> deleteAccountActionsForAccountType(std::string_view type);
  static bool showRemindersSeparatelyForAccountType(std::string_view type);
  // Flags of a dataclass; all false when the resource is missing, and nothing is said about that.
  static bool multipleStoresSupportedByDataclass(std::string_view dataclass);
  static bool displayToggleForDataclass(std::string_view dataclass);
  static bool userConfirmationIsRequiredByDataclass(std::string_view dataclass);

  // --- Dataclasses of this account, each list in the order of allSupportedDataclasses ---

  // What the account's type supports.
  StringList supportedDataclasses() const;
  // What the service granted (everything supported when it said nothing), within what is supported
  // and no configuration profile forbids.
  StringList provisionedDataclasses() const;
  // What the user turned on, within provisionedDataclasses; empty when nothing was ever stored,
  // which is not the same as an empty list. A child whose parent has dataclasses enabled answers
  // the parent's list, whatever it stores itself.
  std::optional<StringList> enabledDataclasses() const;
  bool isEnabledForDataclass(std::string_view dataclass) const;
  // Stores the dataclass as turned on or off in the record's own list, an inherited list aside.
  // Does nothing for a dataclass that the type does not support; what the service granted and
  // profiles forbid is not looked at.
  virtual void setEnabledForDataclass(bool enabled, std::string_view dataclass);
  // Forgets the record's own list and turns on each given dataclass. With nothing to turn on the
  // record is left without a list, as if nothing had ever been stored.
  void setEnabledForDataclasses(const StringList& dataclasses);

  // --- Full and sync account ---
  //
  // Which class makes them for a type stands in the catalogue of account creators, a resource that
  // is read once per process; the bundles that define the classes are loaded when they are first
  // needed and stay loaded. A creation that failed is tried again at the next call.

  // The full account, made at the first call and then kept. Asks the creator class for the class to
  // instantiate when it can tell one, else for the account. An InternalConsistencyFailure when the
  // catalogue is malformed, a bundle does not load, the class is not there or no account comes
  // back.
  //   loader  null, or one that is asked first whether it has loaded the code itself
  FullAccountPtr fullAccountUsingLoader(FullAccountLoader* loader);
  // Holds `account` as the full account from here on.
  void setFullAccount(const FullAccountPtr& account);
  // The name of the class that creates full (sync) accounts of the type; empty when nobody does.
  // Loads the bundle of every entry that matches; the last one's class counts. Malformed entries
  // are an InternalConsistencyFailure, and so is a type without any entry. A missing type is looked
  // up as the empty one.
  std::optional<std::string> fullAccountCreatorClassNameForAccountTypeLoader(
      const std::optional<std::string>& type, FullAccountLoader* loader) const;
  std::optional<std::string> syncAccountCreatorClassNameForAccountType(
      const std::optional<std::string>& type) const;
  // Have the sync account refresh one container, the list of containers, or all containers of a
  // dataclass; what it answers, and false without one. The short forms pass false to the long ones
  // of the same record.
  virtual bool refreshContainerWithIdentifierForDataclassIsUserRequested(
      std::string_view containerIdentifier, std::string_view dataclass, bool isUserRequested);
  virtual bool refreshContainerListForDataclassIsUserRequested(std::string_view dataclass,
                                                               bool isUserRequested);
  virtual bool refreshContainersForDataclassIsUserRequested(std::string_view dataclass,
                                                            bool isUserRequested);
  bool refreshContainerWithIdentifierForDataclass(std::string_view containerIdentifier,
                                                  std::string_view dataclass);
  bool refreshContainerListForDataclass(std::string_view dataclass);
  bool refreshContainersForDataclass(std::string_view dataclass);
  // Renews nothing, and tells the handler so, with 3, before it returns.
  void renewAccountCredentialsWithHandler(const std::function<void(int)>& handler);

 protected:
  friend class ASSAccountsManager;  // reads the catalogue of creators for its notifiers

  // Makes a record of a subclass as initWithProperties does.
  template <typename Account>
  static std::shared_ptr<Account> _recordWithProperties(
      const propertylist::Dictionary& properties) {
    const std::optional<CheckedProperties> checked = _checkProperties(properties);
    return checked ? std::make_shared<Account>(*checked) : nullptr;
  }
  static std::optional<CheckedProperties> _checkProperties(
      const propertylist::Dictionary& properties);
  static AccountPtr _initWithTypeClass(const std::optional<std::string>& type,
                                       const std::optional<std::string>& className);
  // Whether the catalogue has an entry under exactly this type.
  static bool _isValidAccountType(std::optional<std::string_view> type);
  // Reads the catalogue of dataclasses afresh; empty when it is missing or unreadable.
  static std::optional<propertylist::Dictionary> _dataclassesProperties();

  // The catalogue of account creators; empty when it is missing or unreadable.
  static const std::optional<propertylist::Dictionary>& _accountCreationMap();
  // Reads that catalogue afresh.
  static std::optional<propertylist::Dictionary> _creatorsInfo();
  std::optional<std::string> _creatorClassNameForAccountTypeCreatorTypeLoader(
      const std::optional<std::string>& type, std::string_view creatorType,
      FullAccountLoader* loader) const;
  // The sync account, made at the first call and then kept; null when the type has no creator of
  // one, and, with a log line, when it could not be made. A malformed catalogue is an
  // InternalConsistencyFailure here too.
  SyncAccountPtr _cachedSyncAccount();

  // Like setAccountPropertyForKey, "Type" and "Class" included.
  void _forcedSetAccountPropertyForKey(const std::optional<propertylist::Value>& value,
                                       std::string_view key);
  // Like setEnabledForDataclass, also for what the type does not support.
  void _forcedSetEnabledForDataclass(bool enabled, std::string_view dataclass);
  // Known dataclasses once each in the listed order, then unknown strings as they came.
  static StringList _orderedDataclasses(const StringList& dataclasses);
  // What configuration profiles forbid now.
  static StringList _profileRestrictedDataclasses();

 private:
  std::optional<propertylist::Text> _textForKey(std::string_view key) const;
  // The lists of dataclasses as views of the catalogue and of properties of this record and of its
  // parents.
  static std::optional<NameList> _namesSupportedForAccountType(std::string_view type);
  static NameList _orderedNames(const NameList& names);
  NameList _supportedNames() const;
  NameList _provisionedNames() const;
  std::optional<NameList> _enabledNames() const;
  // Asks the platform what enabledDataclasses asks it, for callers that do not look at the answer.
  void _askForEnabledNames() const;
  static bool _flagOfDataclass(std::string_view dataclass, std::string_view flag);

  AccountPtr parentAccount_;
  propertylist::Dictionary originalProperties_;
  propertylist::Dictionary properties_;
  FullAccountPtr fullAccount_;
  SyncAccountPtr syncAccount_;
};

// Whether the account's type is one of `types`.
bool isOfOneType(const ASSBasicAccount& account, const StringList& types);

}  // namespace accountsettings
