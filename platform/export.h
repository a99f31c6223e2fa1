#pragma once

// Everything is built with hidden visibility; what a shared library offers to others carries this mark.
#define ACCOUNT_EXPORT [[gnu::visibility("default")]]
