// The sandbox: what is private, what is visible, what is protected, and how it is reset.
#include "support/sandbox.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <sys/sysmacros.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>

#include "support/build_paths.h"
#include "support/descriptor.h"
#include "support/files.h"

namespace vela_test {
namespace {

using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::Not;

class Sandbox : public SandboxTest {};

TEST_F(Sandbox, PrivatePlacesAreEmptyAndWritable) {
  for (const char* place : {"/tmp", "/var/run", "/var/spool", "/dev/shm"}) {
    EXPECT_THAT(ListDirectory(place), IsEmpty()) << place;
    const std::string file = std::string(place) + "/file";
    WriteFile(file, "x");
    EXPECT_TRUE(Exists(file)) << place;
  }
  EXPECT_THAT(ListDirectory("/usr/vela"), ElementsAre("bin", "stub"));
  EXPECT_THAT(ListDirectory("/usr/vela/bin"), IsEmpty());
  EXPECT_FALSE(Exists("/etc/velainfo.conf"));
  EXPECT_FALSE(Exists("/var/lib/velaindex"));
}

TEST_F(Sandbox, WritesDoNotReachTheMachine) {
  const std::string name = "vela_sandbox_test_" + std::to_string(getpid());
  for (const std::string place : {"/tmp/", "/run/", "/var/spool/", "/etc/velainfo.conf.", "/etc/",
                                  "/usr/bin/", "/usr/vela/", "/var/lib/", "/dev/shm/"}) {
    WriteFile(place + name, "x");
    EXPECT_FALSE(Exists(HostPath(place + name))) << place;
  }
}

TEST_F(Sandbox, TheMachineIsReadOnly) {
  for (const std::string place : {"/tmp", "/etc", "/var/spool", "/usr/bin", "/run", "/home"}) {
    const std::string file = HostPath(place) + "/vela_sandbox_test";
    errno = 0;
    EXPECT_EQ(fopen(file.c_str(), "w"), nullptr) << place;
    EXPECT_EQ(errno, EROFS) << place;
  }
}

TEST_F(Sandbox, ConfigurationFileCanBeReplacedByRename) {
  WriteFile("/etc/velainfo.conf.new", "key=\"value\"\n");
  ASSERT_EQ(rename("/etc/velainfo.conf.new", "/etc/velainfo.conf"), 0);
  EXPECT_EQ(ReadFile("/etc/velainfo.conf"), "key=\"value\"\n");
}

TEST_F(Sandbox, ToolsCanBeRemovedAndReplaced) {
  ASSERT_TRUE(Exists("/usr/bin/env"));
  ASSERT_EQ(unlink("/usr/bin/env"), 0);
  EXPECT_FALSE(Exists("/usr/bin/env"));
  EXPECT_FALSE(Exists("/bin/env"));
  WriteFile("/usr/bin/env", "mine");
  EXPECT_EQ(ReadFile("/usr/bin/env"), "mine");
  ResetSandbox();
  EXPECT_NE(ReadFile("/usr/bin/env"), "mine");
}

TEST_F(Sandbox, OnlyTheSandboxsProcessesAreVisible) {
  EXPECT_EQ(getpid(), 2);
  EXPECT_EQ(getppid(), 1);
  std::vector<std::string> processes;
  for (const std::string& name : ListDirectory("/proc")) {
    if (name.find_first_not_of("0123456789") == std::string::npos) {
      processes.push_back(name);
    }
  }
  EXPECT_THAT(processes, ElementsAre("1", "2"));
}

TEST_F(Sandbox, UserIsRoot) {
  EXPECT_EQ(geteuid(), 0U);
}

TEST_F(Sandbox, OrphansAreReaped) {
  // A child that starts a grandchild and ends leaves it to process 1.
  int ends[2];
  ASSERT_EQ(pipe(ends), 0);
  const Descriptor input(ends[0]);
  const Descriptor output(ends[1]);
  const pid_t child = fork();
  if (child == 0) {
    const pid_t grandchild = fork();
    if (grandchild == 0) {
      _exit(0);
    }
    const bool isWritten = write(output.Get(), &grandchild, sizeof grandchild) == sizeof grandchild;
    _exit(isWritten ? 0 : 1);
  }
  int status = 0;
  ASSERT_EQ(waitpid(child, &status, 0), child);
  ASSERT_EQ(status, 0);
  pid_t grandchild = 0;
  ASSERT_EQ(read(input.Get(), &grandchild, sizeof grandchild),
            static_cast<ssize_t>(sizeof grandchild));
  EXPECT_TRUE(WaitUntilGone("/proc/" + std::to_string(grandchild)));
}

TEST_F(Sandbox, DevicesKeepTheirNames) {
  struct stat status {};
  ASSERT_EQ(lstat("/dev/null", &status), 0);
  EXPECT_TRUE(S_ISCHR(status.st_mode));
  EXPECT_EQ(status.st_rdev, makedev(1, 3));
  EXPECT_EQ(lstat("/dev/log", &status), 0);
  EXPECT_TRUE(S_ISSOCK(status.st_mode));
}

TEST_F(Sandbox, TemporaryDirectoryIsLargeEnoughForTheDiskGuard) {
  struct statvfs volume {};
  ASSERT_EQ(statvfs("/tmp", &volume), 0);
  EXPECT_GE(volume.f_bavail * volume.f_frsize, 0x60000000UL);
}

TEST_F(Sandbox, BuildAndSourceAreReachable) {
  EXPECT_TRUE(IsRegularFile(VelathumbPath()));
  EXPECT_TRUE(IsRegularFile(StubToolPath()));
  EXPECT_TRUE(IsRegularFile(SourceDirectory() + "/CMakeLists.txt"));
}

TEST_F(Sandbox, ResetRestoresEverything) {
  const char* const removed[] = {"/var/lib/velaindex", "/etc/velainfo.conf", "/stranger",
                                 "/usr/bin/dcraw.away"};
  for (const char* path : {"/tmp/a/b/c", "/run/velathumb.1.pid", "/var/spool/thumb_create.queue",
                           "/var/lib/velaindex/index.db", "/etc/velainfo.conf",
                           "/usr/vela/bin/convert-thumb", "/stranger"}) {
    WriteFile(path, "x");
  }
  ASSERT_EQ(rename("/usr/bin/dcraw", "/usr/bin/dcraw.away"), 0);
  ASSERT_EQ(unlink("/etc/passwd"), 0);
  ASSERT_EQ(chmod("/tmp", 0700), 0);
  ASSERT_EQ(chmod("/var/lib", 0500), 0);
  ASSERT_EQ(chdir("/tmp/a"), 0);
  ResetSandbox();
  for (const char* place : {"/tmp", "/run", "/var/spool", "/usr/vela/bin"}) {
    EXPECT_THAT(ListDirectory(place), IsEmpty()) << place;
  }
  for (const char* path : removed) EXPECT_FALSE(Exists(path)) << path;
  EXPECT_EQ(ModeOf("/tmp"), 01777);
  EXPECT_EQ(ModeOf("/var/lib"), 0755);
  EXPECT_TRUE(IsRegularFile("/usr/bin/dcraw"));
  EXPECT_TRUE(IsRegularFile("/etc/passwd"));
  char directory[16] = "";
  EXPECT_STREQ(getcwd(directory, sizeof directory), "/");
}

TEST_F(Sandbox, ResetEndsProcessesOfEarlierTests) {
  const pid_t child = fork();
  if (child == 0) {
    signal(SIGTERM, SIG_IGN);
    for (;;) {
      pause();
    }
  }
  ASSERT_TRUE(Exists("/proc/" + std::to_string(child)));
  ResetSandbox();
  EXPECT_FALSE(Exists("/proc/" + std::to_string(child)));
}

TEST_F(Sandbox, DeathTestsWork) {
  WriteFile("/tmp/kept", "x");
  EXPECT_EXIT(_exit(Exists("/tmp/kept") ? 7 : 8), ::testing::ExitedWithCode(7), "");
  EXPECT_EXIT(
      {
        ResetSandbox();
        _exit(9);
      },
      ::testing::ExitedWithCode(9), "");
  EXPECT_TRUE(Exists("/tmp/kept"));
}

}  // namespace
}  // namespace vela_test
