// Pid files and the end by SIGTERM.
#include "thumb/process_control.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <string>

#include "support/files.h"
#include "support/mounts.h"
#include "support/program.h"
#include "support/sandbox.h"
#include "support/seccomp_fail.h"
#include "support/stub_tool.h"
#include "support/system_log.h"
#include "thumb/fork_call.h"
#include "thumb/open_files.h"
#include "thumb/zero_mask.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

std::string PidFileOf(pid_t pid) {
  return "/var/run/velathumb." + std::to_string(pid) + ".pid";
}

class OwnPidFile : public SandboxTest {
 private:
  ZeroMask mask_;
};

TEST_F(OwnPidFile, IsEmptyAndReadableForEverybody) {
  EXPECT_EQ(PidFileOf(getpid()), CreatePidFile());
  EXPECT_TRUE(IsRegularFile(PidFileOf(getpid())));
  EXPECT_EQ(0, FileSize(PidFileOf(getpid())));
  EXPECT_EQ(0644, ModeOf(PidFileOf(getpid())));
  EXPECT_THAT(ListDirectory("/run"), ElementsAre("velathumb." + std::to_string(getpid()) + ".pid"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(OwnPidFile, CarriesTheProcessIdOfAnyLength) {
  const int result = ForkCall([] { return CreatePidFile() == PidFileOf(getpid()) ? 0 : 1; });
  EXPECT_EQ(0, result);
}

TEST_F(OwnPidFile, IsClosed) {
  CreatePidFile();
  EXPECT_THAT(DescriptorsOf("/run/velathumb." + std::to_string(getpid()) + ".pid"), IsEmpty());
}

TEST_F(OwnPidFile, TakesOverAFileThatIsThere) {
  WriteFile(PidFileOf(getpid()), "left behind");
  CreatePidFile();
  EXPECT_EQ("left behind", ReadFile(PidFileOf(getpid())));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(OwnPidFile, FailureIsLoggedWithItsReason) {
  MakeDirectories(PidFileOf(getpid()));
  EXPECT_EQ(PidFileOf(getpid()), CreatePidFile());
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:1133 Failed to open " + PidFileOf(getpid()) +
                                        ". (Is a directory)"));
}

TEST_F(OwnPidFile, ReadOnlyRunDirectoryIsLogged) {
  const ReadOnlyMount mount("/run");
  EXPECT_EQ(PidFileOf(getpid()), CreatePidFile());
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb:1133 Failed to open " + PidFileOf(getpid()) +
                                        ". (Read-only file system)"));
}

class StalePidFiles : public SandboxTest {
 protected:
  static std::string Put(const std::string& middle) {
    const std::string path = "/var/run/velathumb." + middle + ".pid";
    WriteFile(path, "");
    return path;
  }

  /// The id of a process that is gone.
  static pid_t GonePid() {
    const pid_t child = fork();
    if (child == 0) {
      _exit(0);
    }
    waitpid(child, nullptr, 0);
    return child;
  }

  /// Whether the clean-up keeps the pid file with this part of the name.
  static bool IsKept(const std::string& middle) {
    const std::string path = Put(middle);
    KillThumbProcesses();
    return Exists(path);
  }
};

