// The pid file of a run and those that earlier runs left behind.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/syscall.h>

#include <cerrno>
#include <string>

#include "program/stub_program_test.h"
#include "support/files.h"
#include "support/mounts.h"
#include "support/seccomp_fail.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::Not;

std::string PidFileName(pid_t pid) {
  return "velathumb." + std::to_string(pid) + ".pid";
}

class PidFile : public StubProgramTest {};

TEST_F(PidFile, ExistsWhileTheRunLastsEmptyAndReadable) {
  MakePhoto("/tmp/photos/a.jpg");
  PauseConverter();
  ProgramOptions options;
  options.umask = 0077;
  Program program = Start({kPhotos}, options);
  ASSERT_TRUE(IsConverterPaused());
  const std::string path = "/var/run/" + PidFileName(program.Pid());
  EXPECT_TRUE(IsRegularFile(path));
  EXPECT_EQ(0, FileSize(path));
  EXPECT_EQ(0644, ModeOf(path));
  Go();
  EXPECT_GOOD_END(*program.Wait());
  EXPECT_THAT(ListDirectory("/run"), IsEmpty());
}

TEST_F(PidFile, IsKeptForAllArguments) {
  MakePhoto("/tmp/1/a.jpg");
  MakePhoto("/tmp/2/a.jpg");
  PauseConverter(3);
  Program program = Start({"/tmp/1", "R:/tmp/missing", "/tmp/2"});
  ASSERT_TRUE(IsConverterPaused());
  EXPECT_THAT(ListDirectory("/run"), ElementsAre(PidFileName(program.Pid())));
  Go();
  EXPECT_GOOD_END(*program.Wait());
  EXPECT_THAT(ListDirectory("/run"), IsEmpty());
}

TEST_F(PidFile, EachInstanceHasItsOwn) {
  MakePhoto("/tmp/photos/a.jpg");
  PauseConverter();
  Program first = Start();
  ASSERT_TRUE(IsConverterPaused());
  MakePhoto("/tmp/other/a.jpg");
  EXPECT_GOOD_END(Run({"/tmp/other"}));
  EXPECT_THAT(ListDirectory("/run"), ElementsAre(PidFileName(first.Pid())));
  Go();
  EXPECT_GOOD_END(*first.Wait());
}

TEST_F(PidFile, OneThatCannotBeMadeIsLoggedAndTheRunGoesOn) {
  const DaemonPeer daemon;
  MakePhoto("/tmp/photos/a.jpg");
  const ReadOnlyMount mount("/run");
  Program program = Start();
  const pid_t pid = program.Pid();
  EXPECT_GOOD_END(*program.Wait());
  EXPECT_TRUE(Exists(Thumb("/tmp/photos/a.jpg", "XL")));
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:1133 Failed to open /var/run/" +
                                        PidFileName(pid) + ". (Read-only file system)"));
}

TEST_F(PidFile, StaleOnesAreRemovedAtTheStart) {
  MakePhoto("/tmp/photos/a.jpg");
  WriteFile("/var/run/velathumb.4000000.pid", "");
  WriteFile("/var/run/velathumb.1.pid", "");
  WriteFile("/var/run/velathumb.word.pid", "");
  PauseConverter();
  Program program = Start();
  ASSERT_TRUE(IsConverterPaused());
  EXPECT_THAT(ListDirectory("/run"), Not(Contains("velathumb.4000000.pid")));
  Go();
  EXPECT_GOOD_END(*program.Wait());
  EXPECT_THAT(ListDirectory("/run"), ElementsAre("velathumb.1.pid", "velathumb.word.pid"));
}

TEST_F(PidFile, TheCrashedInstancesAreRemovedAtTheNextStart) {
  MakePhoto("/tmp/photos/a.jpg");
  PauseConverter();
  Program crashing = Start();
  ASSERT_TRUE(IsConverterPaused());
  crashing.Kill(SIGKILL);
  EXPECT_EQ(SIGKILL, crashing.Wait()->signal);
  EXPECT_THAT(ListDirectory("/run"), ElementsAre(PidFileName(crashing.Pid())));
  Go();
  EXPECT_GOOD_END(Run({"/tmp/missing"}));
  EXPECT_THAT(ListDirectory("/run"), IsEmpty());
}

TEST_F(PidFile, StaleOnesAreRemovedBeforeTheOwnIsMade) {
  // With every probe refused, the clean-up takes each file for stale; its own is not there yet.
  MakePhoto("/tmp/photos/a.jpg");
  WriteFile("/var/run/velathumb.1.pid", "");
  PauseConverter();
  ProgramOptions options;
  options.beforeExec = {SeccompFail({SYS_kill}, EPERM)};
  Program program = Start({kPhotos}, options);
  ASSERT_TRUE(IsConverterPaused());
  EXPECT_THAT(ListDirectory("/run"), ElementsAre(PidFileName(program.Pid())));
  Go();
  EXPECT_GOOD_END(*program.Wait());
}

TEST_F(PidFile, StaleOneThatStaysIsLoggedAndTheRunGoesOn) {
  const DaemonPeer daemon;
  MakePhoto("/tmp/photos/a.jpg");
  MakeDirectories("/var/run/velathumb.4000000.pid");
  EXPECT_GOOD_END(Run());
  EXPECT_TRUE(Exists(Thumb("/tmp/photos/a.jpg", "XL")));
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb: KillThumbProcesses(1161) - unlink(/var/run/"
                                        "velathumb.4000000.pid), Is a directory\n"));
}

TEST_F(PidFile, CleanUpKillsNothing) {
  Program sleeper = StartProgram("/bin/sleep", {"60"});
  WriteFile("/var/run/" + PidFileName(sleeper.Pid()), "");
  EXPECT_GOOD_END(Run({"/tmp/missing"}));
  EXPECT_THAT(ListDirectory("/run"), ElementsAre(PidFileName(sleeper.Pid())));
  EXPECT_FALSE(sleeper.Wait(std::chrono::milliseconds(50)).has_value());
}

}  // namespace
}  // namespace vela_test
