// A module that needs what nobody defines.

int definedNowhere();

[[gnu::visibility("default")]] int needsIt();
int needsIt() { return definedNowhere(); }
