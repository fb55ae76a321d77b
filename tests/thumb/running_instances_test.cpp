// Which instances are running.
#include "thumb/running_instances.h"

#include <sys/mount.h>
#include <sys/prctl.h>

#include "support/environment_failure.h"
#include "thumb/thumb_test.h"

using namespace vela;

namespace vela_test {
namespace {

void MakePidFile(const std::string& number) {
  WriteFile("/var/run/velathumb." + number + ".pid", "");
}

/// A waiting process, started as a program of this name.
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

TEST_F(Instances, DoNotExistWithoutPidFiles) {
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

TEST_F(Instances, AreNotOtherProgramsWithThatProcessId) {
  for (const char* name : {"sleep", "velathumb-queue", "velathum", "xvelathumb"}) {
    const Program other = StartAs(name);
    MakePidFile(std::to_string(other.Pid()));
    EXPECT_THAT(RunningInstances(), IsEmpty()) << name;
  }
}

TEST_F(Instances, DoNotExistWithoutAProcess) {
  for (const char* number : {"0", "-1", "x", "", "4000000", "99999999999999999999"}) {
    MakePidFile(number);
  }
  WriteFile("/var/run/velathumb.pid", std::to_string(getpid()));
  EXPECT_THAT(RunningInstances(), IsEmpty());
}

/// While the object exists, /proc shows only processes that may be inspected.
class HiddenProcesses {
 public:
  HiddenProcesses() {
    if (mount("proc", "/proc", "proc", MS_NOSUID | MS_NODEV | MS_NOEXEC, "hidepid=ptraceable") !=
        0) {
      EnvironmentFailureWithErrno("cannot mount a /proc that hides processes");
    }
  }
  ~HiddenProcesses() { umount2("/proc", MNT_DETACH); }
  HiddenProcesses(const HiddenProcesses&) = delete;
  HiddenProcesses& operator=(const HiddenProcesses&) = delete;
};

/// A process that cannot be inspected without capabilities.
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

TEST_F(Instances, MayBeProcessesThatCannotBeInspected) {
  const ClosedProcess closed;
  MakePidFile(std::to_string(closed.Pid()));
  EXPECT_THAT(RunningInstances(), IsEmpty()) << "it is seen to be another program";
  const HiddenProcesses hidden;
  MakePidFile("4000000");
  const WithoutCapabilities ordinary;
  ASSERT_FALSE(Exists("/proc/" + std::to_string(closed.Pid())));
  EXPECT_THAT(RunningInstances(), ElementsAre(closed.Pid()));
}

}  // namespace
}  // namespace vela_test
