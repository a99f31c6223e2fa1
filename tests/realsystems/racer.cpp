// A user beside a run: exchanges what stands at PATHs for what is in a directory of his, as fast as it can, until it is
// killed.
//
//   racer USER SEED STOCK PATH...
//
// Three of four exchanges are taken back at once, so that a run gets far between them. The others stay, and now and
// then a second name, a link or nothing takes the place.

#include <fcntl.h>
#include <grp.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <random>
#include <string>
#include <vector>

namespace {

class Racer {
 public:
  Racer(unsigned seed, const std::string& stock, std::vector<std::string> places)
      : chance_(seed), hand_(stock + "/.hand"), places_(std::move(places)) {
    for (const auto& entry : std::filesystem::directory_iterator{stock}) things_.push_back(entry.path().string());
  }

  void move() {
    const std::string& place = anyOf(places_);
    const std::string& thing = anyOf(things_);
    const unsigned choice = upTo(16);
    if (choice == 0) {
      replace(place, thing);
    } else if (choice == 1) {
      link(thing, place);
    } else {
      exchange(thing, place);
      pause();
      if (choice > 4) exchange(thing, place);
    }
    pause();
  }

 private:
  unsigned upTo(unsigned end) { return static_cast<unsigned>(chance_() % end); }
  const std::string& anyOf(const std::vector<std::string>& all) { return all[upTo(static_cast<unsigned>(all.size()))]; }

  // As long as a few calls of a run take, or one, or none.
  void pause() {
    for (unsigned left = 1U << upTo(14); left > 0; --left) __asm__ volatile("");
  }

  // Where one of the two is missing there is nothing to exchange, so it is moved.
  static void exchange(const std::string& thing, const std::string& place) {
    if (renameat2(AT_FDCWD, thing.c_str(), AT_FDCWD, place.c_str(), RENAME_EXCHANGE) == 0) return;
    if (access(place.c_str(), F_OK) != 0) std::rename(thing.c_str(), place.c_str());
  }

  void replace(const std::string& place, const std::string& thing) {
    ::unlink(hand_.c_str());
    if (::link(thing.c_str(), hand_.c_str()) == 0) std::rename(hand_.c_str(), place.c_str());
  }

  void link(const std::string& thing, const std::string& place) {
    ::unlink(hand_.c_str());
    if (::symlink(thing.c_str(), hand_.c_str()) == 0) std::rename(hand_.c_str(), place.c_str());
  }

  std::minstd_rand chance_;
  std::string hand_;
  std::vector<std::string> places_;
  std::vector<std::string> things_;
};

bool becomeUser(unsigned user) {
  return setgroups(0, nullptr) == 0 && setgid(user) == 0 && setuid(user) == 0 && geteuid() == user;
}

}  // namespace

int main(int count, char** words) {
  if (count < 5 || !becomeUser(static_cast<unsigned>(std::atoi(words[1])))) return EXIT_FAILURE;
  Racer racer(static_cast<unsigned>(std::atoi(words[2])) + 1, words[3], {words + 4, words + count});
  std::puts("racing");
  std::fflush(stdout);
  for (;;) racer.move();
}
