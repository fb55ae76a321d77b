// What a confined process, and a confined child, can no longer do.
#include "posix/confinement.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/ptrace.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <functional>
#include <string>
#include <vector>

#include "posix/child_process.h"
#include "posix/file_descriptor.h"
#include "support/child_call.h"
#include "support/files.h"
#include "support/sandbox.h"
#include "support/seccomp_fail.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::HasSubstr;
using ::testing::UnorderedElementsAre;

constexpr char kInput[] = "/tmp/in/photo.jpg";
constexpr char kSecret[] = "/tmp/other/secret.jpg";
constexpr char kOutputs[] = "/tmp/out";

int ErrorOfOpening(const std::string& path, int flags = O_RDONLY) {
  const FileDescriptor file(open(path.c_str(), flags | O_CLOEXEC, 0600));
  return file.IsOpen() ? 0 : errno;
}

/// Exit status of a child that could not be confined.
constexpr int kNotConfined = 255;

/// The result of `task` in a child that is confined; `before` happens between the preparation and
/// the beginning of the confinement.
int Confined(
    const Confinement& confinement, const std::function<int()>& task,
    const std::function<void()>& before = [] {}) {
  return InChild([&] {
    PreparedConfinement prepared;
    if (prepared.Prepare(confinement) != 0) {
      return kNotConfined;
    }
    before();
    return prepared.Enter() == 0 ? task() : kNotConfined;
  });
}

/// The error of this kernel for files that are out of reach.
int ErrorOutside() {
  return LandlockVersion() < 1 ? 0 : EACCES;
}

/// Makes the file or link another user's. Returns false where there is only one user.
bool GiveTo(const std::string& path, uid_t user) {
  return lchown(path.c_str(), user, user) == 0;
}

void Link(const std::string& target, const std::string& path) {
  ASSERT_EQ(symlink(target.c_str(), path.c_str()), 0);
}

class ConfinedProcess : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    WriteFile(kInput, "photo");
    WriteFile(kSecret, "secret");
    MakeDirectories(kOutputs);
    WriteFile("/tmp/out/old", "old");
    confinement_.files = AllowedFiles{{HostPath("/usr/bin"), "/lib", "/lib64", "/usr/lib"},
                                      {"/etc/ld.so.cache"},
                                      {"/dev/null"},
                                      {kInput},
                                      {kOutputs}};
  }

  int ErrorOfReading(const std::string& path) const {
    return Confined(confinement_, [&path] { return ErrorOfOpening(path); });
  }

  Confinement confinement_;
};

TEST_F(ConfinedProcess, ReadsItsInputAndNoOtherFile) {
  EXPECT_EQ(ErrorOfReading(kInput), 0);
  for (const char* path : {
         kSecret, "/tmp/other", "/tmp/in", "/etc/passwd", "/", "/usr/share", "/run",
// A sanitizer reads its own process's memory map.
#if !defined(__SANITIZE_ADDRESS__)
             "/proc/1/status"
#endif
       }) {
    EXPECT_EQ(InChild([path] { return ErrorOfOpening(path); }), 0) << path;
    EXPECT_EQ(ErrorOfReading(path), ErrorOutside()) << path;
  }
}

TEST_F(ConfinedProcess, WritesOnlyInItsOutputDirectory) {
  const auto error = [this](const std::string& path, int flags) {
    return Confined(confinement_, [&] { return ErrorOfOpening(path, flags); });
  };
  EXPECT_EQ(error("/tmp/out/new", O_WRONLY | O_CREAT), 0);
  EXPECT_EQ(error("/tmp/out/old", O_RDWR | O_TRUNC), 0);
  EXPECT_EQ(error("/dev/null", O_WRONLY), 0);
  EXPECT_EQ(Confined(confinement_, [] { return ErrorOf(unlink("/tmp/out/old")); }), 0);
  EXPECT_FALSE(Exists("/tmp/out/old"));
  EXPECT_EQ(error(kInput, O_WRONLY), ErrorOutside());
  EXPECT_EQ(error(kSecret, O_WRONLY | O_TRUNC), ErrorOutside());
  EXPECT_EQ(error("/tmp/other/new", O_WRONLY | O_CREAT), ErrorOutside());
  EXPECT_EQ(Confined(confinement_, [] { return ErrorOf(unlink(kSecret)); }), ErrorOutside());
}

