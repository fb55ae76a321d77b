// Children that remain part of the calling program.
#include "posix/child_process.h"

#include <gmock/gmock.h>
#include <signal.h>
#include <sys/prctl.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>
#include <filesystem>
#include <fstream>
#include <string>

using namespace vela;

namespace vela_test {
namespace {

using ::testing::Optional;

/// Starts `program` with these arguments.
pid_t StartAttached(std::string program, std::string first, std::string second = "") {
  char* const arguments[] = {program.data(), first.data(), second.empty() ? nullptr : second.data(),
                             nullptr};
  pid_t pid = 0;
  EXPECT_EQ(StartAttachedChild(program.c_str(), arguments, pid), 0);
  return pid;
}

/// Starts a program that changes none of its signals.
pid_t StartSleep() {
  return StartAttached("/bin/sleep", "60");
}

pid_t StartShell(const std::string& command) {
  return StartAttached("/bin/sh", "-c", command);
}

/// Returns a set of signals from the status file of a process, signal 1 in the lowest bit.
uint64_t SignalSet(pid_t pid, const std::string& name) {
  std::ifstream status("/proc/" + std::to_string(pid) + "/status");
  for (std::string line; std::getline(status, line);) {
    if (line.rfind(name + ":", 0) == 0)
      return std::stoull(line.substr(name.size() + 1), nullptr, 16);
  }
  ADD_FAILURE() << "no " << name;
  return 0;
}

std::string OpenFile(const std::string& process, int descriptor) {
  return std::filesystem::read_symlink("/proc/" + process + "/fd/" + std::to_string(descriptor));
}

TEST(AttachedChild, KeepsStreamsAndProcessGroupOfItsParent) {
  const pid_t child = StartSleep();
  EXPECT_EQ(getpgid(child), getpgrp());
  for (const int descriptor : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
    EXPECT_EQ(OpenFile(std::to_string(child), descriptor), OpenFile("self", descriptor));
  }
  TerminateChild(child);
  ReapChild(child);
}

TEST(AttachedChild, KeepsIgnoredSignalsButHasNoneBlocked) {
  const auto oldHandler = signal(SIGHUP, SIG_IGN);
  sigset_t blocked;
  sigset_t oldSet;
  sigemptyset(&blocked);
  sigaddset(&blocked, SIGUSR1);
  sigprocmask(SIG_BLOCK, &blocked, &oldSet);
  const pid_t child = StartSleep();
  EXPECT_NE(SignalSet(child, "SigIgn") & 1U << (SIGHUP - 1), 0U);
  EXPECT_EQ(SignalSet(child, "SigBlk"), 0U);
  TerminateChild(child);
  ReapChild(child);
  sigprocmask(SIG_SETMASK, &oldSet, nullptr);
  signal(SIGHUP, oldHandler);
}

TEST(AttachedChild, IsReapedOnceItHasEnded) {
  const pid_t child = StartSleep();
  EXPECT_EQ(ReapEndedChild(child), std::nullopt);
  TerminateChild(child);
  AwaitChild(child);
  const auto status = ReapEndedChild(child);
  EXPECT_THAT(status, Optional(SIGTERM));
  EXPECT_FALSE(HasSucceeded(status.value_or(0)));
  EXPECT_NE(kill(child, 0), 0) << "it is still in the process table";
}

TEST(AttachedChild, SucceedsWithStatusZeroOnly) {
  EXPECT_TRUE(HasSucceeded(ReapChild(StartShell("exit 0"))));
  EXPECT_FALSE(HasSucceeded(ReapChild(StartShell("exit 1"))));
}

TEST(AttachedChild, IsWaitedForAlthoughTheProgramIgnoresTheSignal) {
  const auto oldHandler = signal(SIGCHLD, SIG_IGN);
  EXPECT_EQ(ReapChild(StartShell("exit 3")), 3 << 8);
  signal(SIGCHLD, oldHandler);
}

TEST(AttachedChild, ThatCannotBeStartedLeavesNothing) {
  std::string none = "/tmp/no such program";
  char* const arguments[] = {none.data(), nullptr};
  pid_t pid = -2;
  EXPECT_EQ(StartAttachedChild(none.c_str(), arguments, pid), ENOENT);
  EXPECT_EQ(pid, -2);
}

TEST(InheritedChild, IsReapedAndAnOwnOneIsNot) {
  ASSERT_EQ(prctl(PR_SET_CHILD_SUBREAPER, 1, 0, 0, 0), 0);
  EXPECT_TRUE(HasSucceeded(ReapChild(StartShell("sleep 0.1 & echo $! >/tmp/orphan"))));
  pid_t orphan = 0;
  std::ifstream("/tmp/orphan") >> orphan;
  ASSERT_GT(orphan, 0);
  AwaitChild(orphan);
  EXPECT_EQ(kill(orphan, 0), 0) << "it is not in the process table";
  ReapInheritedChildren([](pid_t) { return false; });
  EXPECT_NE(kill(orphan, 0), 0) << "it is still in the process table";

  const pid_t own = StartShell("exit 0");
  AwaitChild(own);
  ReapInheritedChildren([own](pid_t pid) { return pid == own; });
  EXPECT_THAT(ReapEndedChild(own), Optional(0));
  prctl(PR_SET_CHILD_SUBREAPER, 0, 0, 0, 0);
}

}  // namespace
}  // namespace vela_test
