// The recorder of the system log.
#include "support/system_log.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <syslog.h>
#include <unistd.h>

#include <map>

#include "support/program.h"
#include "support/sandbox.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

class SystemLogTest : public SandboxTest {};

TEST_F(SystemLogTest, RecordsPriorityIdentityAndText) {
  openlog("tester", LOG_PID, LOG_DAEMON);
  syslog(LOG_ERR, "%s:%d [Error] opendir: %s", "name", 404, "/a: b");
  closelog();
  const std::vector<LogMessage> messages = LogMessages();
  ASSERT_EQ(1U, messages.size());
  EXPECT_EQ(LOG_ERR, messages[0].priority);
  EXPECT_EQ(LOG_DAEMON, messages[0].facility);
  EXPECT_EQ("tester[" + std::to_string(getpid()) + "]", messages[0].identity);
  EXPECT_EQ("name:404 [Error] opendir: /a: b", messages[0].text);
  EXPECT_EQ(getpid(), messages[0].pid);
  openlog(nullptr, 0, LOG_USER);
}

TEST_F(SystemLogTest, ErrorLinesShowAnyOtherPriority) {
  syslog(LOG_ERR, "one");
  syslog(LOG_INFO, "two\n");
  syslog(LOG_ERR, "three\n");
  EXPECT_THAT(ErrorLines(), ElementsAre("one", "<6> two\n", "three\n"));
}

TEST_F(SystemLogTest, StartsEmptyAndCanBeCleared) {
  EXPECT_THAT(LogMessages(), IsEmpty());
  syslog(LOG_ERR, "one");
  ClearLog();
  EXPECT_THAT(LogMessages(), IsEmpty());
  syslog(LOG_ERR, "two");
  EXPECT_THAT(ErrorLines(), ElementsAre("two"));
}

TEST_F(SystemLogTest, LongMessagesAreKeptWhole) {
  const std::string text(20000, 'x');
  syslog(LOG_ERR, "%s", text.c_str());
  EXPECT_THAT(ErrorLines(), ElementsAre(text));
}

TEST_F(SystemLogTest, RecordsOtherPrograms) {
  ASSERT_EQ(0, RunProgram("/usr/bin/logger", {"-p", "user.err", "-t", "other", "hello"}).exitCode);
  const std::vector<LogMessage> messages = LogMessages();
  ASSERT_EQ(1U, messages.size());
  EXPECT_EQ("other", messages[0].identity);
  EXPECT_EQ("hello", messages[0].text);
}

TEST_F(SystemLogTest, OpenConnectionSurvivesAReset) {
  syslog(LOG_ERR, "before");
  ResetSandbox();
  syslog(LOG_ERR, "after");
  EXPECT_THAT(ErrorLines(), ElementsAre("after"));
}

TEST_F(SystemLogTest, RemovedSocketIsRestored) {
  unlink("/dev/log");
  ResetSandbox();
  closelog();
  syslog(LOG_ERR, "after");
  EXPECT_THAT(ErrorLines(), ElementsAre("after"));
}

TEST_F(SystemLogTest, SeveralProcessesLoseNothingAndKeepTheirOrder) {
  constexpr int kProcesses = 5;
  constexpr int kMessages = 200;
  std::vector<pid_t> children;
  for (int i = 0; i < kProcesses; ++i) {
    const pid_t child = fork();
    if (child == 0) {
      for (int number = 0; number < kMessages; ++number) {
        syslog(LOG_ERR, "%d", number);
      }
      _exit(0);
    }
    children.push_back(child);
  }
  for (const pid_t child : children) {
    waitpid(child, nullptr, 0);
  }
  std::map<pid_t, std::vector<std::string>> byProcess;
  for (const LogMessage& message : LogMessages()) {
    byProcess[message.pid].push_back(message.text);
  }
  std::vector<std::string> expected;
  expected.reserve(kMessages);
  for (int number = 0; number < kMessages; ++number) {
    expected.push_back(std::to_string(number));
  }
  ASSERT_EQ(static_cast<size_t>(kProcesses), byProcess.size());
  for (const pid_t child : children) {
    EXPECT_EQ(expected, byProcess[child]);
  }
}

}  // namespace
}  // namespace vela_test
