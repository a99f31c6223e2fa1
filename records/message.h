#pragma once

#include <concepts>
#include <functional>
#include <initializer_list>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <variant>

#include "platform/export.h"
#include "platform/property_value.h"
#include "platform/text.h"

namespace records {

using platform::Dictionary;
using platform::PropertyValue;
using platform::StringConstant;
using platform::Text;

// One argument of a message. It refers to what it was made from and renders it only when the message is read, so a
// message that nobody reads costs nothing. Absent objects read as "(null)"; values and dictionaries read as their
// description, which hides credentials; a bare text reads as it is.
class ACCOUNT_EXPORT MessageArgument {
 public:
  MessageArgument(std::string_view text) : _source{text} {}
  MessageArgument(const std::string& text) : _source{std::string_view{text}} {}
  MessageArgument(const char* text) : _source{std::string_view{text}} {}
  MessageArgument(StringConstant text) : _source{text.view()} {}
  MessageArgument(const Text& text) : _source{text.view()} {}
  MessageArgument(const PropertyValue& value) : _source{&value} {}
  MessageArgument(const Dictionary& dictionary) : _source{&dictionary} {}
  template <std::integral Integer>
  MessageArgument(Integer number) : _source{static_cast<std::int64_t>(number)} {}
  template <typename Value>
  MessageArgument(const std::optional<Value>& value) : _source{std::monostate{}} {
    if (value) _source = MessageArgument{*value}._source;
  }
  // Anything else: an object that renders itself when asked.
  MessageArgument(const std::function<std::string()>& render) : _source{&render} {}

  [[nodiscard]] std::string rendered() const;

 private:
  std::variant<std::monostate, std::string_view, const PropertyValue*, const Dictionary*, std::int64_t,
               const std::function<std::string()>*>
      _source;
};

// The message with its placeholders %@, %s, %d and %ld replaced, in order, by the arguments. A placeholder without an
// argument stays as it stands.
[[nodiscard]] ACCOUNT_EXPORT std::string message(std::string_view format, std::span<const MessageArgument> arguments);
[[nodiscard]] inline std::string message(std::string_view format, std::initializer_list<MessageArgument> arguments) {
  return message(format, std::span{arguments.begin(), arguments.size()});
}

}  // namespace records
