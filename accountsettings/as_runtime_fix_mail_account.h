#pragma once

#include <memory>
#include <string_view>
#include <unordered_set>

#include "accountsettings/runtime_fixer.h"

namespace accountsettings {

// Repairs mail accounts whose class the mail application does not know, by deriving the class from the directory in
// which the account's mail lies ("AccountPath"); an account for which that fails is to be dropped. When repairs made
// during a save have been saved, tells the mail application that its accounts changed.
class ACCOUNT_EXPORT ASRuntimeFixMailAccount final : public RuntimeFixer {
 public:
  static std::shared_ptr<ASRuntimeFixMailAccount> init();
  ~ASRuntimeFixMailAccount() override;

  FixAnswer fixBasicAccountIfNeeded_loggingMessage(BasicAccount& account, std::string_view loggingMessage) override;
  void accountsHaveBeenSaved(bool saved) override;

  // The account types that are looked at; one set for all instances.
  [[nodiscard]] const std::unordered_set<std::string_view>& supportedAccountTypes() const;
  // Sets the class that the account's path stands for; answers whether there was one.
  bool _cleanupAccountClass(BasicAccount& account);

 private:
  ACCOUNT_HIDDEN ASRuntimeFixMailAccount();

  std::unordered_set<std::string_view> _supportedMailClasses;
  bool _shouldNotifyMobileMail = false;
};

}  // namespace accountsettings
