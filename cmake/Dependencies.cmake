# The libraries that the house stands on, each found through its own pkg-config or CMake description.

find_package(PkgConfig REQUIRED)
find_package(Threads REQUIRED)
pkg_check_modules(libplist REQUIRED IMPORTED_TARGET libplist-2.0)
pkg_check_modules(libsystemd REQUIRED IMPORTED_TARGET libsystemd)  # its header alone: it is opened where there is a bus
pkg_check_modules(libmd REQUIRED IMPORTED_TARGET libmd)
pkg_check_modules(xxhash REQUIRED libxxhash)  # its header alone, compiled in
pkg_check_modules(utf8proc REQUIRED IMPORTED_TARGET libutf8proc)
find_package(utf8cpp REQUIRED)
find_package(CLI11 REQUIRED)
find_package(ICU REQUIRED COMPONENTS i18n uc)
find_package(nlohmann_json REQUIRED)
find_package(ZLIB REQUIRED)

if(ACCOUNTS_TESTS)
  find_package(GTest REQUIRED)
  find_package(rapidcheck REQUIRED)
  # The system's own, which has the modules that its packages bring, before another one on the path.
  find_program(Python3_EXECUTABLE python3 PATHS /usr/bin NO_DEFAULT_PATH)
  find_package(Python3 REQUIRED COMPONENTS Interpreter)
endif()
