#include "commandline/terminal.h"

#include <sys/ioctl.h>
#include <unistd.h>

#include <charconv>
#include <cstdlib>
#include <string_view>

namespace commandline {
namespace {

constexpr std::size_t kUsualColumns = 80;

std::string_view environment(const char* name) {
  const char* const value = std::getenv(name);
  return value == nullptr ? std::string_view{} : value;
}

std::size_t columnsOfTerminal(int descriptor) {
  const std::string_view wish = environment("COLUMNS");
  std::size_t columns = 0;
  std::from_chars(wish.data(), wish.data() + wish.size(), columns);
  if (columns > 0) return columns;
  winsize size{};
  if (::ioctl(descriptor, TIOCGWINSZ, &size) == 0 && size.ws_col > 0) return size.ws_col;
  return kUsualColumns;
}

}  // namespace

Page pageOn(int descriptor, Colour wish) {
  const bool isTerminal = ::isatty(descriptor) == 1;
  Page page;
  if (isTerminal) page.columns = columnsOfTerminal(descriptor);
  const bool isWelcome = isTerminal && environment("NO_COLOR").empty() && environment("TERM") != "dumb";
  page.isEmphasised = wish == Colour::always || (wish == Colour::automatic && isWelcome);
  return page;
}

}  // namespace commandline