TEST_F(ConfinedProcess, DoesNotReadAnotherFileThatReplacesItsInputAfterTheCheck) {
  EXPECT_EQ(
      Confined(
          confinement_, [] { return ErrorOfOpening(kInput); }, [] { rename(kSecret, kInput); }),
      ErrorOutside());
}

TEST_F(ConfinedProcess, DoesNotReadTheTargetOfALinkThatReplacesItsInputAfterTheCheck) {
  EXPECT_EQ(Confined(
                confinement_, [] { return ErrorOfOpening(kInput); },
                [] {
                  unlink(kInput);
                  static_cast<void>(!symlink(kSecret, kInput));
                }),
            ErrorOutside());
}

TEST_F(ConfinedProcess, DoesNotWriteToADirectoryThatReplacesItsOutputsAfterTheCheck) {
  EXPECT_EQ(Confined(
                confinement_, [] { return ErrorOfOpening("/tmp/out/new", O_WRONLY | O_CREAT); },
                [] {
                  rename(kOutputs, "/tmp/moved");
                  static_cast<void>(!symlink("/tmp/other", kOutputs));
                }),
            ErrorOutside());
  EXPECT_FALSE(Exists("/tmp/other/new"));
}

TEST_F(ConfinedProcess, DoesNotReadThroughAnotherUsersLink) {
  Link(kSecret, "/tmp/in/link.jpg");
  confinement_.files->inputs = {"/tmp/in/link.jpg"};
  EXPECT_EQ(ErrorOfReading("/tmp/in/link.jpg"), 0) << "the link of this user";
  const bool isOthers = GiveTo("/tmp/in/link.jpg", 1001);
  EXPECT_EQ(ErrorOfReading("/tmp/in/link.jpg"), isOthers ? ErrorOutside() : 0);
  GiveTo(kSecret, 1002);
  EXPECT_EQ(ErrorOfReading("/tmp/in/link.jpg"), isOthers ? ErrorOutside() : 0);
  GiveTo(kSecret, 1001);
  EXPECT_EQ(ErrorOfReading("/tmp/in/link.jpg"), 0) << "the link of the file's owner";
}

TEST_F(ConfinedProcess, DoesNotReadThroughAChainThatContainsAnotherUsersLink) {
  Link("../other/secret.jpg", "/tmp/in/second");
  Link("second", "/tmp/in/first");
  confinement_.files->inputs = {"/tmp/in/first"};
  EXPECT_EQ(ErrorOfReading("/tmp/in/first"), 0);
  const bool isOthers = GiveTo("/tmp/in/second", 1001);
  EXPECT_EQ(ErrorOfReading("/tmp/in/first"), isOthers ? ErrorOutside() : 0);
}

TEST_F(ConfinedProcess, DoesNotWriteThroughAnotherUsersLinkInPlaceOfADirectory) {
  Link("/tmp/other", "/tmp/in/@eaDir");
  MakeDirectories("/tmp/other/photo.jpg");
  confinement_.files->outputs = {"/tmp/in/@eaDir/photo.jpg"};
  const auto error = [this] {
    return Confined(confinement_, [] {
      return ErrorOfOpening("/tmp/in/@eaDir/photo.jpg/new", O_WRONLY | O_CREAT);
    });
  };
  EXPECT_EQ(error(), 0);
  const bool isOthers = GiveTo("/tmp/in/@eaDir", 1001);
  EXPECT_EQ(error(), isOthers ? ErrorOutside() : 0);
}

TEST_F(ConfinedProcess, EndsACircleOfLinks) {
  Link("b", "/tmp/in/a");
  Link("a", "/tmp/in/b");
  confinement_.files->inputs = {"/tmp/in/a"};
  EXPECT_EQ(ErrorOfReading("/tmp/in/a"), ELOOP);
}

