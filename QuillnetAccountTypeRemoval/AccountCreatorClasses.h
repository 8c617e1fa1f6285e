#pragma once

#include <memory>
#include <string>
#include <string_view>

#include "platform/ClassRegistry.h"
#include "platform/Export.h"
#include "propertylist/Value.h"

// What classes in code bundles offer to the account settings library. A bundle registers an object
// of platform::RuntimeClass under the class's name; the object also implements those of these
// interfaces that the class offers, and the library asks with a dynamic_cast.
namespace accountsettings {

class ASSBasicAccount;
using AccountPtr = std::shared_ptr<ASSBasicAccount>;

// A full account: the object that speaks to an account's service. The record holds it, so an
// account that holds the record in turn keeps both for ever: it keeps what it needs of it, or a
// weak pointer. The parent may be held.
class PLATFORM_EXPORT AccountFullAccountProtocol {
 public:
  virtual ~AccountFullAccountProtocol() = default;
  // Told once, when the full account is made, also with a null parent.
  virtual void setParentAccount(const AccountPtr& parent) = 0;
};
using FullAccountPtr = std::shared_ptr<AccountFullAccountProtocol>;

// A sync account: the object that refreshes an account's sync containers. The record holds it, and
// as with a full account it does not hold the record. The answers are passed on to whoever asked
// the record.
class PLATFORM_EXPORT AccountSyncAccountProtocol {
 public:
  virtual ~AccountSyncAccountProtocol() = default;
  virtual bool refreshContainerWithIdentifierForDataclassIsUserRequested(
      std::string_view containerIdentifier, std::string_view dataclass, bool isUserRequested) = 0;
  virtual bool refreshContainerListForDataclassIsUserRequested(std::string_view dataclass,
                                                               bool isUserRequested) = 0;
  virtual bool refreshContainersForDataclassIsUserRequested(std::string_view dataclass,
                                                            bool isUserRequested) = 0;
};
using SyncAccountPtr = std::shared_ptr<AccountSyncAccountProtocol>;

// A class whose instances are full accounts.
class PLATFORM_EXPORT FullAccountClass {
 public:
  virtual ~FullAccountClass() = default;
  // Null when the properties make no account.
  virtual FullAccountPtr initWithProperties(const propertylist::Dictionary& properties) = 0;
};

// A full-account creator that names the class to instantiate: an object that is a FullAccountClass,
// or null. A creator that offers this is asked nothing else.
class PLATFORM_EXPORT FullAccountClassCreator {
 public:
  virtual ~FullAccountClassCreator() = default;
  virtual platform::RuntimeClass* classForAccountType(std::string_view type) = 0;
};

// A full-account creator that makes the account itself.
class PLATFORM_EXPORT FullAccountCreator {
 public:
  virtual ~FullAccountCreator() = default;
  virtual FullAccountPtr accountWithBasicAccount(const AccountPtr& account) = 0;
};

// A creator of sync accounts.
class PLATFORM_EXPORT SyncAccountCreator {
 public:
  virtual ~SyncAccountCreator() = default;
  virtual SyncAccountPtr accountToRefreshForBasicAccount(const AccountPtr& account) = 0;
};

// A loader, which callers may hand in to load the code of full accounts themselves.
class PLATFORM_EXPORT FullAccountLoader {
 public:
  virtual ~FullAccountLoader() = default;
  // True when the code that defines the full account of a record with these properties is loaded.
  virtual bool loadBundleForAccountWithProperties(const propertylist::Dictionary& properties) = 0;
};

// A class that hears of changed accounts after a save. Every notifier class offers this.
class PLATFORM_EXPORT AccountChangesNotifier {
 public:
  virtual ~AccountChangesNotifier() = default;
  // `changes` holds change records (AccountChanges.h), deleted accounts first, then added, then
  // modified ones. Called once per save, and only when there is something to tell.
  virtual void noteAccountChanges(const propertylist::Array& changes) = 0;
};

// A notifier class that is told before a dataclass of an account changes.
class PLATFORM_EXPORT AccountWillChangeNotifier {
 public:
  virtual ~AccountWillChangeNotifier() = default;
  virtual void accountWillChangeForDataclass(const std::string& accountIdentifier,
                                             std::string_view dataclass) = 0;
};

// A notifier class that is told after a dataclass of an account has changed.
class PLATFORM_EXPORT AccountDidChangeNotifier {
 public:
  virtual ~AccountDidChangeNotifier() = default;
  virtual void accountDidChangeForDataclass(const std::string& accountIdentifier,
                                            std::string_view dataclass) = 0;
};

}  // namespace accountsettings
