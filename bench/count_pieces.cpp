// Runs pieces of bench/pieces.h on each of the given populations, for whoever counts what `measuredPiece` takes, and
// prints the names of the pieces. Usage: bench-count [--piece NAME]... [ACCOUNTS[/CHILDREN][/MIXTURE]]...
#include <cctype>
#include <cstdio>
#include <cstdlib>
#include <set>
#include <string_view>

#include "bench/pieces.h"

extern "C" __attribute__((noinline)) void measuredPiece(const std::function<void()>& action) { action(); }

namespace {

bench::Mixture mixtureNamed(std::string_view name) {
  if (name == "pairs") return bench::Mixture::pairs;
  if (name == "type") return bench::Mixture::type;
  if (name == "family") return bench::Mixture::family;
  if (name == "hosted") return bench::Mixture::hosted;
  if (name == "twins") return bench::Mixture::twins;
  std::fprintf(stderr, "bench-count: no such mixture: %s\n", name.data());
  std::exit(2);
}

bench::Population populationOf(const char* argument) {
  bench::Population population;
  char* end = nullptr;
  population.accounts = std::strtoull(argument, &end, 10);
  if (*end == '/' && std::isdigit(static_cast<unsigned char>(end[1])) != 0) {
    population.children = std::strtoull(end + 1, &end, 10);
  }
  if (*end == '/') population.mixture = mixtureNamed(end + 1);
  return population;
}

}  // namespace

int main(int count, char** arguments) {
  std::set<std::string_view> chosen;
  int next = 1;
  for (; next + 1 < count && arguments[next] == std::string_view{"--piece"}; next += 2)
    chosen.insert(arguments[next + 1]);
  for (const bench::Piece& piece : bench::pieces()) {
    if (!chosen.empty() && !chosen.contains(piece.name)) continue;
    piece.prepare({.accounts = 10})();  // what is done once in a process is done here
    for (int index = next; index < count; ++index) measuredPiece(piece.prepare(populationOf(arguments[index])));
    std::puts(piece.name);
  }
}
