// The error of the last platform failure, and messages to the system log.
#include <syslog.h>

#include "platform/platform_fixture.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

class ErrorState : public SandboxTest {
 protected:
  static int Examine(const char* path) {
    VLIBCFileStatus status;
    return VLIBCFileStat(path, 9, &status);
  }
};

TEST_F(ErrorState, HoldsTheCodeOfTheLastFailure) {
  ASSERT_EQ(Examine("/tmp/absent"), -1);
  EXPECT_EQ(VLIBCErrGet(), ENOENT);

  char value[8];
  ASSERT_EQ(VLIBCFileGetKeyValue("/tmp", "key", value, sizeof(value), 0), -1);
  EXPECT_EQ(VLIBCErrGet(), EISDIR);
}

TEST_F(ErrorState, NamesTheSourceFileWithoutItsDirectory) {
  ASSERT_EQ(Examine("/tmp/absent"), -1);
  EXPECT_STREQ(VLIBCErrorGetFile(), "file_status.cpp");
  EXPECT_GT(VLIBCErrorGetLine(), 0);

  char directory[64];
  ASSERT_EQ(VELAEADirPath(0, "", directory, sizeof(directory)), -1);
  EXPECT_STREQ(VLIBCErrorGetFile(), "metadata_files.cpp");
}

TEST_F(ErrorState, StaysAfterASuccess) {
  ASSERT_EQ(Examine("/tmp/absent"), -1);
  const int line = VLIBCErrorGetLine();
  ASSERT_EQ(Examine("/tmp"), 0);
  EXPECT_EQ(VLIBCErrGet(), ENOENT);
  EXPECT_EQ(VLIBCErrorGetLine(), line);
}

TEST_F(ErrorState, IsEmptyInAThreadWithoutFailure) {
  ASSERT_EQ(Examine("/tmp/absent"), -1);
  int code = -1;
  int line = -1;
  std::string file = "unset";
  std::thread([&] {
    code = VLIBCErrGet();
    line = VLIBCErrorGetLine();
    file = VLIBCErrorGetFile();
  }).join();
  EXPECT_EQ(code, 0);
  EXPECT_EQ(line, 0);
  EXPECT_EQ(file, "");
}

TEST_F(ErrorState, IsNotTouchedByFailuresOfOtherThreads) {
  ASSERT_EQ(Examine("/tmp/absent"), -1);
  std::thread([] { Examine("/dev/null/below"); }).join();
  EXPECT_EQ(VLIBCErrGet(), ENOENT);
}

using SystemLog = SandboxTest;

TEST_F(SystemLog, TakesFormattedLinesAtTheGivenPriority) {
  AppLogError(LOG_ERR, "%s:%d failed at 100%%", "velathumb", 7);
  AppLogError(LOG_INFO, "as it is");
  const auto messages = LogMessages();
  ASSERT_EQ(messages.size(), 2U);
  EXPECT_EQ(messages[0].priority, LOG_ERR);
  EXPECT_EQ(messages[0].text, "velathumb:7 failed at 100%");
  EXPECT_EQ(messages[1].priority, LOG_INFO);
  EXPECT_EQ(messages[1].text, "as it is");
}

}  // namespace
}  // namespace vela_test