TEST_F(ConfinedProcess, FollowsTheSystemsLinksWhereTheKernelCannotCheckThem) {
  Link(kInput, "/tmp/in/link.jpg");
  confinement_.files->inputs = {"/tmp/in/../in//./link.jpg"};
  EXPECT_EQ(InChild([this] {
              SeccompFail({437}, ENOSYS)();  // openat2
              PreparedConfinement prepared;
              const int error = prepared.Prepare(confinement_);
              return error != 0 || prepared.Enter() != 0 ? kNotConfined : ErrorOfOpening(kInput);
            }),
            0);
}

TEST_F(ConfinedProcess, RunsOnlyItsPrograms) {
  WriteFile("/tmp/out/program", "#!/bin/sh\nexit 0\n");
  chmod("/tmp/out/program", 0755);
  const auto error = [this](const char* program) {
    return Confined(confinement_, [program] {
      execl(program, program, "-c", "exit 0", nullptr);
      return errno;
    });
  };
  EXPECT_EQ(error("/bin/sh"), 0);
  EXPECT_EQ(error("/tmp/out/program"), ErrorOutside());
}

TEST_F(ConfinedProcess, MakesNoSystemCallsThatReadingPhotosDoesNotNeed) {
  const struct {
    const char* name;
    std::function<long()> call;
  } cases[] = {
      {"internet socket", [] { return socket(AF_INET, SOCK_STREAM, 0); }},
      {"local socket", [] { return socket(AF_UNIX, SOCK_STREAM, 0); }},
#ifndef __SANITIZE_ADDRESS__
      {"ptrace", [] { return ptrace(PTRACE_TRACEME, 0, nullptr, nullptr); }},
#endif
      {"chmod", [] { return chmod("/tmp/out/old", 0666); }},
      {"chown", [] { return chown("/tmp/out/old", 0, 0); }},
      {"link", [] { return link("/tmp/out/old", "/tmp/out/second"); }},
      {"user namespace", [] { return syscall(SYS_clone, 0x10000000 | SIGCHLD, 0, 0, 0, 0); }},
      {"last of the list", [] { return syscall(469, -1, "", 0, 0, 0); }},
  };
  for (const auto& [name, call] : cases) {
    EXPECT_EQ(Confined(confinement_, [&call = call] { return ErrorOf(call()); }), EPERM) << name;
  }
#if defined(__x86_64__)
  constexpr long kOtherConvention = 0x40000000;
  EXPECT_EQ(Confined(confinement_, [] { return ErrorOf(syscall(kOtherConvention + SYS_getpid)); }),
            EPERM);
#endif
}

TEST_F(ConfinedProcess, MakesAllOtherSystemCalls) {
  EXPECT_EQ(Confined(confinement_,
                     [] {
                       const pid_t child = fork();
                       if (child == 0) {
                         _exit(0);
                       }
                       return ErrorOf(getpid()) + ErrorOf(waitpid(child, nullptr, 0)) +
                              ErrorOf(fcntl(0, F_GETFD)) + ErrorOf(syscall(SYS_clone3, nullptr, 0));
                     }),
            ENOSYS);
}

TEST_F(ConfinedProcess, GainsNoPrivilegesAndLeavesNoMemoryImage) {
  EXPECT_EQ(Confined(confinement_,
                     [] {
                       rlimit limit = {};
                       getrlimit(RLIMIT_CORE, &limit);
                       const bool hasImage = limit.rlim_cur > 1 || limit.rlim_max > 1;
                       return hasImage ? 2 : prctl(PR_GET_NO_NEW_PRIVS, 0, 0, 0, 0);
                     }),
            1);
}

#ifndef __SANITIZE_ADDRESS__
TEST_F(ConfinedProcess, CannotAllocateMoreMemoryThanItsLimit) {
  constexpr size_t kMebibyte = 1048576;
  confinement_.limits.memory = 100 * kMebibyte;
  const auto canAllocate = [this](size_t size) {
    return Confined(confinement_, [size] {
      void* const memory = malloc(size);
      return memory == nullptr ? 0 : 1;
    });
  };
  EXPECT_EQ(canAllocate(20 * kMebibyte), 1);
  EXPECT_EQ(canAllocate(110 * kMebibyte), 0);
}
#endif

