#pragma once

// Everything is built with hidden visibility; what a shared library offers to others carries the first mark, and what
// is private in a class that carries it the second.
#define ACCOUNT_EXPORT [[gnu::visibility("default")]]
#define ACCOUNT_HIDDEN [[gnu::visibility("hidden")]]
