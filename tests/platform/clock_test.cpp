#include "platform/linux/device/device_services.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <random>

#include "tests/support/fake_platform.h"

namespace tests {
namespace {

using namespace std::chrono;

// The migration report's pattern: week-based year, month, day, hour, month again, tenths of a second.
constexpr std::string_view reportPattern = "Y-M-d-H-M-S";

struct Moment {
  const char* zone;
  sys_days day;
  milliseconds timeOfDay;
  const char* text;
};

platform::Result<std::string> shown(const Moment& moment, std::string_view pattern = reportPattern) {
  ::setenv("TZ", moment.zone, 1);
  const platform::Instant instant = moment.day + moment.timeOfDay;
  return platform::makeClock([instant] { return instant; })->currentLocalTime(pattern);
}

TEST(Clock, ShowsTheReportsPattern) {
  const Moment cases[] = {
      {"UTC", 2011y / 10 / 12, 9h + 41min + 7s + 555ms, "2011-10-12-9-10-5"},
      {"UTC", 2011y / 1 / 2, 0ms, "2011-1-2-0-1-0"},
      {"UTC", 2011y / 7 / 3, 23h + 59min + 59s + 999ms, "2011-7-3-23-7-9"},
  };
  for (const Moment& moment : cases) EXPECT_EQ(shown(moment), moment.text);
}

TEST(Clock, CountsTheYearByWeeksAtItsEnds) {
  const Moment cases[] = {
      {"UTC", 2011y / 12 / 31, 12h, "2011-12-31-12-12-0"},  // a Saturday: the week's last day
      {"UTC", 2012y / 1 / 1, 12h, "2012-1-1-12-1-0"},      {"UTC", 2012y / 12 / 29, 12h, "2012-12-29-12-12-0"},
      {"UTC", 2012y / 12 / 30, 12h, "2013-12-30-12-12-0"},  // a Sunday: this week already holds the first of January
      {"UTC", 2012y / 12 / 31, 12h, "2013-12-31-12-12-0"}, {"UTC", 2014y / 12 / 28, 12h, "2015-12-28-12-12-0"},
      {"UTC", 2016y / 1 / 1, 12h, "2016-1-1-12-1-0"},
  };
  for (const Moment& moment : cases) EXPECT_EQ(shown(moment), moment.text);
}

TEST(Clock, ShowsTheLocalTime) {
  const sys_days day = 2011y / 6 / 30;
  EXPECT_EQ(shown({"America/Los_Angeles", day, 3h, ""}), "2011-6-29-20-6-0");
  EXPECT_EQ(shown({"Asia/Tokyo", day, 22h, ""}), "2011-7-1-7-7-0");
  EXPECT_EQ(shown({"Europe/Berlin", day, 3h, ""}), "2011-6-30-5-6-0");
}

// A quote more, and it is no pattern of plain numbers: what is shown then comes from ICU.
TEST(Clock, ShowsPlainNumbersAsItShowsThemAmongOthers) {
  std::mt19937_64 random{20'261};
  std::uniform_int_distribution<std::int64_t> milliseconds{0, std::int64_t{51} * 365 * 24 * 3'600 * 1'000};
  for (const char* const zone :
       {"UTC", "America/Los_Angeles", "Europe/Berlin", "Asia/Kathmandu", "Australia/Lord_Howe"}) {
    for (int time = 0; time < 300; ++time) {
      const Moment moment{zone, sys_days{}, std::chrono::milliseconds{milliseconds(random)}, ""};
      EXPECT_EQ(shown(moment).valueOr("none") + "'", shown(moment, "Y-M-d-H-M-S''").valueOr(""))
          << zone << " " << moment.timeOfDay.count();
    }
  }
}

TEST(Clock, CountsByTheGregorianCalendarAtAllTimes) {
  EXPECT_EQ(shown({"UTC", 1500y / 3 / 1, 0ms, ""}, "y-M-d"), "1500-3-1");
  EXPECT_EQ(shown({"UTC", 1582y / 10 / 10, 0ms, ""}, "y-M-d"), "1582-10-10");
}

TEST(Clock, SpeaksOneLanguageWhateverTheUsers) {
  ::setenv("LC_ALL", "ar_EG.UTF-8", 1);
  EXPECT_EQ(shown({"UTC", 2011y / 10 / 12, 9h, ""}, "y MMMM EEEE"), "2011 October Wednesday");
}

TEST(Clock, SaysThatAPatternIsNone) {
  EXPECT_EQ(shown({"UTC", 2011y / 10 / 12, 9h, ""}, "invalid: bfnjIJlNoPpRtTU").cause(), platform::Cause::unsuitable);
}

TEST(Clock, ShowsNothingForAnEmptyPattern) { EXPECT_EQ(shown({"UTC", 2011y / 10 / 12, 9h, ""}, ""), ""); }

TEST(Clock, GoesWithTheSystems) {
  const auto before = system_clock::now();
  const std::string time = platform::makeClock()->currentLocalTime("A").valueOr("");
  EXPECT_FALSE(time.empty());
  const auto year = year_month_day{floor<days>(before)}.year();
  EXPECT_NEAR(std::stoi(platform::makeClock()->currentLocalTime("y").valueOr("0")), static_cast<int>(year), 1);
}

TEST(Clock, OfATestShowsWhatTheTestSays) {
  FakeClock clock;
  clock.time = "2011-10-12-9-10-5";
  EXPECT_EQ(clock.currentLocalTime(reportPattern), "2011-10-12-9-10-5");
}

}  // namespace
}  // namespace tests
