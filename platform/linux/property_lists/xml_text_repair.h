#pragma once

#include <cstddef>
#include <span>

namespace platform {

// Repairs in place of what stands between an XML property list's tags, where libplist would give up on the whole file
// or read another value than the one that is written. Lengths stay as they are.

// A text: each "&" that begins no entity that libplist knows becomes U+FFFD. Answers the number of entities left.
std::size_t repairXmlText(std::span<char> text);

// An integer: leading zeros (octal to libplist) and what is no number become blanks, a negative number below the 64-bit
// range the smallest within it.
void repairXmlInteger(std::span<char> text);

}  // namespace platform
