// How fast a counter advances.
#include "progress_rate.h"

#include <gtest/gtest.h>

#include <limits>

using namespace vela;

namespace vela_test {
namespace {

using std::chrono::hours;
using std::chrono::milliseconds;
using std::chrono::seconds;

/// A moment so long after some beginning.
ProgressRate::Clock::time_point At(milliseconds time) {
  return ProgressRate::Clock::time_point(hours(1000) + time);
}

TEST(ProgressRateTest, IsUnknownBeforeTheSecondLook) {
  ProgressRate rate;
  EXPECT_FALSE(rate.PerSecond());
  EXPECT_FALSE(rate.TimeLeft(10));
  rate.Note(At(seconds(0)), 5);
  EXPECT_FALSE(rate.PerSecond());
  EXPECT_FALSE(rate.TimeLeft(10));
}

TEST(ProgressRateTest, IsUnknownWhileNoTimeHasPassed) {
  ProgressRate rate;
  rate.Note(At(seconds(1)), 5);
  rate.Note(At(seconds(1)), 9);
  EXPECT_FALSE(rate.PerSecond());
}

TEST(ProgressRateTest, IsWhatWasMadeInTheTime) {
  ProgressRate rate;
  rate.Note(At(seconds(0)), 100);
  rate.Note(At(milliseconds(500)), 101);
  EXPECT_DOUBLE_EQ(rate.PerSecond().value(), 2);
  rate.Note(At(seconds(4)), 110);
  EXPECT_DOUBLE_EQ(rate.PerSecond().value(), 2.5);
}

TEST(ProgressRateTest, IsZeroWhileNothingIsMadeAndTheTimeLeftUnknown) {
  ProgressRate rate;
  rate.Note(At(seconds(0)), 5);
  rate.Note(At(seconds(1)), 5);
  EXPECT_DOUBLE_EQ(rate.PerSecond().value(), 0);
  EXPECT_FALSE(rate.TimeLeft(10));
}

TEST(ProgressRateTest, LooksBackHalfAMinute) {
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

TEST(ProgressRateTest, MeasuresFromTheLookBeforeALongPause) {
  ProgressRate rate;
  rate.Note(At(seconds(0)), 0);
  rate.Note(At(seconds(1000)), 500);
  EXPECT_DOUBLE_EQ(rate.PerSecond().value(), 0.5);
}

TEST(ProgressRateTest, BeginsAnewWhenTheCounterGoesBack) {
  ProgressRate rate;
  rate.Note(At(seconds(0)), 100);
  rate.Note(At(seconds(1)), 200);
  rate.Note(At(seconds(2)), 0);
  EXPECT_FALSE(rate.PerSecond());
  rate.Note(At(seconds(3)), 3);
  EXPECT_DOUBLE_EQ(rate.PerSecond().value(), 3);
}

TEST(ProgressRateTest, TheTimeLeftIsRoundedUp) {
  ProgressRate rate;
  rate.Note(At(seconds(0)), 0);
  rate.Note(At(seconds(10)), 30);
  EXPECT_EQ(rate.TimeLeft(60).value(), seconds(10));
  EXPECT_EQ(rate.TimeLeft(61).value(), seconds(11));
  EXPECT_EQ(rate.TimeLeft(30).value(), seconds(0));
  EXPECT_EQ(rate.TimeLeft(29).value(), seconds(0));
}

TEST(ProgressRateTest, ATimeBeyondAYearIsUnknown) {
  ProgressRate rate;
  rate.Note(At(seconds(0)), 0);
  rate.Note(At(seconds(10)), 10);
  constexpr int kYear = 365 * 24 * 3600;
  EXPECT_EQ(rate.TimeLeft(10 + kYear).value(), seconds(kYear));
  EXPECT_FALSE(rate.TimeLeft(10 + kYear + 1));
}

TEST(ProgressRateTest, TakesTheLargestCounters) {
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