TEST_F(ConfinedProcess, IsEndedWhenItsProcessorTimeIsUsedUp) {
  const int status = WaitStatusOf([] {
    PreparedConfinement prepared;
    Confinement confinement;
    confinement.limits.processorSeconds = 1;
    if (prepared.Prepare(confinement) != 0 || prepared.Enter() != 0) {
      return kNotConfined;
    }
    for (volatile int i = 0;; i = i + 1) {
    }
  });
  ASSERT_TRUE(WIFSIGNALED(status));
  EXPECT_EQ(WTERMSIG(status), SIGXCPU);
}

TEST_F(ConfinedProcess, WritesNoFileBeyondItsLimit) {
  confinement_.limits.fileSize = 1000;
  const auto write = [this](size_t size) {
    return Confined(confinement_, [size] {
      signal(SIGXFSZ, SIG_IGN);
      const FileDescriptor file(open("/tmp/out/new", O_WRONLY | O_CREAT | O_CLOEXEC, 0600));
      const off_t end = static_cast<off_t>(size) - 1;
      return ErrorOf(pwrite(file.Get(), "x", 1, end));
    });
  };
  EXPECT_EQ(write(1000), 0);
  EXPECT_EQ(write(1001), EFBIG);
}

TEST_F(ConfinedProcess, KeepsLowerLimits) {
  confinement_.limits.fileSize = 1000;
  EXPECT_EQ(InChild([this] {
              rlimit limit = {10, 20};
              setrlimit(RLIMIT_FSIZE, &limit);
              PreparedConfinement prepared;
              if (prepared.Prepare(confinement_) != 0 || prepared.Enter() != 0) {
                return kNotConfined;
              }
              getrlimit(RLIMIT_FSIZE, &limit);
              return limit.rlim_cur == 10 && limit.rlim_max == 20 ? 0 : 1;
            }),
            0);
}

/// The result of `task` in a child that is confined although some system calls fail.
int ConfinedDespite(const BeforeExec& failures, const Confinement& confinement,
                    const std::function<int()>& task) {
  return InChild([&] {
    failures();
    PreparedConfinement prepared;
    const int error = prepared.Prepare(confinement);
    const int enterError = error == 0 ? prepared.Enter() : error;
    return enterError == 0 ? task() : 100 + enterError;
  });
}

TEST_F(ConfinedProcess, MakesOnlyTheSocketsThatItMay) {
  confinement_.files = std::nullopt;
  confinement_.sockets = SocketUse::kLocalDatagrams;
  const auto confined = [&](const std::function<long()>& call) {
    return ConfinedDespite([] { return 0; }, confinement_, [&] { return ErrorOf(call()); });
  };
  EXPECT_EQ(confined([] { return socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0); }), 0);
  EXPECT_EQ(confined([] { return connect(-1, nullptr, 0); }), EBADF);
  EXPECT_EQ(confined([] { return socket(AF_UNIX, SOCK_STREAM, 0); }), EPERM);
  EXPECT_EQ(confined([] { return socket(AF_INET, SOCK_DGRAM, 0); }), EPERM);
  EXPECT_EQ(confined([] { return bind(-1, nullptr, 0); }), EPERM);
  EXPECT_EQ(confined([] { return sendmsg(-1, nullptr, 0); }), EPERM);
}

TEST_F(ConfinedProcess, KeepsTheOtherRestrictionsWhereOneIsNotSupported) {
  const auto openSocket = [] { return ErrorOf(socket(AF_UNIX, SOCK_STREAM, 0)); };
  const auto readSecret = [] { return ErrorOfOpening(kSecret); };
  const BeforeExec noLandlock = SeccompFail({SYS_landlock_create_ruleset}, ENOSYS);
  EXPECT_EQ(ConfinedDespite(noLandlock, confinement_, openSocket), EPERM);
  EXPECT_EQ(ConfinedDespite(noLandlock, confinement_, readSecret), 0);
  for (const int error : {ENOSYS, EPERM, EINVAL}) {
    const BeforeExec noSeccomp = SeccompFail({SYS_seccomp}, error);
    EXPECT_EQ(ConfinedDespite(noSeccomp, confinement_, openSocket), 0);
    EXPECT_EQ(ConfinedDespite(noSeccomp, confinement_, readSecret), ErrorOutside());
  }
}

