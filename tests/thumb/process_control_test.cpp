// Pid files and termination by SIGTERM.
#include "thumb/process_control.h"

#include <sys/syscall.h>

#include "thumb/thumb_test.h"

namespace vela_test {
namespace {

std::string PidFileOf(pid_t pid) {
  return "/var/run/velathumb." + std::to_string(pid) + ".pid";
}

class OwnPidFile : public SandboxTest {
 protected:
  const std::string name_ = "velathumb." + std::to_string(getpid()) + ".pid";
  const std::string path_ = "/var/run/" + name_;

 private:
  ZeroMask mask_;
};

TEST_F(OwnPidFile, IsEmptyAndReadableForAll) {
  EXPECT_EQ(CreatePidFile(), path_);
  EXPECT_TRUE(IsRegularFile(path_));
  EXPECT_EQ(FileSize(path_), 0);
  EXPECT_EQ(ModeOf(path_), 0644);
  EXPECT_THAT(ListDirectory("/run"), ElementsAre(name_));
  EXPECT_THAT(DescriptorsOf("/run/" + name_), IsEmpty());
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(OwnPidFile, CarriesTheProcessIdOfAnyLength) {
  EXPECT_EQ(ForkCall([] { return CreatePidFile() == PidFileOf(getpid()) ? 0 : 1; }), 0);
}

TEST_F(OwnPidFile, MayExistAlready) {
  WriteFile(path_, "left behind");
  CreatePidFile();
  EXPECT_EQ(ReadFile(path_), "left behind");
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(OwnPidFile, FailureIsLoggedWithItsReason) {
  MakeDirectories(path_);
  EXPECT_EQ(CreatePidFile(), path_);
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velathumb:1133 Failed to open " + path_ + ". (Is a directory)"));
}

TEST_F(OwnPidFile, ReadOnlyRunDirectoryIsLogged) {
  const ReadOnlyMount mount("/run");
  EXPECT_EQ(CreatePidFile(), path_);
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velathumb:1133 Failed to open " + path_ + ". (Read-only file system)"));
}

class StalePidFiles : public SandboxTest {
 protected:
  static std::string Put(const std::string& middle) {
    const std::string path = "/var/run/velathumb." + middle + ".pid";
    WriteFile(path, "");
    return path;
  }

  /// The id of a process that has ended.
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

TEST_F(StalePidFiles, AreThoseOfProcessesThatAreGone) {
  const std::string gone = std::to_string(GonePid());
  const std::string own = std::to_string(getpid());
  struct {
    const char* description;
    std::string middle;
    bool isKept;
  } const rows[] = {
      {"a process that is gone", gone, false},
      {"this process", own, true},
      {"process 1", "1", true},
      {"a number that ends at a letter: gone", gone + "abc", false},
      {"a number that ends at a letter: running", own + "abc", true},
      {"a number that ends at a dot: gone", gone + ".old", false},
      {"a number that ends at a dot: gone before running", gone + "." + own, false},
      {"a number that ends at a dot: running before gone", own + "." + gone, true},
      {"a word before the dot", "old." + gone, true},
      {"dots in a row are one", "." + gone, false},
      {"letters", "abc", true},
      {"zero", "0", true},
      {"two zeros", "00", true},
      {"a letter before the number", "x1", true},
      {"minus zero", "-0", true},
      {"nothing", "", true},
      {"a space", " ", true},
      {"the largest process id", "2147483647", false},
      {"2^32 + 1, process 1 if it were cut", "4294967297", false},
      {"2^63 - 1", "9223372036854775807", false},
      {"2^64 + 1, process 1 if it were cut", "18446744073709551617", false},
      {"far too large", "99999999999999999999999", false},
  };
  for (const auto& row : rows) {
    SCOPED_TRACE(row.description);
    EXPECT_EQ(IsKept(row.middle), row.isKept);
  }
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(StalePidFiles, RunningProcessesAreNotTouched) {
  Program sleeper = StartProgram("/bin/sleep", {"60"});
  EXPECT_TRUE(IsKept(std::to_string(sleeper.Pid())));
  EXPECT_FALSE(sleeper.Wait(std::chrono::milliseconds(50)).has_value());
}

TEST_F(StalePidFiles, AreAllFound) {
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

TEST_F(StalePidFiles, RefusedProbeCountsAsGone) {
  // A probe of process 0, as for names without a number, would find the caller's own group alive,
  // so there must be none.
  const std::string own = Put(std::to_string(getpid()));
  const std::string word = Put("word");
  const std::string zero = Put("0");
  const BeforeExec refuseKill = SeccompFail({SYS_kill}, EPERM);
  EXPECT_EQ(ForkCall([&] {
              const int result = refuseKill();
              KillThumbProcesses();
              return result;
            }),
            0);
  EXPECT_FALSE(Exists(own));
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
  EXPECT_EQ(EndInChild(), 1);
  EXPECT_THAT(ListDirectory("/run"), ElementsAre("velathumb." + std::to_string(getpid()) + ".pid"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(EndBySigTerm, ExitsWithoutPidFileToo) {
  EXPECT_EQ(EndInChild(false), 1);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(EndBySigTerm, EndsEveryConverterWhoeverStartedIt) {
  const StubTool tool(kConverterPath);
  tool.Plan(StubPlan().CreateFile("/tmp/here").WaitForFile("/tmp/go"));
  Program converter = StartProgram(kConverterPath, {});
  Program other = StartProgram("/bin/sleep", {"60"});
  ASSERT_TRUE(WaitUntilExists("/tmp/here"));
  EXPECT_EQ(EndInChild(), 1);
  const auto end = converter.Wait();
  ASSERT_TRUE(end.has_value());
  EXPECT_EQ(end->signal, SIGTERM);
  EXPECT_FALSE(other.Wait(std::chrono::milliseconds(50)).has_value());
}

}  // namespace
}  // namespace vela_test
