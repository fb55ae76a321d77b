#include "support/sandbox.h"

#include <fcntl.h>
#include <signal.h>
#include <stdlib.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <time.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <iterator>
#include <set>
#include <string>
#include <vector>

#include "support/descriptor.h"
#include "support/environment_failure.h"
#include "support/farm.h"
#include "support/namespaces.h"
#include "support/new_root.h"
#include "support/private_place.h"
#include "support/stub_files.h"
#include "support/system_log.h"

namespace vela_test {

namespace {

constexpr const char* kHost = "/.host";
constexpr const char* kBuildPlace = "/.build";

// Mounted, not linked, so that they have their usual names in /proc/<pid>/fd.
constexpr const char* kDevices[] = {"null", "zero", "full", "random", "urandom", "tty"};

struct SandboxState {
  bool inside = false;
  pid_t testProcess = 0;  // the only one that may reset the sandbox
  std::vector<Farm> farms;
  std::vector<PrivatePlace> places;
};

SandboxState& State() {
  static SandboxState* state = new SandboxState;  // never destroyed
  return *state;
}

void MakeDirectory(const std::string& path) {
  if (mkdir(path.c_str(), 0755) != 0 && errno != EEXIST) {
    EnvironmentFailureWithErrno("cannot make " + path);
  }
}

void MakeReadOnly(const char* path) {
  mount_attr attributes{};
  attributes.attr_set = MOUNT_ATTR_RDONLY;
  if (mount_setattr(AT_FDCWD, path, AT_RECURSIVE, &attributes, sizeof attributes) != 0) {
    EnvironmentFailureWithErrno("cannot protect the machine's files from the tests");
  }
}

void Bind(const std::string& from, const std::string& to) {
  if (mount(from.c_str(), to.c_str(), nullptr, MS_BIND | MS_REC, nullptr) != 0) {
    EnvironmentFailureWithErrno("cannot show " + from + " at " + to);
  }
}

/// The files of the build are also shown where every user can reach them, wherever the clone is,
/// and where no private directory hides them.
std::vector<ShownDirectory> ShownDirectories(const std::string& writableDirectory) {
  // A sandbox within another one may find them only at their places in that one.
  std::vector<ShownDirectory> directories = {{kHost, {"/"}},
                                             {kBuildPlace, {BUILD_DIRECTORY, kBuildPlace}},
                                             {kSourcePlace, {SOURCE_DIRECTORY, kSourcePlace}}};
  if (!writableDirectory.empty()) {
    directories.push_back({kWritablePlace, {writableDirectory}});
  }
  return directories;
}

void ShowDevices() {
  for (const char* device : kDevices) {
    const std::string path = std::string("/dev/") + device;
    const Descriptor file(open(path.c_str(), O_CREAT | O_WRONLY | O_CLOEXEC, 0666));
    if (!file.IsOpen()) {
      EnvironmentFailureWithErrno("cannot make " + path);
    }
    Bind(HostPath(path), path);
  }
}

/// Where a program looks that does not find it near itself. The path of the test program in /proc
/// is that outside the sandbox and may not exist inside.
void LinkHeaderReader() {
  MakeDirectory("/usr/libexec");
  const std::string target = std::string(kBuildPlace) + "/libexec/velathumb";
  if (symlink(target.c_str(), "/usr/libexec/velathumb") != 0) {
    EnvironmentFailureWithErrno("cannot link the header reader");
  }
}

void CreateFarms() {
  std::vector<Farm>& farms = State().farms;
  std::set<std::string> devices = {"shm", "log"};
  devices.insert(std::begin(kDevices), std::end(kDevices));
  MakeDirectory("/var");
  if (symlink("/run", "/var/run") != 0) {
    EnvironmentFailureWithErrno("cannot make /var/run");
  }
  for (const char* path :
       {"/usr", "/usr/vela", "/var/spool", "/dev", "/dev/shm", "/tmp", "/run", "/proc"}) {
    MakeDirectory(path);
  }
  farms.emplace_back("/usr", std::set<std::string>{"bin", "vela", "libexec"});
  farms.emplace_back("/usr/bin", std::set<std::string>{});
  LinkHeaderReader();
  farms.emplace_back("/usr/libexec", std::set<std::string>{"velathumb"});
  farms.emplace_back("/etc", std::set<std::string>{}, "velainfo.conf");
  farms.emplace_back("/var", std::set<std::string>{"run", "spool", "lib"});
  farms.emplace_back("/var/lib", std::set<std::string>{}, "velaindex");
  farms.emplace_back("/dev", devices);
  farms.emplace_back("/", std::set<std::string>{"tmp", "run", "var", "usr", "etc", "dev", "proc",
                                                ".host", ".build", ".source", ".writable", ".log"});
}

void MountPrivatePlaces() {
  std::vector<PrivatePlace>& places = State().places;
  // The size of /tmp exceeds the 1 GiB of free space that the program requires. Only written data
  // uses memory.
  places.emplace_back("/tmp", 01777, "2g");
  places.emplace_back("/run", 0755, "64m");
  places.emplace_back("/var/spool", 0755, "64m");
  places.emplace_back("/usr/vela", 0755, "64m");
  places.emplace_back("/dev/shm", 01777, "64m");
}

/// Creates the initial content of the private directories.
void FillPrivatePlaces() {
  MakeDirectory("/usr/vela/bin");
  MakeStubDirectory();
}

void MountProcesses() {
  if (mount("proc", "/proc", "proc", MS_NOSUID | MS_NODEV | MS_NOEXEC, nullptr) != 0) {
    EnvironmentFailureWithErrno("cannot mount /proc of the sandbox");
  }
}

void BuildSandbox(const std::string& writableDirectory) {
  const mode_t mask = umask(0);
  MoveToNewRoot(ShownDirectories(writableDirectory));
  State().inside = true;
  CreateFarms();
  ShowDevices();
  MountPrivatePlaces();
  FillPrivatePlaces();
  MountProcesses();
  for (const char* place : {kHost, kBuildPlace, kSourcePlace}) {
    MakeReadOnly(place);
  }
  umask(mask);
}

/// Removes everything from the environment that refers to directories outside.
void SetEnvironment() {
  for (const char* name : {"TMPDIR", "TMP", "TEMP"}) {
    unsetenv(name);
  }
  setenv("HOME", "/nonexistent", 1);  // tools then run without their caches there
}

void EndOtherProcesses() {
  constexpr int kTries = 10000;
  for (int i = 0; i < kTries; ++i) {
    // Everything but process 1 and the caller; the sandbox has its own process table.
    if (kill(-1, SIGKILL) != 0 && errno == ESRCH) {
      return;
    }
    while (waitpid(-1, nullptr, WNOHANG) > 0) {
    }
    const timespec pause = {0, 1000000};
    nanosleep(&pause, nullptr);
  }
  EnvironmentFailure("processes of an earlier test do not end");
}

}  // namespace

void EnterSandbox(const std::string& writableDirectory) {
  SandboxState& state = State();
  if (state.inside) {
    return;
  }
  EnterNamespaces([&writableDirectory] { BuildSandbox(writableDirectory); });
  state.testProcess = getpid();
  SetEnvironment();
  StartLogRecorder();
}

void ResetSandbox() {
  const SandboxState& state = State();
  if (!state.inside) {
    EnvironmentFailure("the sandbox has not been entered");
  }
  if (getpid() != state.testProcess) {
    return;  // the child of a death test uses its parent's sandbox
  }
  EndOtherProcesses();
  if (chdir("/") != 0) {
    EnvironmentFailureWithErrno("cannot change to /");
  }
  const mode_t mask = umask(0);
  for (const PrivatePlace& place : state.places) {
    place.Restore();
  }
  for (const Farm& farm : state.farms) {
    farm.Restore();
  }
  FillPrivatePlaces();
  umask(mask);
  StartLogRecorder();
  ClearLog();
}

std::string HostPath(const std::string& path) {
  return State().inside ? kHost + path : path;
}

std::string BuiltPath(const std::string& path) {
  return kBuildPlace + path.substr(std::strlen(BUILD_DIRECTORY));
}

}  // namespace vela_test
