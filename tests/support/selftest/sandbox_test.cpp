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

TEST_F(Sandbox, WhatIsWrittenDoesNotReachTheMachine) {
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
    EXPECT_EQ(nullptr, fopen(file.c_str(), "w")) << place;
    EXPECT_EQ(EROFS, errno) << place;
  }
}

TEST_F(Sandbox, ConfigurationFileCanBeReplacedByRename) {
  WriteFile("/etc/velainfo.conf.new", "key=\"value\"\n");
  ASSERT_EQ(0, rename("/etc/velainfo.conf.new", "/etc/velainfo.conf"));
  EXPECT_EQ("key=\"value\"\n", ReadFile("/etc/velainfo.conf"));
}

TEST_F(Sandbox, ToolsCanBeTakenAwayAndReplaced) {
  ASSERT_TRUE(Exists("/usr/bin/env"));
  ASSERT_EQ(0, unlink("/usr/bin/env"));
  EXPECT_FALSE(Exists("/usr/bin/env"));
  EXPECT_FALSE(Exists("/bin/env"));
  WriteFile("/usr/bin/env", "mine");
  EXPECT_EQ("mine", ReadFile("/usr/bin/env"));
  ResetSandbox();
  EXPECT_NE("mine", ReadFile("/usr/bin/env"));
}

TEST_F(Sandbox, OnlyTheSandboxsProcessesAreVisible) {
  EXPECT_EQ(2, getpid());
  EXPECT_EQ(1, getppid());
  std::vector<std::string> processes;
  for (const std::string& name : ListDirectory("/proc")) {
    if (name.find_first_not_of("0123456789") == std::string::npos) {
      processes.push_back(name);
    }
  }
  EXPECT_THAT(processes, ElementsAre("1", "2"));
}

TEST_F(Sandbox, UserIsRoot) {
  EXPECT_EQ(0U, geteuid());
}

TEST_F(Sandbox, OrphansAreReaped) {
  // A child that starts a grandchild and ends leaves it to process 1.
  int ends[2];
  ASSERT_EQ(0, pipe(ends));
  const Descriptor told(ends[0]);
  const Descriptor tells(ends[1]);
  const pid_t child = fork();
  if (child == 0) {
    const pid_t grandchild = fork();
    if (grandchild == 0) {
      _exit(0);
    }
    const bool isTold = write(tells.Get(), &grandchild, sizeof grandchild) == sizeof grandchild;
    _exit(isTold ? 0 : 1);
  }
  int status = 0;
  ASSERT_EQ(child, waitpid(child, &status, 0));
  ASSERT_EQ(0, status);
  pid_t grandchild = 0;
  ASSERT_EQ(static_cast<ssize_t>(sizeof grandchild),
            read(told.Get(), &grandchild, sizeof grandchild));
  EXPECT_TRUE(WaitUntilGone("/proc/" + std::to_string(grandchild)));
}

TEST_F(Sandbox, DevicesKeepTheirNames) {
  struct stat status {};
  ASSERT_EQ(0, lstat("/dev/null", &status));
  EXPECT_TRUE(S_ISCHR(status.st_mode));
  EXPECT_EQ(makedev(1, 3), status.st_rdev);
  EXPECT_EQ(0, lstat("/dev/log", &status));
  EXPECT_TRUE(S_ISSOCK(status.st_mode));
}

TEST_F(Sandbox, TemporaryDirectoryIsLargeEnoughForTheDiskGuard) {
  struct statvfs volume {};
  ASSERT_EQ(0, statvfs("/tmp", &volume));
  EXPECT_GE(volume.f_bavail * volume.f_frsize, 0x60000000UL);
}

TEST_F(Sandbox, BuildAndSourceAreReachable) {
  EXPECT_TRUE(IsRegularFile(VelathumbPath()));
  EXPECT_TRUE(IsRegularFile(StubToolPath()));
  EXPECT_TRUE(IsRegularFile(SourceDirectory() + "/CMakeLists.txt"));
}

TEST_F(Sandbox, ResetRestoresEverything) {
  WriteFile("/tmp/a/b/c", "x");
  WriteFile("/run/velathumb.1.pid", "");
  WriteFile("/var/spool/thumb_create.queue", "x");
  WriteFile("/var/lib/velaindex/index.db", "x");
  WriteFile("/etc/velainfo.conf", "x");
  WriteFile("/usr/vela/bin/convert-thumb", "x");
  WriteFile("/stranger", "x");
  ASSERT_EQ(0, rename("/usr/bin/dcraw", "/usr/bin/dcraw.away"));
  ASSERT_EQ(0, unlink("/etc/passwd"));
  ASSERT_EQ(0, chmod("/tmp", 0700));
  ASSERT_EQ(0, chmod("/var/lib", 0500));
  ASSERT_EQ(0, chdir("/tmp/a"));
  ResetSandbox();
  EXPECT_THAT(ListDirectory("/tmp"), IsEmpty());
  EXPECT_EQ(01777, ModeOf("/tmp"));
  EXPECT_EQ(0755, ModeOf("/var/lib"));
  EXPECT_THAT(ListDirectory("/run"), IsEmpty());
  EXPECT_THAT(ListDirectory("/var/spool"), IsEmpty());
  EXPECT_FALSE(Exists("/var/lib/velaindex"));
  EXPECT_FALSE(Exists("/etc/velainfo.conf"));
  EXPECT_FALSE(Exists("/stranger"));
  EXPECT_THAT(ListDirectory("/usr/vela/bin"), IsEmpty());
  EXPECT_TRUE(IsRegularFile("/usr/bin/dcraw"));
  EXPECT_FALSE(Exists("/usr/bin/dcraw.away"));
  EXPECT_TRUE(IsRegularFile("/etc/passwd"));
  char directory[16] = "";
  EXPECT_STREQ("/", getcwd(directory, sizeof directory));
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
