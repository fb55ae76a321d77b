// The platform's way to the system log.
#include <syslog.h>

#include <string>
#include <vector>

#include "platform/velaindex.h"
#include "support/sandbox.h"
#include "support/system_log.h"

namespace {

using SystemLog = vela_test::SandboxTest;

TEST_F(SystemLog, TakesFormattedLinesAtTheGivenPriority) {
  AppLogError(LOG_ERR, "%s:%d failed at 100%%", "velathumb", 7);
  AppLogError(LOG_INFO, "as it is");
  const auto messages = vela_test::LogMessages();
  ASSERT_EQ(messages.size(), 2U);
  EXPECT_EQ(messages[0].priority, LOG_ERR);
  EXPECT_EQ(messages[0].text, "velathumb:7 failed at 100%");
  EXPECT_EQ(messages[1].priority, LOG_INFO);
  EXPECT_EQ(messages[1].text, "as it is");
}

}  // namespace
