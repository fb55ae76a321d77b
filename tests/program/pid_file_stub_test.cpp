// The pid file of a run and those that earlier runs left behind.
#include <signal.h>
#include <sys/stat.h>
#include <sys/syscall.h>

#include <cerrno>

#include "program/stub_program_test.h"
#include "support/mounts.h"
#include "support/seccomp_fail.h"

namespace vela_test {
namespace {

using ::testing::Contains;
using ::testing::Not;

std::string PidFileName(pid_t pid) {
  return "velathumb." + std::to_string(pid) + ".pid";
}

using PidFile = OnePhotoTest;

TEST_F(PidFile, ExistsWhileTheRunLastsEmptyAndReadable) {
  Program program = StartAndPause(1, {kPhotos}, WithUmask(0077));
  const std::string path = "/var/run/" + PidFileName(program.Pid());
  EXPECT_TRUE(IsRegularFile(path));
  EXPECT_EQ(FileSize(path), 0);
  EXPECT_EQ(ModeOf(path), 0644);
  GoAndFinish(program);
  EXPECT_THAT(ListDirectory("/run"), IsEmpty());
}

TEST_F(PidFile, IsKeptForAllArguments) {
  MakePhotosIn({"/tmp/1", "/tmp/2"});
  Program program = StartAndPause(3, {"/tmp/1", "R:/tmp/missing", "/tmp/2"});
  EXPECT_THAT(ListDirectory("/run"), ElementsAre(PidFileName(program.Pid())));
  GoAndFinish(program);
  EXPECT_THAT(ListDirectory("/run"), IsEmpty());
}

TEST_F(PidFile, EachInstanceHasItsOwn) {
  Program first = StartAndPause();
  MakePhoto("/tmp/other/a.jpg");
  EXPECT_SUCCESS(Run({"/tmp/other"}));
  EXPECT_THAT(ListDirectory("/run"), ElementsAre(PidFileName(first.Pid())));
  GoAndFinish(first);
}

TEST_F(PidFile, FailureToMakeItIsLoggedAndTheRunContinues) {
  const DaemonPeer daemon;
  const ReadOnlyMount mount("/run");
  Program program = Start();
  const pid_t pid = program.Pid();
  EXPECT_SUCCESS(*program.Wait());
  EXPECT_TRUE(Exists(Thumb("/tmp/photos/a.jpg", "XL")));
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:1133 Failed to open /var/run/" +
                                        PidFileName(pid) + ". (Read-only file system)"));
}

TEST_F(PidFile, StaleOnesAreRemovedAtTheStart) {
  WriteFile("/var/run/velathumb.4000000.pid", "");
  WriteFile("/var/run/velathumb.1.pid", "");
  WriteFile("/var/run/velathumb.word.pid", "");
  Program program = StartAndPause();
  EXPECT_THAT(ListDirectory("/run"), Not(Contains("velathumb.4000000.pid")));
  GoAndFinish(program);
  EXPECT_THAT(ListDirectory("/run"), ElementsAre("velathumb.1.pid", "velathumb.word.pid"));
}

TEST_F(PidFile, OfACrashedInstanceIsRemovedAtTheNextStart) {
  Program crashing = StartAndPause();
  crashing.Kill(SIGKILL);
  EXPECT_EQ(crashing.Wait()->signal, SIGKILL);
  EXPECT_THAT(ListDirectory("/run"), ElementsAre(PidFileName(crashing.Pid())));
  Go();
  EXPECT_SUCCESS(Run({"/tmp/missing"}));
  EXPECT_THAT(ListDirectory("/run"), IsEmpty());
}

TEST_F(PidFile, StaleOnesAreRemovedBeforeTheOwnIsMade) {
  // With every probe refused, the clean-up treats each file as stale; its own does not exist yet.
  WriteFile("/var/run/velathumb.1.pid", "");
  Program program = StartAndPause(1, {kPhotos}, WithSteps({SeccompFail({SYS_kill}, EPERM)}));
  EXPECT_THAT(ListDirectory("/run"), ElementsAre(PidFileName(program.Pid())));
  GoAndFinish(program);
}

TEST_F(PidFile, FailureToRemoveAStaleOneIsLoggedAndTheRunContinues) {
  MakeDirectories("/var/run/velathumb.4000000.pid");
  RunWithDaemon();
  EXPECT_TRUE(Exists(Thumb("/tmp/photos/a.jpg", "XL")));
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb: KillThumbProcesses(1161) - unlink(/var/run/"
                                        "velathumb.4000000.pid), Is a directory\n"));
}

TEST_F(PidFile, CleanUpKillsNothing) {
  Program sleeper = StartProgram("/bin/sleep", {"60"});
  WriteFile("/var/run/" + PidFileName(sleeper.Pid()), "");
  EXPECT_SUCCESS(Run({"/tmp/missing"}));
  EXPECT_THAT(ListDirectory("/run"), ElementsAre(PidFileName(sleeper.Pid())));
  EXPECT_FALSE(sleeper.Wait(std::chrono::milliseconds(50)).has_value());
}

}  // namespace
}  // namespace vela_test
