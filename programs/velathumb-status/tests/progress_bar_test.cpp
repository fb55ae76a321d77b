// The line that shows how far the conversion has come.
#include "progress_bar.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <string>

using namespace vela;

namespace vela_test {
namespace {

using std::chrono::hours;
using std::chrono::seconds;

/// A counter that made `made` in `time` and now stands at `completed`.
ProgressRate RateOf(int completed, int made, seconds time) {
  const ProgressRate::Clock::time_point begin(hours(1000));
  ProgressRate rate;
  rate.Note(begin, completed - made);
  rate.Note(begin + time, completed);
  return rate;
}

FollowedCount Thumbnails(int completed, int total) {
  return {"thumbnails", {total, completed}};
}

/// What stands behind the bar.
std::string Rest(const std::string& line) {
  return line.substr(line.find(']') + 1);
}

long FilledPart(const std::string& line) {
  return std::count(line.begin(), line.end(), '#');
}

TEST(ChosenCount, IsThatOfTheThumbnails) {
  const FollowedCount count = ChooseCount({{10, 1}, {60, 6}, {1, 0}});
  EXPECT_STREQ(count.unit, "thumbnails");
  EXPECT_EQ(count.count.total, 60);
  EXPECT_EQ(count.count.completed, 6);
}

TEST(ChosenCount, IsThatOfThePhotosWhenOnlyTheirTotalIsKnown) {
  const FollowedCount count = ChooseCount({{10, 1}, {0, 6}, {1, 0}});
  EXPECT_STREQ(count.unit, "photos");
  EXPECT_EQ(count.count.total, 10);
  EXPECT_EQ(count.count.completed, 1);
}

TEST(ChosenCount, IsThatOfTheThumbnailsWithoutAnyTotal) {
  const FollowedCount count = ChooseCount({{0, 1}, {0, 6}, {5, 0}});
  EXPECT_STREQ(count.unit, "thumbnails");
  EXPECT_EQ(count.count.completed, 6);
}

TEST(ProgressBarLine, HasShareCountsRateAndTimeLeft) {
  const std::string line = FormatProgressBar(Thumbnails(50, 200), RateOf(50, 20, seconds(8)), 80);
  EXPECT_EQ(Rest(line), "  25%  50 of 200 thumbnails  2.5/s  1:00 left");
  EXPECT_EQ(line.size(), 79U);
}

TEST(ProgressBarLine, TheBarIsFilledAsFarAsTheShare) {
  const ProgressRate none;
  const std::string empty = FormatProgressBar(Thumbnails(0, 200), none, 80);
  const std::string half = FormatProgressBar(Thumbnails(100, 200), none, 80);
  const std::string full = FormatProgressBar(Thumbnails(200, 200), none, 80);
  EXPECT_EQ(FilledPart(empty), 0);
  const long inner = static_cast<long>(half.find(']')) - 1;
  EXPECT_EQ(FilledPart(half), inner / 2);
  EXPECT_EQ(FilledPart(full), static_cast<long>(full.find(']')) - 1);
  EXPECT_EQ(Rest(full), " 100%  200 of 200 thumbnails");
}

TEST(ProgressBarLine, SharesAreExactAndRoundedDown) {
  for (const int percent : {7, 29, 57, 58, 90}) {
    EXPECT_EQ(Rest(FormatProgressBar(Thumbnails(percent, 100), ProgressRate(), 80)).substr(0, 5),
              (percent < 10 ? "   " : "  ") + std::to_string(percent) + "%");
  }
  EXPECT_EQ(Rest(FormatProgressBar(Thumbnails(2147483646, 2147483647), ProgressRate(), 80)),
            "  99%  2147483646 of 2147483647 thumbnails");
}

TEST(ProgressBarLine, NeverShowsTheWholeBeforeTheEnd) {
  EXPECT_EQ(Rest(FormatProgressBar(Thumbnails(999, 1000), ProgressRate(), 80)),
            "  99%  999 of 1000 thumbnails");
}

TEST(ProgressBarLine, WithoutARateShowsNeitherRateNorTimeLeft) {
  EXPECT_EQ(Rest(FormatProgressBar(Thumbnails(1, 4), ProgressRate(), 60)),
            "  25%  1 of 4 thumbnails");
}

TEST(ProgressBarLine, WhileNothingIsMadeShowsTheRateOnly) {
  EXPECT_EQ(Rest(FormatProgressBar(Thumbnails(1, 4), RateOf(1, 0, seconds(5)), 60)),
            "  25%  1 of 4 thumbnails  0.0/s");
}

TEST(ProgressBarLine, WithoutATotalIsCountAndRate) {
  EXPECT_EQ(FormatProgressBar(Thumbnails(12, 0), ProgressRate(), 80), "12 thumbnails");
  EXPECT_EQ(FormatProgressBar(Thumbnails(12, 0), RateOf(12, 3, seconds(2)), 80),
            "12 thumbnails  1.5/s");
}

TEST(ProgressBarLine, WithANegativeTotalIsCountAndRate) {
  EXPECT_EQ(FormatProgressBar({"photos", {-3, 12}}, ProgressRate(), 80), "12 photos");
}

TEST(ProgressBarLine, CountersThatDisagreeStayInsideTheBar) {
  const std::string over = FormatProgressBar(Thumbnails(300, 200), ProgressRate(), 80);
  EXPECT_EQ(Rest(over), " 100%  300 of 200 thumbnails");
  EXPECT_EQ(over.size(), 79U);
  const std::string under = FormatProgressBar(Thumbnails(-5, 200), ProgressRate(), 80);
  EXPECT_EQ(FilledPart(under), 0);
  EXPECT_EQ(Rest(under), "   0%  -5 of 200 thumbnails");
}

TEST(ProgressBarLine, FillsTheTerminalButItsLastColumn) {
  for (const int width : {60, 80, 200}) {
    EXPECT_EQ(FormatProgressBar(Thumbnails(1, 4), ProgressRate(), width).size(),
              static_cast<size_t>(width) - 1);
  }
}

TEST(ProgressBarLine, WithoutRoomForABarHasNone) {
  for (const int width : {30, 1, 0}) {
    EXPECT_EQ(FormatProgressBar(Thumbnails(1, 4), ProgressRate(), width),
              " 25%  1 of 4 thumbnails");
  }
}

TEST(ProgressBarLine, LongTimesHaveHours) {
  EXPECT_EQ(Rest(FormatProgressBar(Thumbnails(10, 3609), RateOf(10, 10, seconds(10)), 90)),
            "   0%  10 of 3609 thumbnails  1.0/s  59:59 left");
  EXPECT_EQ(Rest(FormatProgressBar(Thumbnails(10, 3610), RateOf(10, 10, seconds(10)), 90)),
            "   0%  10 of 3610 thumbnails  1.0/s  1:00:00 left");
  EXPECT_EQ(Rest(FormatProgressBar(Thumbnails(10, 360075), RateOf(10, 10, seconds(10)), 90)),
            "   0%  10 of 360075 thumbnails  1.0/s  100:01:05 left");
}

}  // namespace
}  // namespace vela_test
