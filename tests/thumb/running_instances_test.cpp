// Which instances are at work.
#include "thumb/running_instances.h"

#include <gmock/gmock.h>
#include <signal.h>
#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <string>
#include <vector>

#include "support/environment_failure.h"
#include "support/files.h"
#include "support/privileges.h"
#include "support/program.h"
#include "support/sandbox.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::UnorderedElementsAre;

void MakePidFile(const std::string& number) {
  WriteFile("/var/run/velathumb." + number + ".pid", "");
}

/// A process that waits, started as a program of this name.
Program StartAs(const std::string& name) {
  const std::string path = "/tmp/programs/" + name;
  if (!Exists(path)) {
    CopyFile("/bin/sleep", path);
    EXPECT_EQ(chmod(path.c_str(), 0755), 0);
  }
  Program program = StartProgram(path, {"1000"});
  EXPECT_FALSE(program.Wait(std::chrono::milliseconds(0)));
  return program;
}

class Instances : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    MakeDirectories("/tmp/programs");
  }
};

TEST_F(Instances, AreNoneWithoutPidFiles) {
  const Program velathumb = StartAs("velathumb");
  EXPECT_THAT(RunningInstances(), IsEmpty());
}

TEST_F(Instances, AreTheProcessesWithAPidFile) {
  const Program first = StartAs("velathumb");
  const Program second = StartAs("velathumb");
  MakePidFile(std::to_string(first.Pid()));
  EXPECT_THAT(RunningInstances(), ElementsAre(first.Pid()));
  MakePidFile(std::to_string(second.Pid()));
  EXPECT_THAT(RunningInstances(), UnorderedElementsAre(first.Pid(), second.Pid()));
}

TEST_F(Instances, DoNotEndWithTheirPidFilesButWithTheirProcesses) {
  Program velathumb = StartAs("velathumb");
  MakePidFile(std::to_string(velathumb.Pid()));
  ASSERT_THAT(RunningInstances(), ElementsAre(velathumb.Pid()));
  velathumb.Kill(SIGKILL);
  ASSERT_TRUE(velathumb.Wait());
  EXPECT_THAT(RunningInstances(), IsEmpty());
  EXPECT_TRUE(Exists("/var/run/velathumb." + std::to_string(velathumb.Pid()) + ".pid"));
}

TEST_F(Instances, AreNotOtherProgramsThatHaveGotTheNumber) {
  for (const char* name : {"sleep", "velathumb-queue", "velathum", "xvelathumb"}) {
    const Program other = StartAs(name);
    MakePidFile(std::to_string(other.Pid()));
    EXPECT_THAT(RunningInstances(), IsEmpty()) << name;
  }
}

TEST_F(Instances, AreNotWhatNamesNoProcess) {
  for (const char* number : {"0", "-1", "x", "", "4000000", "99999999999999999999"}) {
    MakePidFile(number);
  }
  WriteFile("/var/run/velathumb.pid", std::to_string(getpid()));
  EXPECT_THAT(RunningInstances(), IsEmpty());
}

/// For as long as the object lives, /proc shows only processes that may be looked into.
class SecretiveProcesses {
 public:
  SecretiveProcesses() {
    if (mount("proc", "/proc", "proc", MS_NOSUID | MS_NODEV | MS_NOEXEC, "hidepid=ptraceable") !=
        0) {
      EnvironmentFailureWithErrno("cannot mount a /proc that hides processes");
    }
  }
  ~SecretiveProcesses() { umount2("/proc", MNT_DETACH); }
  SecretiveProcesses(const SecretiveProcesses&) = delete;
  SecretiveProcesses& operator=(const SecretiveProcesses&) = delete;
};

/// A process that nobody without capabilities may look into.
class ClosedProcess {
 public:
  ClosedProcess() : pid_(fork()) {
    if (pid_ == 0) {
      prctl(PR_SET_DUMPABLE, 0);
      raise(SIGSTOP);
      _exit(0);
    }
    EXPECT_EQ(waitpid(pid_, nullptr, WUNTRACED), pid_);
  }
  ~ClosedProcess() {
    kill(pid_, SIGKILL);
    waitpid(pid_, nullptr, 0);
  }
  ClosedProcess(const ClosedProcess&) = delete;
  ClosedProcess& operator=(const ClosedProcess&) = delete;

  pid_t Pid() const { return pid_; }

 private:
  const pid_t pid_;
};

TEST_F(Instances, MayBeProcessesThatMayNotBeLookedAt) {
  const ClosedProcess closed;
  MakePidFile(std::to_string(closed.Pid()));
  EXPECT_THAT(RunningInstances(), IsEmpty()) << "whoever may look sees another program";
  const SecretiveProcesses secretive;
  MakePidFile("4000000");
  const WithoutCapabilities ordinary;
  ASSERT_FALSE(Exists("/proc/" + std::to_string(closed.Pid())));
  EXPECT_THAT(RunningInstances(), ElementsAre(closed.Pid()));
}

}  // namespace
}  // namespace vela_test
