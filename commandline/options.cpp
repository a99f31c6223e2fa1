#include "commandline/options.h"

#include <CLI/CLI.hpp>
#include <algorithm>

#include "commandline/ending.h"
#include "commandline/table.h"

namespace commandline {
namespace {

// What the parser notes for an option that has no value; nobody can type it.
const std::string kNoValue = "\x01";

constexpr int kAnyNumber = CLI::detail::expected_max_vector_size;

std::string longName(const Option& option) { return option.names.substr(0, option.names.find(',')); }

// The names without what follows an equals sign.
std::string nameIn(const std::string& argument) { return argument.substr(0, argument.find('=')); }

// --- One option's values, as they were given in their order ---

using Values = std::vector<std::string>;

void leave(const Option& option, Switch place, const Values& values) {
  if (std::ranges::count(values, kNoValue) != std::ssize(values)) throw WrongUse{"unknown option: " + longName(option)};
  *place = true;
}

void leave(const Option& option, Word place, const Values& values) {
  if (values.front() == kNoValue || values.front().empty()) throw WrongUse{longName(option) + " needs a value"};
  if (values.size() > 1) throw WrongUse{longName(option) + " is given twice"};
  *place = values.front();
}

void leave(const Option& option, Words place, const Values& values) {
  const bool lacksOne = std::ranges::any_of(values, [](const auto& each) { return each.empty() || each == kNoValue; });
  if (lacksOne) throw WrongUse{longName(option) + " needs a value"};
  *place = values;
}

void leave(const Option& option, PathWord place, const Values& values) {
  std::optional<std::string> word;
  leave(option, &word, values);
  *place = std::filesystem::absolute(*word);
}

void leave(const Option& option, const Form& form, const Values& values) {
  if (values.size() > 1) throw WrongUse{longName(option) + " is given twice"};
  const bool isBare = values.front() == kNoValue;
  if (!isBare && std::ranges::find(form.forms, values.front()) == form.forms.end()) {
    if (form.forms.empty()) throw WrongUse{longName(option) + " takes no value"};
    std::string allowed;
    for (const std::string& each : form.forms) allowed += (&each == &form.forms.back() ? " or =" : ", =") + each;
    throw WrongUse{longName(option) + " is followed by nothing" + allowed};
  }
  *form.place = isBare ? std::string{} : values.front();
}

// --- The parser ---

CLI::Option* declare(CLI::App& parser, const Option& option) {
  const bool takesNextWord =
      !std::holds_alternative<Switch>(option.target) && !std::holds_alternative<Form>(option.target);
  if (takesNextWord) {
    auto* const declared = parser.add_option(option.names)->expected(0, 1)->default_str(kNoValue);
    return declared->multi_option_policy(CLI::MultiOptionPolicy::TakeAll);
  }
  std::string names;
  for (const std::string& name : CLI::detail::split(option.names, ',')) {
    names += (names.empty() ? "" : ",") + name + "{" + kNoValue + "}";
  }
  return parser.add_flag(names)->multi_option_policy(CLI::MultiOptionPolicy::TakeAll);
}

// Most programs know many options and are given few; to declare one takes longer than to read it.
bool mayBeGiven(const Option& option, std::span<const char* const> arguments) {
  const bool hasShortName = option.names.find(',') != std::string::npos;
  return std::ranges::any_of(arguments, [&](std::string_view argument) {
    const bool isShort = argument.size() > 1 && argument[0] == '-' && argument[1] != '-';
    return (hasShortName && isShort) || argument.starts_with(longName(option));
  });
}

void refuseUnknown(const CLI::App& parser, std::span<const Option> options) {
  std::vector<std::string> names;
  for (const Option& option : options) names.push_back(longName(option));
  for (const std::string& argument : parser.remaining()) {
    if (argument == "--") continue;
    throw WrongUse{"unknown option: " + nameIn(argument), hintFor(nameIn(argument), names)};
  }
}

// An empty value behind an equals sign counts as none for the parser, which would look for one in the next argument.
void refuseEmptyValues(std::span<const char* const> arguments, std::span<const Option> options) {
  for (const std::string argument : arguments) {
    if (argument == "--") return;
    if (!argument.starts_with("--") || argument.find('=') != argument.size() - 1) continue;
    const auto meant = std::ranges::find(options, nameIn(argument), longName);
    if (meant == options.end()) continue;
    std::visit([&](const auto& target) { leave(*meant, target, {""}); }, meant->target);
  }
}

}  // namespace

std::vector<std::string> readOptions(std::span<const Option> options, std::span<const char* const> arguments) {
  refuseEmptyValues(arguments, options);
  CLI::App parser;
  parser.set_help_flag();
  parser.allow_extras();
  std::vector<std::pair<const Option*, CLI::Option*>> declared;
  for (const Option& option : options) {
    if (mayBeGiven(option, arguments)) declared.emplace_back(&option, declare(parser, option));
  }
  // Counted on as many as can be: of words beyond the expected ones the parser would take those in brackets apart.
  auto* const words = parser.add_option("words")->expected(kAnyNumber, kAnyNumber);
  words->multi_option_policy(CLI::MultiOptionPolicy::TakeAll);
  parser.parse(std::vector<std::string>{arguments.rbegin(), arguments.rend()});
  refuseUnknown(parser, options);
  for (const auto& [option, read] : declared) {
    const Values& values = read->results();
    if (values.empty()) continue;
    std::visit([&, &meant = *option](const auto& target) { leave(meant, target, values); }, option->target);
  }
  return words->results();
}

std::string helpOf(std::span<const Option> options, const Page& page) {
  std::vector<Meaning> list;
  for (const Option& option : options) {
    std::string names = option.names;
    if (const auto comma = names.find(','); comma != std::string::npos) names.insert(comma + 1, " ");
    list.push_back({names + (option.argument.empty() ? "" : " " + option.argument), option.summary});
  }
  return meanings(list, page);
}

}  // namespace commandline