TEST_F(StalePidFiles, OfProcessesThatAreGoneAreRemoved) {
  EXPECT_FALSE(IsKept(std::to_string(GonePid())));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(StalePidFiles, OfRunningProcessesAreKept) {
  EXPECT_TRUE(IsKept(std::to_string(getpid())));
  EXPECT_TRUE(IsKept("1"));
}

TEST_F(StalePidFiles, RunningProcessesAreNotTouched) {
  Program sleeper = StartProgram("/bin/sleep", {"60"});
  EXPECT_TRUE(IsKept(std::to_string(sleeper.Pid())));
  EXPECT_FALSE(sleeper.Wait(std::chrono::milliseconds(50)).has_value());
}

TEST_F(StalePidFiles, AreFoundWhicheverTheyAre) {
  const std::string gone = std::to_string(GonePid());
  const std::string running = Put(std::to_string(getpid()));
  const std::string first = Put("0" + gone);
  const std::string second = Put(gone);
  const std::string third = Put("00" + gone);
  KillThumbProcesses();
  EXPECT_TRUE(Exists(running));
  EXPECT_FALSE(Exists(first));
  EXPECT_FALSE(Exists(second));
  EXPECT_FALSE(Exists(third));
}

TEST_F(StalePidFiles, NamesWithoutNumberAreKept) {
  for (const char* middle : {"abc", "0", "00", "x1", "-0", "", " "}) {
    EXPECT_TRUE(IsKept(middle)) << "'" << middle << "'";
  }
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(StalePidFiles, NumberEndsAtTheFirstOtherCharacter) {
  EXPECT_FALSE(IsKept(std::to_string(GonePid()) + "abc"));
  EXPECT_TRUE(IsKept(std::to_string(getpid()) + "abc"));
}

TEST_F(StalePidFiles, NumberEndsAtTheFirstDot) {
  const std::string gone = std::to_string(GonePid());
  const std::string own = std::to_string(getpid());
  EXPECT_FALSE(IsKept(gone + ".old"));
  EXPECT_FALSE(IsKept(gone + "." + own));
  EXPECT_TRUE(IsKept(own + "." + gone));
  EXPECT_TRUE(IsKept("old." + gone));
  // Dots in a row are one.
  EXPECT_FALSE(IsKept("." + gone));
}

TEST_F(StalePidFiles, NumbersThatNoProcessHasAreOfNoProcess) {
  // 2^32 + 1 and 2^64 + 1 would be process 1 if they were cut.
  for (const char* number : {"2147483647", "4294967297", "9223372036854775807",
                             "18446744073709551617", "99999999999999999999999"}) {
    EXPECT_FALSE(IsKept(number)) << number;
  }
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(StalePidFiles, RefusedProbeCountsAsGone) {
  const std::string path = Put(std::to_string(getpid()));
  const BeforeExec refuseKill = SeccompFail({SYS_kill}, EPERM);
  EXPECT_EQ(0, ForkCall([&] {
              const int result = refuseKill();
              KillThumbProcesses();
              return result;
            }));
  EXPECT_FALSE(Exists(path));
}

TEST_F(StalePidFiles, NothingIsProbedForNamesWithoutNumber) {
  // A probe of process 0 would reach the caller's own group and find it alive.
  const std::string word = Put("word");
  const std::string zero = Put("0");
  const BeforeExec refuseKill = SeccompFail({SYS_kill}, EPERM);
  EXPECT_EQ(0, ForkCall([&] {
              const int result = refuseKill();
              KillThumbProcesses();
              return result;
            }));
  EXPECT_TRUE(Exists(word));
  EXPECT_TRUE(Exists(zero));
}

TEST_F(StalePidFiles, OtherNamesAreLeftAlone) {
  const std::string gone = std::to_string(GonePid());
  for (const std::string& name : {"velathumb." + gone + ".pid.bak", "velathumb" + gone + ".pid",
                                  "xvelathumb." + gone + ".pid", "other." + gone + ".pid",
                                  "velathumb." + gone, std::string("velathumb.pid")}) {
    WriteFile("/var/run/" + name, "");
    KillThumbProcesses();
    EXPECT_TRUE(Exists("/var/run/" + name)) << name;
  }
}

TEST_F(StalePidFiles, OneThatCannotBeRemovedIsLogged) {
  const std::string gone = std::to_string(GonePid());
  const std::string directory = "/var/run/velathumb." + gone + ".pid";
  MakeDirectories(directory);
  const std::string file = Put(gone + "x");
  KillThumbProcesses();
  EXPECT_FALSE(Exists(file));
  EXPECT_TRUE(Exists(directory));
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb: KillThumbProcesses(1161) - unlink(" +
                                        directory + "), Is a directory\n"));
}

TEST_F(StalePidFiles, ReadOnlyRunDirectoryIsLoggedForEach) {
  const std::string gone = std::to_string(GonePid());
  const std::string second = Put(gone + "b");
  const std::string first = Put(gone + "a");
  const ReadOnlyMount mount("/run");
  KillThumbProcesses();
  EXPECT_THAT(ErrorLines(), ElementsAre("velathumb: KillThumbProcesses(1161) - unlink(" + first +
                                            "), Read-only file system\n",
                                        "velathumb: KillThumbProcesses(1161) - unlink(" + second +
                                            "), Read-only file system\n"));
}

class EndBySigTerm : public SandboxTest {
 protected:
  static int EndInChild(bool withPidFile = true) {
    return ForkCall([withPidFile] {
      if (withPidFile) {
        CreatePidFile();
      }
      OnSigTerm(SIGTERM);
      return 99;
    });
  }
};

TEST_F(EndBySigTerm, RemovesThePidFileAndExitsWithOne) {
  WriteFile(PidFileOf(getpid()), "");
  EXPECT_EQ(1, EndInChild());
  EXPECT_THAT(ListDirectory("/run"), ElementsAre("velathumb." + std::to_string(getpid()) + ".pid"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(EndBySigTerm, ExitsWithoutPidFileToo) {
  EXPECT_EQ(1, EndInChild(false));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(EndBySigTerm, EndsEveryConverterWhoeverStartedIt) {
  const StubTool tool(kConverterPath);
  tool.Plan(StubPlan().CreateFile("/tmp/here").WaitForFile("/tmp/go"));
  Program converter = StartProgram(kConverterPath, {});
  Program other = StartProgram("/bin/sleep", {"60"});
  ASSERT_TRUE(WaitUntilExists("/tmp/here"));
  EXPECT_EQ(1, EndInChild());
  const auto end = converter.Wait();
  ASSERT_TRUE(end.has_value());
  EXPECT_EQ(SIGTERM, end->signal);
  EXPECT_FALSE(other.Wait(std::chrono::milliseconds(50)).has_value());
}

}  // namespace
}  // namespace vela_test
