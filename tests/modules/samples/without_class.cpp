// A module in good order that defines no class.

extern "C" [[gnu::visibility("default")]] int sample_module_without_class() { return 0; }
