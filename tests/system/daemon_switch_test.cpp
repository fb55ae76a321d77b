// The daemon's conversion switch, which the runner obeys.
#include <gtest/gtest.h>

#include <chrono>
#include <string>
#include <thread>

#include "machine.h"
#include "photo_library.h"
#include "platform/velaindex.h"
#include "support/files.h"
#include "support/sandbox.h"

namespace vela_test {
namespace {

constexpr int kPhotos = 15;

class DaemonSwitchTest : public SandboxTest {
 protected:
  static void SetSwitch(const char* value) {
    WriteFile("/etc/velainfo.conf", std::string("disable_convert_photo=\"") + value + "\"\n");
  }

  static int Thumbs(const PhotoLibrary& library) {
    int sum = 0;
    for (const std::string& photo : library.Photos()) {
      sum += StateOf(photo).thumbs;
    }
    return sum;
  }
};

TEST_F(DaemonSwitchTest, StopsTheRunnerUntilItIsChanged) {
  const PhotoLibrary library(kPhotos);
  Machine machine;
  SetSwitch("yes");
  machine.StartDaemon();
  for (const std::string& entry : library.Entries()) {
    EXPECT_EQ(WriteIndexQueue(entry.c_str(), "/var/spool/thumb_create.queue"), 0);
  }
  machine.StartFollowingRunner();
  std::this_thread::sleep_for(std::chrono::seconds(1));
  EXPECT_EQ(Thumbs(library), 0);
  EXPECT_TRUE(Machine::HasQueue());
  SetSwitch("no");
  machine.ReloadDaemon();
  EXPECT_TRUE(WaitUntilGone("/var/spool/thumb_create.queue.tmp", 20000));
  while (Machine::HasQueue() && !HasFailure()) {
    EXPECT_TRUE(WaitUntilGone("/var/spool/thumb_create.queue", 20000));
    EXPECT_TRUE(WaitUntilGone("/var/spool/thumb_create.queue.tmp", 20000));
  }
  EXPECT_EQ(Thumbs(library), (kPhotos - 1) * kThumbsOfAPhoto);
  machine.KillRunner();
  const auto daemon = machine.StopDaemon();
  EXPECT_TRUE(daemon && daemon->exitCode == 0);
}

}  // namespace
}  // namespace vela_test
