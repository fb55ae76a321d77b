// The sandbox in a root directory made by chroot, as those that build packages start programs.
#include <gtest/gtest.h>
#include <sys/mount.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <optional>
#include <string>

#include "support/environment_failure.h"
#include "support/files.h"
#include "support/mounts.h"
#include "support/named_case.h"
#include "support/program.h"
#include "support/sandbox.h"
#include "support/selftest/process_count.h"

namespace vela_test {
namespace {

namespace fs = std::filesystem;

constexpr const char* kVolume = "/tmp/volume";
constexpr const char* kRoot = "/tmp/volume/root";

void Show(const std::string& directory, const std::string& place) {
  MakeDirectories(place);
  if (mount(directory.c_str(), place.c_str(), nullptr, MS_BIND | MS_REC, nullptr) != 0) {
    EnvironmentFailureWithErrno("cannot show " + directory + " at " + place);
  }
}

/// What a test program needs at `name` in the root directory: the machine's directory or link.
void ShowOfMachine(const std::string& name) {
  const fs::path machine = HostPath("/" + name);
  const fs::path place = fs::path(kRoot) / name;
  if (fs::is_symlink(machine)) {
    fs::copy_symlink(machine, place);
  } else if (fs::is_directory(machine)) {
    Show(machine, place);
  }
}

void SetSharing(unsigned long sharing) {
  if (mount(nullptr, "/", nullptr, MS_REC | sharing, nullptr) != 0) {
    EnvironmentFailureWithErrno("cannot change how mounts are shared");
  }
}

struct RootCase : NamedCase {
  bool isMountPoint;
};

/// The mounts are shared, as on most machines: one that the program makes would also appear here.
class SandboxRoot : public SandboxTest, public testing::WithParamInterface<RootCase> {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    volume_.emplace(kVolume, 1 << 20);
    MakeDirectories(kRoot);
    SetSharing(MS_SHARED);
    if (GetParam().isMountPoint) {
      Show(kRoot, kRoot);
    }
    for (const char* name : {"bin", "dev", "etc", "lib", "lib32", "lib64", "sbin", "usr", "var"}) {
      ShowOfMachine(name);
    }
    for (const char* place : {"/proc", "/.build", kSourcePlace}) {
      Show(place, std::string(kRoot) + place);
    }
  }

  void TearDown() override { SetSharing(MS_PRIVATE); }

  static Program Start(const std::string& test) {
    ProgramOptions options;
    options.beforeExec = {[] { return chroot(kRoot) == 0 && chdir("/") == 0 ? 0 : errno; }};
    return StartProgram(BuiltPath(PROBE_FILE), {"--gtest_filter=Probe." + test}, options);
  }

 private:
  std::optional<SmallVolume> volume_;
};

TEST_P(SandboxRoot, IsReplacedAfterAChroot) {
  const auto result = Start("Passes").Wait();
  ASSERT_TRUE(result);
  EXPECT_EQ(result->err, "");
  EXPECT_EQ(result->exitCode, 0);
}

TEST_P(SandboxRoot, IsNotChangedForTheMachine) {
  const std::string mounts = ReadFile("/proc/self/mountinfo");
  const size_t before = ProcessCount();
  const Program program = Start("Sleeps");
  ASSERT_TRUE(AwaitProcessCount(before + kProcessesOfASandbox)) << program.Error();
  EXPECT_EQ(ReadFile("/proc/self/mountinfo"), mounts);
}

INSTANTIATE_TEST_SUITE_P(Kinds, SandboxRoot,
                         testing::Values(RootCase{{"Directory"}, false},
                                         RootCase{{"MountPoint"}, true}),
                         CaseName());

}  // namespace
}  // namespace vela_test
