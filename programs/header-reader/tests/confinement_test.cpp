// What the process that parses headers cannot do.

#include "confinement.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <linux/capability.h>
#include <sys/mman.h>
#include <sys/prctl.h>
#include <sys/ptrace.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <fstream>
#include <functional>
#include <string>
#include <vector>

#include "support/capabilities.h"
#include "support/child_call.h"
#include "support/files.h"
#include "support/sandbox.h"

namespace vela_test {
namespace {

/// The same after the process has been confined.
int Confined(const std::function<int()>& attempt) {
  return InChild([&attempt] {
    const int error = vela::EnterConfinement();
    return error != 0 ? error : attempt();
  });
}

struct Call {
  const char* name;
  std::function<long()> make;
};

class HeaderConfinement : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    WriteFile("/tmp/file", "content");
    file_ = open("/tmp/file", O_RDWR | O_CLOEXEC);
    ASSERT_GE(file_, 0);
  }
  void TearDown() override { close(file_); }

  std::vector<Call> RefusedCalls() const {
    return {
      {"open", [] { return open("/tmp/file", O_RDONLY); }},
          {"create", [] { return open("/tmp/new", O_WRONLY | O_CREAT, 0600); }},
          {"openat2", [] { return syscall(SYS_openat2, AT_FDCWD, "/tmp/file", nullptr, 0); }},
          {"stat", [] { return syscall(SYS_newfstatat, AT_FDCWD, "/tmp/file", nullptr, 0); }},
          {"access", [] { return syscall(SYS_faccessat, AT_FDCWD, "/tmp/file", R_OK); }},
          {"unlink", [] { return unlink("/tmp/file"); }},
          {"rename", [] { return rename("/tmp/file", "/tmp/other"); }},
          {"mkdir", [] { return mkdir("/tmp/directory", 0700); }},
          {"chmod", [] { return chmod("/tmp/file", 0666); }},
          {"chdir", [] { return chdir("/tmp"); }},
          {"ftruncate", [this] { return ftruncate(file_, 0); }},
          {"fchmod", [this] { return fchmod(file_, 0666); }},
          {"socket", [] { return socket(AF_INET, SOCK_STREAM, 0); }},
          {"unix socket", [] { return socket(AF_UNIX, SOCK_STREAM, 0); }},
          {"socketpair", [] { return syscall(SYS_socketpair, AF_UNIX, SOCK_STREAM, 0, nullptr); }},
          {"connect", [] { return connect(-1, nullptr, 0); }},
          {"sendmsg", [] { return sendmsg(-1, nullptr, 0); }},
#if !defined(__SANITIZE_ADDRESS__)
          {"pipe", [] { return syscall(SYS_pipe2, nullptr, 0); }},
#endif
          {"memfd_create", [] { return syscall(SYS_memfd_create, "a", 0); }},
          {"exec", [] { return execl("/bin/true", "true", nullptr); }},
          {"clone", [] { return syscall(SYS_clone, ~0UL, nullptr, nullptr, nullptr, nullptr); }},
          {"clone3", [] { return syscall(SYS_clone3, nullptr, 0); }},
          {"kill", [] { return kill(1, 0); }},
          {"ptrace", [] { return ptrace(PTRACE_TRACEME, 0, nullptr, nullptr); }},
          {"setuid", [] { return syscall(SYS_setresuid, -1, -1, -1); }},
          {"setrlimit", [] { return syscall(SYS_prlimit64, 0, RLIMIT_CPU, nullptr, nullptr); }},
          {"io_uring", [] { return syscall(SYS_io_uring_setup, 1, nullptr); }},
          {"dup2", [this] { return syscall(SYS_dup3, file_, 100, 0); }},
          {"set flags", [this] { return fcntl(file_, F_SETFL, O_ASYNC); }},
          {"mmap as program",
           [] { return MemoryError(PROT_READ | PROT_EXEC, MAP_PRIVATE | MAP_ANONYMOUS); }},
          {"mmap shared",
           [] { return MemoryError(PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS); }},
    };
  }

 private:
  static long MemoryError(int protection, int flags) {
    return mmap(nullptr, 4096, protection, flags, -1, 0) == MAP_FAILED ? -1 : 0;
  }

  int file_ = -1;
};

#if defined(__SANITIZE_ADDRESS__)
constexpr bool kIsSanitized = true;
#else
constexpr bool kIsSanitized = false;
#endif

TEST_F(HeaderConfinement, RefusesEverythingButReadingAndAnswering) {
  for (const Call& call : RefusedCalls()) {
    SCOPED_TRACE(call.name);
    EXPECT_NE(InChild([&call] { return ErrorOf(call.make()); }), EPERM);
    WriteFile("/tmp/file", "content");
    EXPECT_EQ(Confined([&call] { return ErrorOf(call.make()); }), EPERM);
    EXPECT_EQ(ReadFile("/tmp/file"), "content");
  }
}

