// The progress line of --watch, and how fast a counter advances.
#include "progress_bar.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <limits>
#include <string>

#include "progress_rate.h"

using namespace vela;

namespace vela_test {
namespace {

using std::chrono::hours;
using std::chrono::milliseconds;
using std::chrono::seconds;

/// A point in time, counted from an arbitrary start.
ProgressRate::Clock::time_point At(milliseconds time) {
  return ProgressRate::Clock::time_point(hours(1000) + time);
}

/// The rate of a counter that is at `completed` and advanced by `made` in `time`.
ProgressRate RateOf(int completed, int made, seconds time) {
  ProgressRate rate;
  rate.Note(At(seconds(0)), completed - made);
  rate.Note(At(time), completed);
  return rate;
}

/// The line about a count of thumbnails.
std::string Line(int completed, int total, int width, const ProgressRate& rate = ProgressRate()) {
  return FormatProgressBar({"thumbnails", {total, completed}}, rate, width);
}

/// The part after the bar.
std::string Rest(const std::string& line) {
  return line.substr(line.find(']') + 1);
}

long FilledPart(const std::string& line) {
  return std::count(line.begin(), line.end(), '#');
}

void ExpectChosen(const ProgressSummary& summary, const char* unit, int total, int completed) {
  const FollowedCount chosen = ChooseCount(summary);
  EXPECT_STREQ(chosen.unit, unit);
  EXPECT_EQ(chosen.count.total, total);
  EXPECT_EQ(chosen.count.completed, completed);
}

TEST(ChosenCount, IsThatOfThePhotosWhenOnlyTheirTotalIsKnown) {
  ExpectChosen({{10, 1}, {60, 6}, {1, 0}}, "thumbnails", 60, 6);
  ExpectChosen({{10, 1}, {0, 6}, {1, 0}}, "photos", 10, 1);
  ExpectChosen({{0, 1}, {0, 6}, {5, 0}}, "thumbnails", 0, 6);
}

TEST(ProgressBarLine, ShowsShareCountsRateAndTimeLeft) {
  const ProgressRate none;
  const struct {
    const char* name;
    int completed;
    int total;
    int width;
    ProgressRate rate;
    const char* rest;
  } cases[] = {
      {"all", 50, 200, 80, RateOf(50, 20, seconds(8)),
       "  25%  50 of 200 thumbnails  2.5/s  1:00 left"},
      {"complete", 200, 200, 80, none, " 100%  200 of 200 thumbnails"},
      {"almost complete", 999, 1000, 80, none, "  99%  999 of 1000 thumbnails"},
      {"largest counters", 2147483646, 2147483647, 80, none,
       "  99%  2147483646 of 2147483647 thumbnails"},
      {"no rate", 1, 4, 60, none, "  25%  1 of 4 thumbnails"},
      {"nothing made", 1, 4, 60, RateOf(1, 0, seconds(5)), "  25%  1 of 4 thumbnails  0.0/s"},
      {"more than the total", 300, 200, 80, none, " 100%  300 of 200 thumbnails"},
      {"negative count", -5, 200, 80, none, "   0%  -5 of 200 thumbnails"},
      {"under an hour", 10, 3609, 90, RateOf(10, 10, seconds(10)),
       "   0%  10 of 3609 thumbnails  1.0/s  59:59 left"},
      {"an hour", 10, 3610, 90, RateOf(10, 10, seconds(10)),
       "   0%  10 of 3610 thumbnails  1.0/s  1:00:00 left"},
      {"many hours", 10, 360075, 90, RateOf(10, 10, seconds(10)),
       "   0%  10 of 360075 thumbnails  1.0/s  100:01:05 left"},
  };
  for (const auto& test : cases) {
    SCOPED_TRACE(test.name);
    const std::string line = Line(test.completed, test.total, test.width, test.rate);
    EXPECT_EQ(Rest(line), test.rest);
    EXPECT_EQ(line.size(), static_cast<size_t>(test.width) - 1);
  }
}

TEST(ProgressBarLine, TheBarIsFilledInProportion) {
  const std::string half = Line(100, 200, 80);
  const std::string full = Line(200, 200, 80);
  const long inner = static_cast<long>(half.find(']')) - 1;
  EXPECT_EQ(FilledPart(Line(0, 200, 80)), 0);
  EXPECT_EQ(FilledPart(Line(-5, 200, 80)), 0);
  EXPECT_EQ(FilledPart(half), inner / 2);
  EXPECT_EQ(FilledPart(full), static_cast<long>(full.find(']')) - 1);
}

TEST(ProgressBarLine, SharesAreExactAndRoundedDown) {
  for (const int percent : {7, 29, 57, 58, 90}) {
    EXPECT_EQ(Rest(Line(percent, 100, 80)).substr(0, 5),
              (percent < 10 ? "   " : "  ") + std::to_string(percent) + "%");
  }
}

TEST(ProgressBarLine, WithoutATotalIsCountAndRate) {
  EXPECT_EQ(Line(12, 0, 80), "12 thumbnails");
  EXPECT_EQ(Line(12, 0, 80, RateOf(12, 3, seconds(2))), "12 thumbnails  1.5/s");
  EXPECT_EQ(FormatProgressBar({"photos", {-3, 12}}, ProgressRate(), 80), "12 photos");
}

TEST(ProgressBarLine, FillsTheTerminalExceptItsLastColumn) {
  for (const int width : {60, 80, 200}) {
    EXPECT_EQ(Line(1, 4, width).size(), static_cast<size_t>(width) - 1);
  }
}

TEST(ProgressBarLine, WithoutRoomForABarHasNoBar) {
  for (const int width : {30, 1, 0}) {
    EXPECT_EQ(Line(1, 4, width), " 25%  1 of 4 thumbnails");
  }
}

TEST(ProgressRateTest, IsUnknownBeforeTheSecondSample) {
  ProgressRate rate;
  EXPECT_FALSE(rate.PerSecond());
  EXPECT_FALSE(rate.TimeLeft(10));
  rate.Note(At(seconds(0)), 5);
  EXPECT_FALSE(rate.PerSecond());
  EXPECT_FALSE(rate.TimeLeft(10));
}

TEST(ProgressRateTest, IsUnknownWhileNoTimeHasPassed) {
  EXPECT_FALSE(RateOf(9, 4, seconds(0)).PerSecond());
}

TEST(ProgressRateTest, IsTheProgressOverTheTime) {
  ProgressRate rate;
  rate.Note(At(seconds(0)), 100);
  rate.Note(At(milliseconds(500)), 101);
  EXPECT_DOUBLE_EQ(rate.PerSecond().value(), 2);
  rate.Note(At(seconds(4)), 110);
  EXPECT_DOUBLE_EQ(rate.PerSecond().value(), 2.5);
}

TEST(ProgressRateTest, WithoutProgressIsZeroAndTheTimeLeftUnknown) {
  const ProgressRate rate = RateOf(5, 0, seconds(1));
  EXPECT_DOUBLE_EQ(rate.PerSecond().value(), 0);
  EXPECT_FALSE(rate.TimeLeft(10));
}

TEST(ProgressRateTest, CoversTheLastHalfMinute) {
  ProgressRate rate;
  for (int second = 0; second <= 60; ++second) {
    rate.Note(At(seconds(second)), second);
  }
  EXPECT_DOUBLE_EQ(rate.PerSecond().value(), 1);
  for (int second = 61; second <= 90; ++second) {
    rate.Note(At(seconds(second)), 60 + (second - 60) * 10);
  }
  EXPECT_DOUBLE_EQ(rate.PerSecond().value(), 10);
  for (int second = 91; second <= 120; ++second) {
    rate.Note(At(seconds(second)), 360);
  }
  EXPECT_DOUBLE_EQ(rate.PerSecond().value(), 0);
}

TEST(ProgressRateTest, CoversALongPauseBetweenTwoSamples) {
  EXPECT_DOUBLE_EQ(RateOf(500, 500, seconds(1000)).PerSecond().value(), 0.5);
}

TEST(ProgressRateTest, RestartsWhenTheCounterGoesBack) {
  ProgressRate rate;
  rate.Note(At(seconds(0)), 100);
  rate.Note(At(seconds(1)), 200);
  rate.Note(At(seconds(2)), 0);
  EXPECT_FALSE(rate.PerSecond());
  rate.Note(At(seconds(3)), 3);
  EXPECT_DOUBLE_EQ(rate.PerSecond().value(), 3);
}

TEST(ProgressRateTest, TheTimeLeftIsRoundedUp) {
  const ProgressRate rate = RateOf(30, 30, seconds(10));
  EXPECT_EQ(rate.TimeLeft(60).value(), seconds(10));
  EXPECT_EQ(rate.TimeLeft(61).value(), seconds(11));
  EXPECT_EQ(rate.TimeLeft(30).value(), seconds(0));
  EXPECT_EQ(rate.TimeLeft(29).value(), seconds(0));
}

TEST(ProgressRateTest, ATimeBeyondAYearIsUnknown) {
  const ProgressRate rate = RateOf(10, 10, seconds(10));
  constexpr int kYear = 365 * 24 * 3600;
  EXPECT_EQ(rate.TimeLeft(10 + kYear).value(), seconds(kYear));
  EXPECT_FALSE(rate.TimeLeft(10 + kYear + 1));
}

TEST(ProgressRateTest, AcceptsTheLargestCounters) {
  constexpr int kLowest = std::numeric_limits<int>::min();
  constexpr int kHighest = std::numeric_limits<int>::max();
  ProgressRate rate;
  rate.Note(At(seconds(0)), kLowest);
  rate.Note(At(seconds(1)), kLowest + 4096);
  EXPECT_DOUBLE_EQ(rate.PerSecond().value(), 4096);
  EXPECT_EQ(rate.TimeLeft(kHighest).value(), seconds(1048575));
  rate.Note(At(seconds(2)), kHighest);
  EXPECT_DOUBLE_EQ(rate.PerSecond().value(), 4294967295.0 / 2);
}

}  // namespace
}  // namespace vela_test
