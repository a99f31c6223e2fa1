#pragma once

#include <string>
#include <string_view>

#include "platform/export.h"

namespace platform {

// --- What may reach a terminal ---
//
// This is the one rule; whoever prints text that a file, a module or a command line brought passes it through one of
// the two functions below. Unsafe is what steers a terminal, breaks a line, or lets a text show in another order than
// it has:
//
//  - the control characters: U+0000 to U+001F and U+007F to U+009F (every escape sequence begins with one of them);
//  - the separators of lines and of paragraphs: U+2028 and U+2029;
//  - the marks that embed, override or isolate a direction: U+202A to U+202E and U+2066 to U+2069;
//  - every byte that is not part of well-formed UTF-8.
//
// What both answer is one line of well-formed UTF-8, and stays as it is when it is given to the same function again.

// For logs and consoles, where it matters what stood there: what is unsafe is spelt out ("\n", "\x1b", "\u202e"; a byte
// that is no character like the character of its number). Tabs stay.
[[nodiscard]] ACCOUNT_EXPORT std::string singleLine(std::string_view text);

// For tables and messages, where it matters how wide a text is: U+FFFD in place of each character that is unsafe, a tab
// included, and of each byte that is no character.
[[nodiscard]] ACCOUNT_EXPORT std::string printable(std::string_view text);

// --- Upper and lower case ---
//
// Of every script, letter by letter, in no particular language; what is no well-formed UTF-8 stays as it is.

// A letter whose capital is written as several ("ß") becomes those.
[[nodiscard]] ACCOUNT_EXPORT std::string upperCased(std::string_view text);

// The form in which texts are equal that differ by case alone, or by how a letter with marks is put together.
[[nodiscard]] ACCOUNT_EXPORT std::string caseFolded(std::string_view text);

}  // namespace platform
