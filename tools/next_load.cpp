#include "tools/next_load.h"

#include "records/loss.h"
#include "tools/account_view.h"

namespace tools {
namespace {

using accountsettings::Array;
using accountsettings::Dictionary;
using accountsettings::PropertyValue;
using accountsettings::WhyLeftOut;
using records::LossCode;

std::string repairOf(const BasicAccount& loaded) {
  for (const auto& [key, value] : loaded.properties()) {
    const PropertyValue* const given = loaded.originalProperties().find(key);
    const bool isRepair = given != nullptr && *given != value && key != accountsettings::kAccountIdentifier;
    if (isRepair) return "set " + key.string() + " to " + lineOf(value, key);
  }
  return {};
}

}  // namespace

std::string_view reasonFor(WhyLeftOut why) {
  auto code = LossCode::droppedUnknownClass;
  switch (why) {
    case WhyLeftOut::noRecord: code = LossCode::droppedNoRecord; break;
    case WhyLeftOut::noType: code = LossCode::droppedNoType; break;
    case WhyLeftOut::unknownType: code = LossCode::droppedUnknownType; break;
    case WhyLeftOut::noClass: code = LossCode::droppedNoClass; break;
    case WhyLeftOut::givenUp: break;
  }
  return records::meaningOf(code).text;
}

std::string faultOfChild(const PropertyValue& element) {
  const auto* const child = element.asDictionary();
  if (child == nullptr) return std::string{reasonFor(WhyLeftOut::noRecord)};
  const auto alone = AccountsManager::initWithAccounsInfoArray({element});
  for (const auto& each : alone->loadOutcome().leftOut) {
    if (each.why != WhyLeftOut::givenUp) return std::string{reasonFor(each.why)};
  }
  return child->text(accountsettings::kAccountIdentifier) == nullptr ? "it has no identifier" : "";
}

std::string faultAtNextLoad(const Dictionary& record) {
  const auto store = AccountsManager::initWithAccounsInfoArray({record});
  const auto& leftOut = store->loadOutcome().leftOut;
  if (!leftOut.empty()) return "drop it: " + std::string{reasonFor(leftOut.front().why)};
  const std::string repair = repairOf(*store->allBasicAccounts().front());
  const PropertyValue* const children = record.find(accountsettings::kAccountChildAccounts);
  if (!repair.empty() || children == nullptr) return repair;
  const Array* const array = children->asArray();
  if (array == nullptr) return "find none of its children: they are no array";
  for (std::size_t index = 0; index < array->size(); ++index) {
    const std::string fault = faultOfChild((*array)[index]);
    if (!fault.empty()) return "not find its child " + std::to_string(index) + ": " + fault;
  }
  return {};
}

}  // namespace tools
