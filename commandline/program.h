#pragma once

#include <functional>
#include <span>
#include <string_view>

namespace commandline {

// Says one line of the program's own on standard error, "NAME: " in front of it, in printable text. Out of memory even
// for that, it says so. A progress line gives way to it.
void say(std::string_view program, std::string_view line) noexcept;

// Prints the text, whole lines, on standard output, in place of a progress line; answers whether all of it was written.
[[nodiscard]] bool print(std::string_view text);

// What a program's main function does: hands the arguments behind the program's name to the work and answers the exit
// status. A failed write is a failed write, not the end of the process. An Ending is said and gives the status, its
// hint a line more where standard error is a terminal; whatever else is thrown is said and gives `failed`.
[[nodiscard]] int runProgram(std::string_view program, std::span<char* const> arguments, int failed,
                             const std::function<int(std::span<const char* const>)>& work);

}  // namespace commandline