TEST_F(HeaderConfinement, ReadsOpenFiles) {
  const int file = open("/tmp/file", O_RDONLY | O_CLOEXEC);
  EXPECT_EQ(Confined([file] {
              char text[8] = "";
              return read(file, text, 7) == 7 && std::string(text) == "content" ? 0 : 1;
            }),
            0);
  close(file);
}

/// The value of a line of the process's status after it has been confined; empty when it never is.
std::string ConfinedStatus(
    const std::string& name, void (*before)() = [] {}) {
  int ends[2] = {-1, -1};
  EXPECT_EQ(pipe2(ends, O_CLOEXEC), 0);
  const pid_t child = fork();
  if (child == 0) {
    close(ends[1]);
    char byte = 0;
    before();
    _exit(vela::EnterConfinement() != 0 || read(ends[0], &byte, 1) != 0 ? 1 : 0);
  }
  close(ends[0]);
  std::string value;
  for (int tries = 0; tries < 5000 && value.empty(); ++tries) {
    std::ifstream file("/proc/" + std::to_string(child) + "/status");
    std::string line;
    std::string found;
    bool isFiltered = false;
    while (std::getline(file, line)) {
      isFiltered = isFiltered || line == "Seccomp:\t2";
      if (line.rfind(name + ":", 0) == 0) found = line.substr(name.size() + 1);
    }
    value = isFiltered ? found : "";
    usleep(1000);
  }
  close(ends[1]);
  int status = -1;
  waitpid(child, &status, 0);
  EXPECT_EQ(status, 0);
  return value;
}

bool IsMapped(const char* map, long id) {
  std::ifstream file(map);
  long inside = 0;
  long outside = 0;
  long count = 0;
  while (file >> inside >> outside >> count) {
    if (id >= inside && id < inside + count) return true;
  }
  return false;
}

TEST_F(HeaderConfinement, HasNoPrivileges) {
  EXPECT_EQ(ConfinedStatus("NoNewPrivs"), "\t1");
  EXPECT_EQ(ConfinedStatus("Seccomp"), "\t2");
  // An ordinary user's sandbox has no other identity.
  if (IsMapped("/proc/self/uid_map", 65534) && IsMapped("/proc/self/gid_map", 65534)) {
    EXPECT_EQ(ConfinedStatus("Uid"), "\t65534\t65534\t65534\t65534");
    EXPECT_EQ(ConfinedStatus("Gid"), "\t65534\t65534\t65534\t65534");
    EXPECT_THAT(ConfinedStatus("Groups"), testing::Not(testing::ContainsRegex("[0-9]")));
  }
  EXPECT_EQ(ConfinedStatus("CapEff"), "\t0000000000000000");
  EXPECT_EQ(ConfinedStatus("CapPrm"), "\t0000000000000000");
}

/// As in a service that does not have it.
void GiveUpTheRightToChangeIdentity() {
  bool ok = false;
  SetEffectiveCapabilities(EffectiveCapabilities(&ok) & ~(uint64_t{1} << CAP_SETUID));
}

TEST_F(HeaderConfinement, KeepsNoPrivilegesWhenItCannotChangeItsIdentity) {
  EXPECT_EQ(ConfinedStatus("Uid", GiveUpTheRightToChangeIdentity), "\t0\t0\t0\t0");
  EXPECT_EQ(ConfinedStatus("CapEff", GiveUpTheRightToChangeIdentity), "\t0000000000000000");
  EXPECT_EQ(ConfinedStatus("CapPrm", GiveUpTheRightToChangeIdentity), "\t0000000000000000");
}

TEST_F(HeaderConfinement, HasLittleMemory) {
  if (kIsSanitized) return;  // its shadow memory exceeds every limit
  const auto isMapped = [] {
    constexpr size_t kSize = size_t{600} << 20;
    return mmap(nullptr, kSize, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0) !=
                   MAP_FAILED
               ? 1
               : 0;
  };
  EXPECT_EQ(InChild(isMapped), 1);
  EXPECT_EQ(Confined(isMapped), 0);
}

TEST_F(HeaderConfinement, IsStillThereForAFileLargerThanTheMemory) {
  ASSERT_EQ(truncate("/tmp/file", off_t{1} << 30), 0);
  const int file = open("/tmp/file", O_RDONLY | O_CLOEXEC);
  EXPECT_EQ(Confined([file] {
              return mmap(nullptr, size_t{1} << 30, PROT_READ, MAP_PRIVATE, file, 0) != MAP_FAILED
                         ? 0
                         : 1;
            }),
            0);
  close(file);
}

}  // namespace
}  // namespace vela_test
