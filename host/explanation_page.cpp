#include "host/explanation_page.h"

#include <zlib.h>

#include <nlohmann/json.hpp>
#include <stdexcept>

#include "host/fact_json.h"

namespace host {

// Made by the build of what stands in pages/, with the places that a document's writer fills.
extern const std::string_view kPageTemplate;

namespace {

using platform::Dictionary;
using platform::PropertyValue;
using records::Name;

constexpr std::string_view kAccountsKey = "Accounts";
constexpr std::string_view kChildrenKey = "ChildAccounts";

std::string textUnder(const Dictionary& record, std::string_view key) {
  const auto* const text = record.text(key);
  return text == nullptr ? std::string{} : text->string();
}

void collect(const PropertyValue* records, const std::string& parent, std::vector<Name>& names) {
  const auto* const array = records == nullptr ? nullptr : records->asArray();
  if (array == nullptr) return;
  for (const PropertyValue& element : *array) {
    const Dictionary* const record = element.asDictionary();
    if (record == nullptr) continue;
    std::string name = textUnder(*record, "DisplayName");
    if (name.empty()) name = textUnder(*record, "Username");
    std::string identifier = textUnder(*record, "Identifier");
    names.push_back({textUnder(*record, "Type"), std::move(name), identifier, parent});
    collect(record->find(kChildrenKey), identifier, names);
  }
}

std::string compressed(std::string_view text) {
  uLongf size = compressBound(text.size());
  std::string bytes(size, '\0');
  const auto* const source = reinterpret_cast<const Bytef*>(text.data());
  if (compress2(reinterpret_cast<Bytef*>(bytes.data()), &size, source, text.size(), Z_BEST_COMPRESSION) != Z_OK) {
    throw std::bad_alloc{};
  }
  bytes.resize(size);
  return bytes;
}

std::string base64(std::string_view bytes) {
  constexpr std::string_view kDigits = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
  std::string text;
  text.reserve((bytes.size() + 2) / 3 * 4);
  for (std::size_t place = 0; place < bytes.size(); place += 3) {
    const std::string_view group = bytes.substr(place, 3);
    std::uint32_t bits = 0;
    for (std::size_t each = 0; each < 3; ++each) {
      bits = bits << 8U | (each < group.size() ? static_cast<unsigned char>(group[each]) : 0U);
    }
    for (std::size_t each = 0; each < 4; ++each) {
      text += each <= group.size() ? kDigits[bits >> (18 - 6 * each) & 0x3FU] : '=';
    }
  }
  return text;
}

std::string filled(std::string_view page, std::string_view place, std::string_view with) {
  const std::size_t found = page.find(place);
  return std::string{page.substr(0, found)}.append(with).append(page.substr(found + place.size()));
}

}  // namespace

std::vector<Name> accountsIn(const Dictionary& settings) {
  std::vector<Name> names;
  collect(settings.find(kAccountsKey), {}, names);
  return names;
}

std::string pageOf(std::string_view explanation, const std::vector<Name>& accounts) {
  auto document = nlohmann::ordered_json::parse(explanation);
  if (!accounts.empty()) document["accounts"] = jsonOf(accounts);
  const std::string text = document.dump(-1, ' ', false, nlohmann::ordered_json::error_handler_t::replace);
  const std::string withoutBlocks = filled(kPageTemplate, "@EXPLANATIONS@", {});
  return filled(withoutBlocks, "@DOCUMENT@", base64(compressed(text)));
}

}  // namespace host
