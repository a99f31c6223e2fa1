#pragma once

#include <chrono>
#include <string>

namespace commandline {

// How far a long piece of work is.
struct Progress {
  std::string what;  // it is at, for people
  double share = 0;  // of the whole that is done, from 0 to 1
  double upTo = 0;   // the share at which its present part ends; 0 where nobody knows how much there is to do
};

// What can be said between two reports, from how fast the work was so far: the share that is done goes on towards the
// end of the present part, ever slower, and never back.
class ProgressEstimate {
 public:
  using Time = std::chrono::steady_clock::time_point;

  explicit ProgressEstimate(Time begin) : _begin{begin}, _reported{begin} {}

  void reached(Progress progress, Time now);
  [[nodiscard]] double shareAt(Time now) const;
  // "42 %, 12 s left: saving", or "saving" alone where nobody knows.
  [[nodiscard]] std::string textAt(Time now) const;

 private:
  using Seconds = std::chrono::duration<double>;

  Time _begin;
  Time _reported;
  Progress _progress;
};

}  // namespace commandline
