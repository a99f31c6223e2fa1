#include "client/target.h"

#include <utility>

namespace accounts {

using accountsettings::AccountsManager;
using accountsettings::BasicAccount;
using accountsettings::kAccountChildAccounts;
using platform::Dictionary;
using platform::Text;
using Record = std::shared_ptr<BasicAccount>;

Target targetIn(const AccountsManager& store, std::string_view identifier) {
  Record record = store.accountWithIdentifier(identifier);
  if (record == nullptr || record->identifier() == Text{identifier}) return {std::move(record), std::nullopt};
  const auto* const children = std::as_const(*record).properties().array(kAccountChildAccounts);
  for (std::size_t place = children == nullptr ? 0 : children->size(); place > 0; --place) {
    const Dictionary* const child = (*children)[place - 1].asDictionary();
    const Text* const own = child == nullptr ? nullptr : child->text(accountsettings::kAccountIdentifier);
    if (own != nullptr && *own == identifier) return {std::move(record), place - 1};
  }
  return {};
}

Record recordOf(const Target& target) {
  const Dictionary& own = std::as_const(*target.record).properties();
  if (!target.child) return BasicAccount::initWithProperties(own);
  Record child = BasicAccount::initWithProperties(*(*own.array(kAccountChildAccounts))[*target.child].asDictionary());
  if (child != nullptr) child->setParentAccount(BasicAccount::initWithProperties(own));
  return child;
}

void put(AccountsManager& store, const Target& target, Dictionary properties) {
  if (!target.child) {
    target.record->properties() = std::move(properties);
    return;
  }
  platform::Array children = *std::as_const(*target.record).properties().array(kAccountChildAccounts);
  children[*target.child] = std::move(properties);
  target.record->setAccountProperty_forKey(std::move(children), kAccountChildAccounts);
  store._loadChildrenFromAccount(target.record);
}

Dictionary propertiesOf(const Target& target) {
  const Dictionary& own = std::as_const(*target.record).properties();
  return target.child ? *(*own.array(kAccountChildAccounts))[*target.child].asDictionary() : own;
}

}  // namespace accounts
