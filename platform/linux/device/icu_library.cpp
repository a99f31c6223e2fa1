#include "platform/linux/device/icu_library.h"

#include <dlfcn.h>

#include "platform/linux/files/own_directory.h"

namespace platform {
namespace {

const IcuFunctions* openedFunctions() {
  const std::string file = ownDirectory() / "account-settings/platform-icu.so";
  void* const library = ::dlopen(file.c_str(), RTLD_NOW | RTLD_LOCAL | RTLD_NODELETE);
  if (library == nullptr) return nullptr;
  const auto functions = reinterpret_cast<IcuFunctionsGetter>(::dlsym(library, kIcuFunctionsSymbol));
  return functions == nullptr ? nullptr : functions();
}

}  // namespace

const IcuFunctions* icuFunctions() {
  static const IcuFunctions* const functions = openedFunctions();
  return functions;
}

}  // namespace platform
