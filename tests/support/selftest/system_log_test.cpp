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
  ASSERT_EQ(messages.size(), 1U);
  EXPECT_EQ(messages[0].priority, LOG_ERR);
  EXPECT_EQ(messages[0].facility, LOG_DAEMON);
  EXPECT_EQ(messages[0].identity, "tester[" + std::to_string(getpid()) + "]");
  EXPECT_EQ(messages[0].text, "name:404 [Error] opendir: /a: b");
  EXPECT_EQ(messages[0].pid, getpid());
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
  ASSERT_EQ(RunProgram("/usr/bin/logger", {"-p", "user.err", "-t", "other", "hello"}).exitCode, 0);
  const std::vector<LogMessage> messages = LogMessages();
  ASSERT_EQ(messages.size(), 1U);
  EXPECT_EQ(messages[0].identity, "other");
  EXPECT_EQ(messages[0].text, "hello");
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
  constexpr int kMessages = 200;
  std::vector<std::string> expected;
  for (int number = 0; number < kMessages; ++number) expected.push_back(std::to_string(number));
  std::vector<pid_t> children;
  for (int i = 0; i < 5; ++i) {
    children.push_back(fork());
    if (children.back() == 0) {
      for (const std::string& text : expected) syslog(LOG_ERR, "%s", text.c_str());
      _exit(0);
    }
  }
  for (const pid_t child : children) waitpid(child, nullptr, 0);
  std::map<pid_t, std::vector<std::string>> byProcess;
  for (const LogMessage& message : LogMessages()) byProcess[message.pid].push_back(message.text);
  ASSERT_EQ(byProcess.size(), 5U);
  for (const pid_t child : children) EXPECT_EQ(byProcess[child], expected);
}

}  // namespace
}  // namespace vela_test
