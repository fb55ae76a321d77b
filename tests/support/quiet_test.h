// Tests that check everything that is logged.
#pragma once

#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "support/sandbox.h"
#include "support/system_log.h"

namespace vela_test {

/// A test in the sandbox that fails when the system log contains lines that TakeErrorLines has not
/// returned.
class QuietTest : public SandboxTest {
 protected:
  void TearDown() override { EXPECT_THAT(ErrorLines(), ::testing::IsEmpty()) << "unexpected log"; }

  /// The lines that have been logged since the last call, as ErrorLines gives them.
  static std::vector<std::string> TakeErrorLines() {
    std::vector<std::string> lines = ErrorLines();
    ClearLog();
    return lines;
  }
};

}  // namespace vela_test
