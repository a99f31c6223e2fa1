// Makes a device's file tree. Usage: bench-device ROOT ACCOUNTS VERSION
#include <cstdio>
#include <cstdlib>
#include <exception>

#include "bench/device.h"

int main(int count, char** arguments) {
  if (count < 4) return 2;
  try {
    bench::makeDevice(arguments[1], {.accounts = std::strtoull(arguments[2], nullptr, 10),
                                     .version = std::strtoull(arguments[3], nullptr, 10)});
    return 0;
  } catch (const std::exception& thrown) {
    std::fprintf(stderr, "%s\n", thrown.what());
    return 1;
  }
}
