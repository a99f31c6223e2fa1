// Runs every piece of bench/pieces.h at each of the given numbers of accounts, for whoever counts what `measuredPiece`
// takes, and prints the names of the pieces. Usage: growth ACCOUNTS...
#include <cstdio>
#include <cstdlib>

#include "bench/pieces.h"

extern "C" __attribute__((noinline)) void measuredPiece(const std::function<void()>& action) { action(); }

int main(int count, char** arguments) {
  for (const bench::Piece& piece : bench::pieces()) {
    piece.prepare({.accounts = 10})();  // what is done once in a process is done here
    for (int index = 1; index < count; ++index) {
      measuredPiece(piece.prepare({.accounts = std::strtoull(arguments[index], nullptr, 10)}));
    }
    std::puts(piece.name);
  }
}
