#include "records/message.h"

#include <array>

#include "records/description.h"

namespace records {
namespace {

std::string render(std::monostate) { return "(null)"; }
std::string render(std::string_view text) { return withoutUserParts(text); }
// At the top of a message a text is shown bare; inside a container it is quoted.
std::string render(const PropertyValue* value) {
  return value->asText() != nullptr ? render(value->asText()->view()) : description(*value);
}
std::string render(const Dictionary* dictionary) { return description(*dictionary); }
std::string render(std::int64_t number) { return std::to_string(number); }
std::string render(const std::function<std::string()>* renderer) { return (*renderer)(); }

std::size_t placeholderLength(std::string_view text) {
  static constexpr std::array<std::string_view, 4> kPlaceholders{"%@", "%s", "%d", "%ld"};
  for (const std::string_view placeholder : kPlaceholders) {
    if (text.starts_with(placeholder)) return placeholder.size();
  }
  return 0;
}

}  // namespace

std::string MessageArgument::rendered() const {
  return std::visit([](auto source) { return render(source); }, _source);
}

std::string message(std::string_view format, std::span<const MessageArgument> arguments) {
  std::string text;
  for (std::size_t place = format.find('%'); place != std::string_view::npos && !arguments.empty();
       place = format.find('%')) {
    text += format.substr(0, place);
    format.remove_prefix(place);
    const std::size_t length = placeholderLength(format);
    if (length == 0) {
      text.push_back('%');
      format.remove_prefix(1);
    } else {
      text += arguments.front().rendered();
      arguments = arguments.subspan(1);
      format.remove_prefix(length);
    }
  }
  return text.append(format);
}

}  // namespace records
