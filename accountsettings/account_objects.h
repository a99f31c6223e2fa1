#pragma once

#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "platform/export.h"
#include "platform/modules.h"
#include "platform/property_value.h"

// What loadable account modules provide: the objects behind an account record, and the classes that make them or want
// to hear of changes. A module includes this header, derives its objects, and registers one AccountClassInfo for each
// of its classes with a platform::ClassRegistration at namespace scope.
namespace accountsettings {

class BasicAccount;

// A full account object: knows the service behind a record.
class ACCOUNT_EXPORT FullAccountObject {
 public:
  virtual ~FullAccountObject();
  // Is given the parent of the record it was made for; null for a top-level account.
  virtual void setParentAccount(std::shared_ptr<BasicAccount> parent) = 0;
};

// A sync account object: refreshes the containers (calendars, folders, address books) of an account. Each operation
// answers whether a refresh was begun.
class ACCOUNT_EXPORT SyncAccountObject {
 public:
  virtual ~SyncAccountObject();
  virtual bool refreshContainerWithIdentifier_forDataclass_isUserRequested(std::string_view identifier,
                                                                           std::string_view dataclass,
                                                                           bool isUserRequested) = 0;
  virtual bool refreshContainerListForDataclass_isUserRequested(std::string_view dataclass, bool isUserRequested) = 0;
  virtual bool refreshContainersForDataclass_isUserRequested(std::string_view dataclass, bool isUserRequested) = 0;
};

// A class that a module defines. A class answers an operation exactly when the member of that name is set; all are
// optional, and who asks for one that is missing says so.
class ACCOUNT_EXPORT AccountClassInfo : public platform::ClassInfo {
 public:
  using platform::ClassInfo::ClassInfo;
  AccountClassInfo(const AccountClassInfo&) = default;
  AccountClassInfo& operator=(const AccountClassInfo&) = default;
  ~AccountClassInfo() override;

  // Of full accounts: makes an object of this class from a record's properties.
  std::function<std::shared_ptr<FullAccountObject>(const platform::Dictionary& properties)> initWithProperties;

  // Of full-account creators: the class of the full account object for an account type, or, in its place, the object
  // itself for a record.
  std::function<const AccountClassInfo*(std::string_view type)> classForAccountType;
  std::function<std::shared_ptr<FullAccountObject>(const std::shared_ptr<BasicAccount>& account)>
      accountWithBasicAccount;

  // Of sync-account creators.
  std::function<std::shared_ptr<SyncAccountObject>(const std::shared_ptr<BasicAccount>& account)>
      accountToRefreshForBasicAccount;

  // Of loaders: whether the loader has itself opened the module that defines the full account's class.
  std::function<bool(const platform::Dictionary& properties)> loadBundleForAccountWithProperties;

  // Of notifiers: before and after one data class of one account is switched, and after a save with all its changes
  // (dictionaries with the kASChange… keys).
  std::function<void(std::string_view identifier, std::string_view dataclass)> accountWillChange_forDataclass;
  std::function<void(std::string_view identifier, std::string_view dataclass)> accountDidChange_forDataclass;
  std::function<void(const std::vector<platform::Dictionary>& changes)> noteAccountChanges;
};

}  // namespace accountsettings
