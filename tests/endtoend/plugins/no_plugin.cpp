// A module that registers nothing.

extern "C" [[gnu::visibility("default")]] int answer() { return 42; }