TEST_F(ConfinedProcess, DoesNotRunWhereASupportedRestrictionFails) {
  const auto nothing = [] { return 0; };
  EXPECT_EQ(ConfinedDespite(SeccompFail({SYS_seccomp}, ENOMEM), confinement_, nothing),
            100 + ENOMEM);
  if (LandlockVersion() >= 1) {
    EXPECT_EQ(
        ConfinedDespite(SeccompFail({SYS_landlock_restrict_self}, ENOMEM), confinement_, nothing),
        100 + ENOMEM);
    EXPECT_EQ(ConfinedDespite(LimitResource(RLIMIT_NOFILE, 3), confinement_, nothing),
              100 + EMFILE);
  }
}

/// A child program with its output in a file.
class ConfinedChild : public ConfinedProcess {
 protected:
  /// Returns the output of a shell command in a confined child; "error N" when it is not started.
  std::string OutputOf(const std::string& command) {
    constexpr char kOutput[] = "/tmp/output";
    FileDescriptor file(open(kOutput, O_RDWR | O_CREAT | O_TRUNC | O_CLOEXEC, 0600));
    std::string program = "/bin/sh";
    std::string option = "-c";
    std::string text = command;
    char* const arguments[] = {program.data(), option.data(), text.data(), nullptr};
    pid_t pid = -1;
    const int error =
        StartChild(program.c_str(), arguments, {file.Get(), file.Get()}, confinement_, pid);
    if (error != 0) {
      return "error " + std::to_string(error);
    }
    ReapChild(pid);
    return ReadFile(kOutput);
  }
};

TEST_F(ConfinedChild, CannotReadOtherFiles) {
  EXPECT_EQ(OutputOf("cat /tmp/in/photo.jpg"), "photo");
  EXPECT_EQ(OutputOf("cat /tmp/other/secret.jpg 2>/dev/null"), ErrorOutside() == 0 ? "secret" : "");
}

TEST_F(ConfinedChild, DoesNotSeeTheEnvironmentOfItsParent) {
  setenv("SECRET_TOKEN", "secret", 1);
  confinement_.environment = {"MAGICK_TEMPORARY_PATH=/tmp/out"};
  OutputOf("exec /usr/bin/env >/tmp/out/environment");
  unsetenv("SECRET_TOKEN");
  std::vector<std::string> variables;
  for (const std::string& line : ReadLines("/tmp/out/environment")) {
    if (line.rfind("PWD=", 0) != 0 && line.rfind("_=", 0) != 0) {  // of the shell itself
      variables.push_back(line);
    }
  }
  EXPECT_THAT(variables, UnorderedElementsAre("PATH=/usr/sbin:/usr/bin:/sbin:/bin", "LC_ALL=C",
                                              "HOME=/", "MAGICK_TEMPORARY_PATH=/tmp/out"));
}

TEST_F(ConfinedChild, IsNotStartedWithAProgramThatItMayNotRun) {
  confinement_.files->programs = {"/lib", "/lib64", "/usr/lib"};
  EXPECT_EQ(OutputOf("echo started"),
            ErrorOutside() == 0 ? "started\n" : "error " + std::to_string(EACCES));
}

TEST_F(ConfinedChild, LeavesItsParentUnconfined) {
  EXPECT_EQ(OutputOf("echo started"), "started\n");
  EXPECT_EQ(ErrorOfOpening(kSecret), 0);
  EXPECT_EQ(prctl(PR_GET_NO_NEW_PRIVS, 0, 0, 0, 0), 0);
  const FileDescriptor local(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
  EXPECT_TRUE(local.IsOpen());
}

TEST_F(ConfinedChild, HasNoDescriptorOfItsRuleset) {
  confinement_.files->data = {"/proc"};
  EXPECT_EQ(OutputOf("ls /proc/self/fd | wc -l"), "4\n") << "the fourth is that of the directory";
}

}  // namespace
}  // namespace vela_test
