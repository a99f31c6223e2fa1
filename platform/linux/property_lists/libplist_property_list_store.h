#pragma once

#include <memory>

#include "platform/export.h"
#include "platform/file_system.h"
#include "platform/property_list_store.h"

namespace platform {

// Property lists through libplist. Files are read through `files` and nothing else opens any. Each is read whenever it
// is asked for; bytes that are the same as lately read or written ones are not parsed again, and values that are the
// same as lately read or written ones not serialized again (see known_property_lists.h).
//
// libplist trusts what it is given: some files crash it, some keep it busy for ever or make it take all memory. So
// every file is scanned first, and malformed values are repaired, in a copy of its bytes, into what libplist can carry:
//
//   NUL, unpaired surrogates, bytes that are not UTF-8    U+FFFD, in values and keys alike
//   null, other objects without a meaning to libplist     an empty text
//   an empty UTF-16 text                                  an empty text
//   sets                                                  arrays
//   integers outside the 64-bit ranges                    the nearest that lies within
//   UIDs above 32 bits                                    the integer of that number; an empty text if it has none
//   keys that are no texts                                the entry is left out
//   keys that come twice                                  the last value, at the first one's place
//   XML: octal integers, malformed entities               decimal ones; U+FFFD in place of the "&"
//
// A file is refused only where it is no property list for libplist at all, or where reading it would exhaust the
// process: more than 256 nested containers, cycles, contents that unfold to more than about 120 times the file's size
// in memory (shared references), XML with thousands of keys made to collide or to repeat in one dictionary or with very
// many entities in one text, texts or numbers made to collide in libplist's writer, more than 8 million values, files
// above 256 MiB (binary) or 16 MiB (XML). Where there is not the memory that libplist will take, both throw
// std::bad_alloc.
//
// `serialize` fails for what such a reader would not give back: more than 256 nested containers, UIDs above
// 32 bits, more than 8 million values or 256 MiB. Its time grows with the square of the number of values: unnoticeable
// up to some 5,000 accounts of 20 properties, 1.5 seconds for 10,000.
[[nodiscard]] ACCOUNT_EXPORT std::shared_ptr<PropertyListStore> makeLibplistPropertyListStore(
    std::shared_ptr<FileSystem> files);

}  // namespace platform
