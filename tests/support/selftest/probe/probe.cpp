// A test program whose results the sandbox's own tests look at from outside.
#include <gtest/gtest.h>
#include <signal.h>
#include <unistd.h>

namespace {

TEST(Probe, Passes) {
  EXPECT_EQ(2, getpid());
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
