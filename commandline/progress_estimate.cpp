#include "commandline/progress_estimate.h"

#include <algorithm>
#include <cmath>
#include <utility>

namespace commandline {
namespace {

constexpr double kMaxShown = 0.99;  // nothing is done before it is done
constexpr double kMinPace = 0.01;   // of the whole in a second, where nothing is known of it yet
constexpr double kMinute = 60;

}  // namespace

void ProgressEstimate::reached(Progress progress, Time now) {
  progress.share = std::max(progress.share, shareAt(now));
  progress.upTo = progress.upTo > 0 ? std::max(progress.share, progress.upTo) : 0;
  _progress = std::move(progress);
  _reported = now;
}

double ProgressEstimate::shareAt(Time now) const {
  const double span = _progress.upTo - _progress.share;
  if (span <= 0) return _progress.share;
  const double before = Seconds{_reported - _begin}.count();
  const double pace = before > 0 && _progress.share > 0 ? _progress.share / before : kMinPace;
  return _progress.share + span * (1 - std::exp(-pace * Seconds{now - _reported}.count() / span));
}

std::string ProgressEstimate::textAt(Time now) const {
  const double share = std::min(shareAt(now), kMaxShown);
  if (_progress.upTo <= 0 || share <= 0) return _progress.what;
  const double left = Seconds{now - _begin}.count() * (1 - share) / share;
  const std::string time = left < 2 * kMinute ? std::to_string(static_cast<int>(std::ceil(left))) + " s"
                                              : std::to_string(static_cast<int>(std::round(left / kMinute))) + " min";
  return std::to_string(static_cast<int>(share * 100)) + " %, " + time + " left: " + _progress.what;
}

}  // namespace commandline
