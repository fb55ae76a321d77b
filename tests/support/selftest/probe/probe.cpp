// A test program that the sandbox's own tests run and whose results they check.
#include <gtest/gtest.h>
#include <signal.h>
#include <unistd.h>

namespace {

TEST(Probe, Passes) {
  EXPECT_EQ(getpid(), 2);
}

TEST(Probe, Fails) {
  ADD_FAILURE() << "as planned";
}

TEST(Probe, IsKilled) {
  raise(SIGKILL);
}

TEST(Probe, Sleeps) {
  for (;;) {
    pause();
  }
}

}  // namespace
