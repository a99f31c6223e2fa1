// The floor of a process's work: starts, loads the plug-in and exits. Usage: bench-only-load PLUGIN
#include <dlfcn.h>

#include <cstdio>

int main(int count, char** arguments) {
  if (count < 2) return 2;
  if (::dlopen(arguments[1], RTLD_NOW | RTLD_NODELETE) != nullptr) return 0;
  std::fprintf(stderr, "%s\n", ::dlerror());
  return 1;
}
