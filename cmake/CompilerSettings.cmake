# What every target of the house is compiled and linked with.

set(CMAKE_CXX_STANDARD 20)
set(CMAKE_CXX_STANDARD_REQUIRED ON)
set(CMAKE_CXX_EXTENSIONS OFF)
set(CMAKE_POSITION_INDEPENDENT_CODE ON)
set(CMAKE_CXX_VISIBILITY_PRESET hidden)
set(CMAKE_VISIBILITY_INLINES_HIDDEN ON)

set(ACCOUNTS_SANITIZE "" CACHE STRING "Sanitizers to build with, as for -fsanitize=")
option(ACCOUNTS_COVERAGE "Count executed lines and branches" OFF)
set(ACCOUNTS_LINT "" CACHE STRING "What clang-tidy looks at as it is compiled: product, all, or nothing")
set_property(CACHE ACCOUNTS_LINT PROPERTY STRINGS "" product all)

find_program(CCACHE_PROGRAM ccache)
if(CCACHE_PROGRAM)
  set(CMAKE_C_COMPILER_LAUNCHER "${CCACHE_PROGRAM}")
  set(CMAKE_CXX_COMPILER_LAUNCHER "${CCACHE_PROGRAM}")
endif()

if(ACCOUNTS_LINT)
  find_program(CLANG_TIDY_PROGRAM clang-tidy-16 REQUIRED)
  set(CMAKE_CXX_CLANG_TIDY "${CLANG_TIDY_PROGRAM}" "--quiet" "--extra-arg=-Wno-unknown-warning-option")
endif()

add_compile_options(
  -Wall -Wextra -Wpedantic -Wshadow -Wconversion -Wsign-conversion -Wold-style-cast -Wnon-virtual-dtor
  -Woverloaded-virtual -Wcast-qual -Wformat=2 -Werror
  -fstack-protector-strong
  # Messages name a source by its place in the tree, and no binary holds a path of the machine that built it.
  "-fmacro-prefix-map=${CMAKE_SOURCE_DIR}/=")
add_link_options(-Wl,-z,relro,-z,now,-z,noexecstack)

if(ACCOUNTS_SANITIZE)
  add_compile_options(-fsanitize=${ACCOUNTS_SANITIZE} -fno-omit-frame-pointer -fno-sanitize-recover=all)
  add_link_options(-fsanitize=${ACCOUNTS_SANITIZE})
  if(CMAKE_CXX_COMPILER_ID STREQUAL "Clang")
    # The sanitizer's run time stands in the program, not in the shared libraries.
    add_link_options(-Wl,-z,undefs)
  endif()
else()
  add_compile_definitions($<$<NOT:$<CONFIG:Debug>>:_FORTIFY_SOURCE=2>)
  # What only depends on where a binary is loaded takes a bit each, and is no entry that the loader goes through.
  add_link_options(-Wl,--no-undefined -Wl,-O1,-z,pack-relative-relocs)
endif()

if(ACCOUNTS_FUZZ)
  # What the fuzzers are guided by; only they link the fuzzing engine itself, which the shared libraries call. Telling it
  # of each comparison takes nearly as long as all else: only the build with sanitizers, slow in any case, does.
  if(ACCOUNTS_SANITIZE)
    add_compile_options(-fsanitize=fuzzer-no-link)
  else()
    add_compile_options(-fsanitize-coverage=inline-8bit-counters,indirect-calls,pc-table)
  endif()
  add_link_options(-fsanitize=fuzzer-no-link -Wl,-z,undefs)
endif()

if(ACCOUNTS_COVERAGE)
  # Each program and library adds to one file of its own, whoever runs it.
  add_compile_options("-fprofile-instr-generate=${CMAKE_BINARY_DIR}/profiles/%m.profraw" -fcoverage-mapping
    -fprofile-update=atomic)
  add_link_options(-fprofile-instr-generate)
endif()

# Programs are position-independent too, whatever the compiler's default.
include(CheckPIESupported)
check_pie_supported(LANGUAGES CXX)

# What is built finds its libraries relative to itself. A path of this machine, or an empty one (which is the working
# directory of whoever starts the program), is in none of it.
set(CMAKE_BUILD_RPATH_USE_ORIGIN ON)
