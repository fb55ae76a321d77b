// The time until which conversion is paused.
#include <sys/stat.h>
#include <sys/time.h>

#include <cerrno>
#include <cstdio>
#include <ctime>

#include "progress/velamk_progress.h"
#include "support/files.h"
#include "support/privileges.h"
#include "support/quiet_test.h"

namespace vela_test {
namespace {

using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::Ge;
using ::testing::Le;

constexpr const char* kSettings = "/etc/velainfo.conf";

class ResumeTime : public QuietTest {
 protected:
  static void Store(const std::string& value) {
    WriteFile(kSettings, "thumb_conv_resume_time=\"" + value + "\"\n");
  }
  static void Store(long value) { Store(std::to_string(value)); }

  /// The wait, which is in whole seconds.
  static long Wait() {
    timeval wait = {-77, -77};
    EXPECT_EQ(GetThumbConvResumeWait(&wait), 0);
    EXPECT_EQ(wait.tv_usec, 0);
    return wait.tv_sec;
  }

  static std::string FailedReadLine(int error) {
    char line[128];
    std::snprintf(line, sizeof line,
                  "velamk_progress:176 VLIBCFileGetKeyValue(thumb_conv_resume_time) failed, "
                  "velaerr=0x%04X",
                  static_cast<unsigned>(error));
    return line;
  }

  /// Reads the time, which fails with this error.
  static void ExpectFailedRead(int error) {
    EXPECT_EQ(GetThumbConvResumeTime(), 0);
    EXPECT_THAT(TakeErrorLines(), ElementsAre(FailedReadLine(error)));
  }
};

TEST_F(ResumeTime, IsTheStoredTime) {
  WriteFile(kSettings, "thumb_conv_paused=\"1\"\nthumb_conv_resume_time=\"1700000000\"\n");
  EXPECT_EQ(GetThumbConvResumeTime(), 1700000000);
  WriteFile(kSettings, "thumb_conv_paused=\"1\"\n");
  EXPECT_EQ(GetThumbConvResumeTime(), 0);
}

TEST_F(ResumeTime, IsReadAsALeadingNumber) {
  const struct {
    std::string value;
    time_t time;
  } cases[] = {{"", 0},
               {"abc", 0},
               {"12abc", 12},
               {"-5", -5},
               {"010", 10},
               {"1099511627776", 1099511627776},  // after 2038
               {std::string(1022, '0') + "5", 5},
               {std::string(1023, '0') + "5", 0}};  // truncated at the buffer
  for (const auto& c : cases) {
    Store(c.value);
    EXPECT_EQ(GetThumbConvResumeTime(), c.time) << c.value;
  }
}

TEST_F(ResumeTime, AFailedReadIsLoggedWithItsError) {
  RemoveTree(kSettings);
  ExpectFailedRead(ENOENT);
  MakeDirectories(kSettings);
  ExpectFailedRead(EISDIR);
  RemoveTree(kSettings);
  Store(5);
  ASSERT_EQ(chmod(kSettings, 0), 0);
  const WithoutCapabilities ordinary;
  ExpectFailedRead(EACCES);
}

TEST_F(ResumeTime, AFailedReadCountsAsReached) {
  RemoveTree(kSettings);
  EXPECT_EQ(IsThumbConvResumeTimeReached(), 1);
  EXPECT_EQ(Wait(), 0);
  EXPECT_THAT(TakeErrorLines(), ElementsAre(FailedReadLine(ENOENT), FailedReadLine(ENOENT)));
}

TEST_F(ResumeTime, IsReachedUnlessItIsAheadOrNegative) {
  WriteFile(kSettings, "");
  EXPECT_EQ(IsThumbConvResumeTimeReached(), 1);
  for (const long reached : {0L, 1700000000L, static_cast<long>(std::time(nullptr))}) {
    Store(reached);
    EXPECT_EQ(IsThumbConvResumeTimeReached(), 1) << reached;
  }
  for (const long notReached : {-5L, -1L, std::time(nullptr) + 30L, 1099511627776L}) {
    Store(notReached);
    EXPECT_EQ(IsThumbConvResumeTimeReached(), 0) << notReached;
  }
}

TEST_F(ResumeTime, TheWaitIsTheTimeLeft) {
  const long before = std::time(nullptr);
  Store(before + 1000);
  const long wait = Wait();
  const long after = std::time(nullptr);
  EXPECT_THAT(wait, AllOf(Le(1000), Ge(1000 - (after - before))));
}

TEST_F(ResumeTime, TheWaitForAPastTimeIsZero) {
  Store(std::time(nullptr) - 5);
  EXPECT_EQ(Wait(), 0);
  Store(-5);
  EXPECT_EQ(Wait(), 0);
  WriteFile(kSettings, "");
  EXPECT_EQ(Wait(), 0);
}

}  // namespace
}  // namespace vela_test
