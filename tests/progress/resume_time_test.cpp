// The time until which conversion rests.
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <sys/time.h>

#include <cerrno>
#include <cstdio>
#include <ctime>
#include <string>

#include "progress/velamk_progress.h"
#include "support/files.h"
#include "support/privileges.h"
#include "support/sandbox.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::Ge;
using ::testing::IsEmpty;
using ::testing::Le;

constexpr const char* kSettings = "/etc/velainfo.conf";

class ResumeTime : public SandboxTest {
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

  /// Reads the time, which fails with this error.
  static void ExpectFailedRead(int error) {
    char line[128];
    std::snprintf(line, sizeof line,
                  "velamk_progress:176 VLIBCFileGetKeyValue(thumb_conv_resume_time) failed, "
                  "velaerr=0x%04X",
                  static_cast<unsigned>(error));
    ClearLog();
    EXPECT_EQ(GetThumbConvResumeTime(), 0);
    EXPECT_THAT(ErrorLines(), ElementsAre(line));
  }
};

TEST_F(ResumeTime, IsTheStoredTime) {
  WriteFile(kSettings, "thumb_conv_paused=\"1\"\nthumb_conv_resume_time=\"1700000000\"\n");
  EXPECT_EQ(GetThumbConvResumeTime(), 1700000000);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(ResumeTime, IsZeroWhenNoneIsStored) {
  WriteFile(kSettings, "thumb_conv_paused=\"1\"\n");
  EXPECT_EQ(GetThumbConvResumeTime(), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(ResumeTime, IsReadAsALeadingNumber) {
  Store("");
  EXPECT_EQ(GetThumbConvResumeTime(), 0);
  Store("abc");
  EXPECT_EQ(GetThumbConvResumeTime(), 0);
  Store("12abc");
  EXPECT_EQ(GetThumbConvResumeTime(), 12);
  Store("-5");
  EXPECT_EQ(GetThumbConvResumeTime(), -5);
  Store("010");
  EXPECT_EQ(GetThumbConvResumeTime(), 10);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(ResumeTime, GoesBeyondTheYear2038) {
  Store("1099511627776");
  EXPECT_EQ(GetThumbConvResumeTime(), 1099511627776);
  EXPECT_EQ(IsThumbConvResumeTimeReached(), 0);
}

TEST_F(ResumeTime, IsReadUpToAThousandCharacters) {
  Store(std::string(1022, '0') + "5");
  EXPECT_EQ(GetThumbConvResumeTime(), 5);
  Store(std::string(1023, '0') + "5");
  EXPECT_EQ(GetThumbConvResumeTime(), 0);
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
}

TEST_F(ResumeTime, AMissingTimeIsReached) {
  WriteFile(kSettings, "");
  EXPECT_EQ(IsThumbConvResumeTimeReached(), 1);
}

TEST_F(ResumeTime, APastTimeIsReached) {
  Store(0);
  EXPECT_EQ(IsThumbConvResumeTimeReached(), 1);
  Store(1700000000);
  EXPECT_EQ(IsThumbConvResumeTimeReached(), 1);
}

TEST_F(ResumeTime, TheCurrentSecondIsReached) {
  Store(std::time(nullptr));
  EXPECT_EQ(IsThumbConvResumeTimeReached(), 1);
}

TEST_F(ResumeTime, ATimeAheadIsNotReached) {
  Store(std::time(nullptr) + 30);
  EXPECT_EQ(IsThumbConvResumeTimeReached(), 0);
}

TEST_F(ResumeTime, ANegativeTimeIsNeverReached) {
  Store(-5);
  EXPECT_EQ(IsThumbConvResumeTimeReached(), 0);
  Store(-1);
  EXPECT_EQ(IsThumbConvResumeTimeReached(), 0);
}

TEST_F(ResumeTime, TheWaitIsTheTimeLeft) {
  const long before = std::time(nullptr);
  Store(before + 1000);
  const long wait = Wait();
  const long after = std::time(nullptr);
  EXPECT_THAT(wait, AllOf(Le(1000), Ge(1000 - (after - before))));
}

TEST_F(ResumeTime, TheWaitForATimeOfThePastIsZero) {
  Store(std::time(nullptr) - 5);
  EXPECT_EQ(Wait(), 0);
  Store(-5);
  EXPECT_EQ(Wait(), 0);
  WriteFile(kSettings, "");
  EXPECT_EQ(Wait(), 0);
}

}  // namespace
}  // namespace vela_test
