#pragma once

#include <filesystem>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "commandline/terminal.h"

namespace commandline {

// What an option leads to. Each is a place that the reader writes to where the option is given.

using Switch = bool*;  // `--json`: becomes true, however often it is given
using Word = std::optional<std::string>*;
using Words = std::vector<std::string>*;                 // may be given any number of times, each with a value
using PathWord = std::optional<std::filesystem::path>*;  // becomes absolute

// `--explain`, or `--explain=FORM` with one of the forms; given once. The place then holds the form, which is empty
// where none is written. Without forms, the option takes no value.
struct Form {
  std::optional<std::string>* place;
  std::vector<std::string> forms;
};

// One option of a program.
struct Option {
  std::string names;     // "--root", or "--help,-h": a long name, and perhaps a short one
  std::string argument;  // how the help calls its value, "DIR"; empty where it has none
  std::string summary;   // for the help
  std::variant<Switch, Word, Words, PathWord, Form> target;
};

// Reads the arguments that follow the program's name, and answers those that are no options, in their order.
//
// Options are written `--name VALUE` or `--name=VALUE`, in full; a value that begins with a hyphen only in the second
// form, unless it is a negative number. They stand before, between and after the words; `--` ends them. Throws WrongUse
// for an option that is unknown, that is given twice although it holds one value, or whose value is missing, empty, or
// none of its forms.
[[nodiscard]] std::vector<std::string> readOptions(std::span<const Option> options,
                                                   std::span<const char* const> arguments);

// The help's lines on the options.
[[nodiscard]] std::string helpOf(std::span<const Option> options, const Page& page);

}  // namespace commandline
