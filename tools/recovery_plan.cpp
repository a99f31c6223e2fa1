#include <algorithm>
#include <array>
#include <utility>

#include "tools/account_view.h"
#include "tools/key_value.h"
#include "tools/next_load.h"
#include "tools/recovery.h"

namespace tools {
namespace {

using accountsettings::Array;
using accountsettings::Dictionary;
using accountsettings::PropertyValue;
using accountsettings::Text;

void leave(RecoveryStep& step, RecoveryStep::Kind kind, std::string why) {
  step.kind = kind;
  step.why = std::move(why);
}

// An account that is there has an identifier of the record.
void settleBesides(RecoveryStep& step, const Dictionary& present, const std::string& what, std::string_view key) {
  const std::string whose = namesOf(present).described();
  const std::string service = serviceOf(present);
  const std::string other = serviceOf(step.record);
  if (!service.empty() && !other.empty() && service != other) {
    leave(step, RecoveryStep::Kind::leaveFaulty,
          "another account that is there, " + whose + ", has its " + what + "; --set '" + std::string{key} +
              ":=null' brings it back without");
  } else {
    leave(step, RecoveryStep::Kind::leavePresent, "it is there as " + whose + ", with the same " + what);
  }
}

}  // namespace

PresentAccounts::PresentAccounts(const accounts::Accounts& accounts) {
  for (const Account& account : accounts) add(recordOf(account));
  for (const Account& account : accounts) {
    for (const Account& child : account.children()) add(recordOf(child));
  }
}

void PresentAccounts::add(const Dictionary& record) {
  for (const auto& [key, index] : {std::pair{accountsettings::kAccountIdentifier, &_byIdentifier},
                                   std::pair{accountsettings::kAccountSyncIdentifier, &_bySyncIdentifier}}) {
    if (const std::string text = textUnder(record, key); !text.empty()) index->set(Text{text}, record);
  }
  const std::string service = serviceOf(record);
  if (service.empty()) return;
  if (auto* const known = _byService.find(service)) {
    known->push_back(record);
  } else {
    _byService.set(Text{service}, {record});
  }
}

// A migration gives some accounts another type and leaves their class.
const Dictionary* PresentAccounts::sameAccount(const Dictionary& record) const {
  const auto* const candidates = _byService.find(serviceOf(record));
  if (candidates == nullptr) return nullptr;
  const auto found = std::ranges::find_if(*candidates, [&](const Dictionary& each) {
    return std::ranges::any_of(std::array{accountsettings::kAccountType, accountsettings::kAccountClass},
                               [&](std::string_view key) { return textUnder(each, key) == textUnder(record, key); });
  });
  return found == candidates->end() ? nullptr : &*found;
}

// Answers whether an account that is there has one of the record's identifiers, and so settles the matter. What a
// migration gives a new identifier keeps the old one to sync by.
bool RecoveryPlan::settleByIdentifiers(RecoveryStep& step) const {
  const std::string identifier = textUnder(step.record, accountsettings::kAccountIdentifier);
  const std::string syncIdentifier = textUnder(step.record, accountsettings::kAccountSyncIdentifier);
  if (const auto* const present = _present.withIdentifier(identifier)) {
    settleBesides(step, *present, "identifier", accountsettings::kAccountIdentifier);
  } else if (const auto* const synced = _present.withSyncIdentifier(syncIdentifier)) {
    settleBesides(step, *synced, "sync identifier", accountsettings::kAccountSyncIdentifier);
  } else if (const auto* const renewed = _present.withSyncIdentifier(identifier)) {
    settleBesides(step, *renewed, "identifier to sync by", accountsettings::kAccountIdentifier);
  } else {
    return false;
  }
  return true;
}

void RecoveryPlan::settle(RecoveryStep& step) const {
  if (settleByIdentifiers(step)) return;
  if (const auto* const same = _present.sameAccount(step.record)) {
    leave(step, RecoveryStep::Kind::leavePresent,
          "it is there as " + namesOf(*same).described() + ", with the same user name and server");
    return;
  }
  const auto fault = step.parent ? faultOfChild(step.record) : faultAtNextLoad(step.record);
  if (!fault.empty()) {
    leave(step, RecoveryStep::Kind::leaveFaulty,
          (step.parent ? fault : "the next load would " + fault) + "; --set KEY=VALUE repairs it");
  } else if (step.parent && _present.withIdentifier(*step.parent) == nullptr) {
    leave(step, RecoveryStep::Kind::leaveFaulty, "the account that it belongs to, " + *step.parent + ", is not there");
  }
}

// A child may have found another parent since.
void RecoveryPlan::leaveOutPresentChildren(RecoveryStep& step) {
  const Array* const children = step.record.array(accountsettings::kAccountChildAccounts);
  if (children == nullptr) return;
  Array absent;
  for (const PropertyValue& element : *children) {
    const Dictionary* const child = element.asDictionary();
    const auto* const present = child == nullptr ? nullptr : _present.withIdentifier(namesOf(*child).identifier);
    if (present == nullptr) {
      absent.push_back(element);
      if (child != nullptr) _present.add(*child);
    } else {
      step.why += (step.why.empty() ? "without " : ", ") + namesOf(*child).described();
    }
  }
  if (absent.size() == children->size()) return;
  step.why += ", which is there already";
  step.record.set(accountsettings::kAccountChildAccounts, std::move(absent));
}

void RecoveryPlan::add(const AccountFile& file, const FoundAccount& account, Dictionary record) {
  RecoveryStep step{.from = &account, .record = std::move(record), .why = {}, .parent = {}};
  if (account.child) {
    const auto parent = std::ranges::find_if(file.accounts, [&](const FoundAccount& each) {
      return each.index == account.index && each.list == account.list && !each.child;
    });
    step.parent = namesOf(parent->record).identifier;
  }
  settle(step);
  if (step.kind == RecoveryStep::Kind::bringBack) {
    leaveOutPresentChildren(step);
    _present.add(step.record);
  }
  _steps.push_back(std::move(step));
}

Dictionary withProperties(Dictionary record, const std::vector<std::string>& settings) {
  for (std::size_t index = 0; index < settings.size(); ++index) {
    auto property = parseKeyValue(settings[index], index + 1);
    if (property.value) {
      record.set(property.key, *std::move(property.value));
    } else {
      record.remove(property.key);
    }
  }
  return record;
}

}  // namespace tools
