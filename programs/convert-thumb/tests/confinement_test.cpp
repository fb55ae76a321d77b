// The restrictions of the converter while it reads a photo.

#include <fcntl.h>
#include <linux/landlock.h>
#include <linux/seccomp.h>
#include <sched.h>
#include <sys/ioctl.h>
#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/ptrace.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/uio.h>
#include <sys/wait.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <functional>
#include <future>
#include <system_error>
#include <thread>

#include "command_line/allowed_files.h"
#include "converter_fixture.h"
#include "process/confinement.h"
#include "support/child_call.h"
#include "support/seccomp_fail.h"

using namespace vela;

namespace vela_test {
namespace {

constexpr char kInside[] = "/tmp/inside";
constexpr char kOutside[] = "/tmp/outside";
constexpr char kInput[] = "/tmp/outside/input";
constexpr char kData[] = "/tmp/data";

AllowedFiles FilesInside() {
  AllowedFiles files;
  // "true", its loader and its libraries.
  files.programs = {"/bin/true", "/lib", "/lib64", "/usr/lib"};
  files.data = {"/etc/ld.so.cache", kData};
  files.devices = {"/dev/null"};
  files.inputs = {kInput};
  files.outputs = {kInside};
  return files;
}

/// The same after the process has been confined to kInside.
int Confined(const std::function<int()>& attempt) {
  return InChild([&attempt] {
    Confine(FilesInside());
    return attempt();
  });
}

int ErrorOfOpening(const std::string& path, int flags) {
  return ErrorOf(open(path.c_str(), flags | O_CLOEXEC, 0600));
}

/// The error that this kernel reports for changes outside kInside.
int ErrorOutside() {
  const long version =
      syscall(SYS_landlock_create_ruleset, nullptr, 0, LANDLOCK_CREATE_RULESET_VERSION);
  return version < 1 ? 0 : EACCES;
}

class Confinement : public ConverterTest {
 protected:
  void SetUp() override {
    ConverterTest::SetUp();
    for (const std::string directory : {kInside, kOutside, kData}) {
      MakeDirectories(directory);
      WriteFile(directory + "/file", "content");
    }
    WriteFile(kInput, "content");
  }
};

TEST_F(Confinement, ChangesFilesInside) {
  EXPECT_EQ(Confined([] { return ErrorOfOpening("/tmp/inside/new", O_WRONLY | O_CREAT); }), 0);
  EXPECT_TRUE(Exists("/tmp/inside/new"));
  EXPECT_EQ(Confined([] { return ErrorOfOpening("/tmp/inside/file", O_WRONLY | O_TRUNC); }), 0);
  EXPECT_EQ(ReadFile("/tmp/inside/file"), "");
  EXPECT_EQ(Confined([] { return ErrorOf(rename("/tmp/inside/new", "/tmp/inside/file")); }), 0);
  EXPECT_EQ(Confined([] { return ErrorOf(unlink("/tmp/inside/file")); }), 0);
  EXPECT_FALSE(Exists("/tmp/inside/file"));
  EXPECT_EQ(Confined([] { return ErrorOfOpening("/dev/null", O_WRONLY); }), 0);
}

TEST_F(Confinement, ChangesNoFilesElsewhere) {
  const int error = ErrorOutside();
  EXPECT_EQ(Confined([] { return ErrorOfOpening("/tmp/outside/new", O_WRONLY | O_CREAT); }), error);
  EXPECT_EQ(Confined([] { return ErrorOfOpening("/tmp/outside/file", O_RDWR); }), error);
  EXPECT_EQ(Confined([] { return ErrorOfOpening("/tmp/outside/file", O_WRONLY | O_TRUNC); }),
            error);
  EXPECT_EQ(Confined([] { return ErrorOf(unlink("/tmp/outside/file")); }), error);
  if (error != 0) {
    EXPECT_EQ(ReadFile("/tmp/outside/file"), "content");
    EXPECT_EQ(ListDirectory(kOutside), (std::vector<std::string>{"file", "input"}));
  }
}

TEST_F(Confinement, MovesNothingInOrOut) {
  if (ErrorOutside() == 0) {
    return;
  }
  EXPECT_NE(Confined([] { return ErrorOf(rename("/tmp/outside/file", "/tmp/inside/a")); }), 0);
  EXPECT_NE(Confined([] { return ErrorOf(rename("/tmp/inside/file", "/tmp/outside/a")); }), 0);
  EXPECT_NE(Confined([] { return ErrorOf(link("/tmp/outside/file", "/tmp/inside/a")); }), 0);
  EXPECT_EQ(ListDirectory(kInside), std::vector<std::string>{"file"});
}

TEST_F(Confinement, CreatesOnlyFiles) {
  EXPECT_EQ(Confined([] { return ErrorOf(mkdir("/tmp/inside/a", 0700)); }), ErrorOutside());
  EXPECT_EQ(Confined([] { return ErrorOf(symlink("/etc", "/tmp/inside/b")); }), EPERM);
  EXPECT_EQ(Confined([] { return ErrorOf(mknod("/tmp/inside/c", S_IFIFO | 0600, 0)); }), EPERM);
  EXPECT_EQ(Confined([] { return ErrorOf(link("/tmp/inside/file", "/tmp/inside/d")); }), EPERM);
}

TEST_F(Confinement, ReadsItsInputAndItsLibraries) {
  EXPECT_EQ(Confined([] { return ErrorOfOpening(kInput, O_RDONLY); }), 0);
  EXPECT_EQ(Confined([] { return ErrorOfOpening("/tmp/data/file", O_RDONLY); }), 0);
  EXPECT_EQ(Confined([] { return ErrorOfOpening("/usr/lib", O_RDONLY | O_DIRECTORY); }), 0);
  EXPECT_EQ(Confined([] { return ErrorOfOpening("/tmp/inside/file", O_RDONLY); }), 0);
}

TEST_F(Confinement, ReadsNothingElse) {
  const int error = ErrorOutside();
  for (const char* path : {
         "/tmp/outside/file", "/etc/passwd", "/dev/zero",
// A sanitizer reads its own process's memory map.
#if !defined(__SANITIZE_ADDRESS__)
             "/proc/1/environ"
#endif
       }) {
    EXPECT_EQ(InChild([path] { return ErrorOfOpening(path, O_RDONLY); }), 0) << path;
    EXPECT_EQ(Confined([path] { return ErrorOfOpening(path, O_RDONLY); }), error) << path;
  }
  for (const char* path : {"/tmp/outside", "/etc", "/"}) {
    EXPECT_EQ(Confined([path] { return ErrorOfOpening(path, O_RDONLY | O_DIRECTORY); }), error)
        << path;
  }
  EXPECT_EQ(Confined([] { return ErrorOfOpening(kInput, O_RDWR); }), error);
  EXPECT_EQ(Confined([] { return ErrorOfOpening("/tmp/data/file", O_WRONLY); }), error);
}

TEST_F(Confinement, RunsOnlyImageMagick) {
  if (ErrorOutside() == 0) {
    return;
  }
  CopyFile("/bin/true", "/tmp/inside/program");
  ASSERT_EQ(chmod("/tmp/inside/program", 0755), 0);
  EXPECT_EQ(Confined([] { return ErrorOf(execl("/tmp/inside/program", "a", nullptr)); }), EACCES);
  EXPECT_EQ(Confined([] { return ErrorOf(execl("/bin/true", "true", nullptr)); }), 0);
}

TEST_F(Confinement, KeepsItsOwnPhotoReadable) {
  // Neither in the directory of an output nor below one of the system.
  CopyFile(MakePhoto("a.jpg", 300, 200), "/tmp/outside/a.jpg");
  CopyFile(MakePicture("a.bmp", 300, 200), "/tmp/outside/a.bmp");
  for (const char* photo : {"/tmp/outside/a.jpg", "/tmp/outside/a.bmp"}) {
    const CommandLine line{photo, directory_, {{{}, directory_ + "/o.jpg"}}};
    ExpectSuccess(RunConverter(line.Arguments()));
  }
}

TEST_F(Confinement, LetsOneCommandLineReadNoSecondPhoto) {
  if (ErrorOutside() == 0) {
    return;
  }
  CopyFile(MakePicture("a.bmp", 30, 20), "/tmp/outside/a.bmp");
  CopyFile("/tmp/outside/a.bmp", "/tmp/outside/b.bmp");
  const std::string output = directory_ + "/o.png";
  ProgramOptions options;
  options.addedEnvironment = {"TMPDIR=" + directory_};
  ExpectSuccess(RunConverter({"/tmp/outside/a.bmp", "-negate", output}, options));
  RemoveTree(output);
  RunConverter({"/tmp/outside/a.bmp", "/tmp/outside/b.bmp", "-append", output}, options);
  // Its height would be twice that of the first.
  EXPECT_TRUE(!Exists(output) || Identify(output).height == 20);
}

TEST_F(Confinement, RefusesTheFileBehindAnOutputThatIsALink) {
  const std::string photo = MakePhoto("a.jpg", 300, 200);
  ASSERT_EQ(symlink("/tmp/outside/file", "/tmp/inside/link.jpg"), 0);
  const CommandLine line{photo, directory_, {{{}, "/tmp/inside/link.jpg"}}};
  const AllowedFiles files = FindAllowedFiles(ParseCommandLine(line.Arguments()));
  EXPECT_EQ(InChild([&files] {
              Confine(files);
              return ErrorOfOpening("/tmp/inside/link.jpg", O_WRONLY | O_TRUNC);
            }),
            ErrorOutside());
}

/// Arguments of a run in kInside, and files there and elsewhere of which it may write one.
struct OutputCase {
  std::vector<std::string> arguments;
  std::string written;
  std::vector<std::string> others;
};

const OutputCase kOutputCases[] = {
    {{"a.jpg", "-thumbnail", "9x9>", "-quality", "80", "jpg:/dev/null"},
     "/dev/null",
     {"/dev/x", "/tmp/inside/x", "/tmp/inside/jpg:/dev/x"}},
    {{"a.jpg", "-thumbnail", "9x9>", "-quality", "80", "jpg:/tmp/outside/o.jpg"},
     "/tmp/inside/jpg:/tmp/outside/x",
     {"/tmp/outside/x", "/tmp/inside/x"}},
    {{"a.jpg", "-thumbnail", "9x9>", "-quality", "80", "a:b/o.jpg"},
     "/tmp/inside/a:b/x",
     {"/tmp/inside/b/x", "/tmp/inside/x"}},
    {{"-rotate", "90", "jpg:/tmp/outside/o.jpg", "jpg:/tmp/outside/o.jpg"},
     "/tmp/inside/jpg:/tmp/outside/x",
     {"/tmp/outside/x", "/tmp/inside/x"}},
    {{"-rotate", "90", "50%%/o.jpg", "50%%/o.jpg"},
     "/tmp/inside/50%%/x",
     {"/tmp/inside/50%/x", "/tmp/inside/x"}},
    {{"-rotate", "45", "50%%/o.jpg", "50%%/o.jpg"},
     "/tmp/inside/50%%/x",
     {"/tmp/inside/50%/x", "/tmp/inside/x"}},
    // Only ImageMagick understands these.
    {{"a.jpg", "-negate", "png:/tmp/outside/o"},
     "/tmp/outside/x",
     {"/tmp/inside/png:/tmp/outside/x", "/tmp/inside/x"}},
    {{"a.jpg", "-negate", "50%%/o.png"}, "/tmp/inside/50%/x", {"/tmp/inside/x"}},
    {{"a.jpg", "-negate", "./a:b/o.png"}, "/tmp/inside/a:b/x", {"/tmp/inside/b/x"}},
    {{"a.jpg", "-negate", "null:"}, "/dev/null", {"/dev/x", "/tmp/inside/x"}},
    {{"a.jpg", "-negate", "-"}, "/dev/null", {"/dev/x", "/tmp/inside/x"}},
};

TEST_F(Confinement, WritesOnlyInTheDirectoriesThatTheOutputsName) {
  ASSERT_EQ(chdir(kInside), 0);
  for (const OutputCase& one : kOutputCases) {
    AllowedFiles files = FindAllowedFiles(vela::ParseCommandLine(one.arguments));
    files.outputs.erase(files.outputs.begin());  // the directory for temporary files, /tmp
    std::vector<std::string> paths = one.others;
    paths.push_back(one.written);
    for (const std::string& path : paths) {
      MakeDirectories(path.substr(0, path.rfind('/')));
    }
    for (const std::string& path : paths) {
      EXPECT_EQ(InChild([&] {
                  Confine(files);
                  return ErrorOfOpening(path, O_WRONLY | O_CREAT);
                }),
                path == one.written ? 0 : ErrorOutside())
          << path << " " << one.arguments.back();
    }
  }
  EXPECT_EQ(chdir("/"), 0);
}

TEST_F(Confinement, LetsAPhotoBeDiscarded) {
  for (const std::string& photo : {MakePhoto("a.jpg", 300, 200), MakePicture("a.bmp", 300, 200)}) {
    ProgramOptions options;
    options.workingDirectory = kInside;
    options.addedEnvironment = {"TMPDIR=/dev/null"};
    ExpectSuccess(RunConverter({photo, "-thumbnail", "160x160>", "-quality", "80", "jpg:/dev/null"},
                               options));
    EXPECT_EQ(ListDirectory(kInside), std::vector<std::string>{"file"}) << photo;
  }
}

TEST_F(Confinement, LetsARelativePathBeginLikeAFormat) {
  ProgramOptions options;
  options.workingDirectory = kInside;
  MakeDirectories("/tmp/inside/jpg:/tmp/outside");
  for (const std::string& photo : {MakePhoto("a.jpg", 300, 200), MakePicture("a.bmp", 300, 200)}) {
    const CommandLine line{photo, directory_, {{{}, "jpg:/tmp/outside/o.jpg"}}};
    ExpectSuccess(RunConverter(line.Arguments(), options));
    EXPECT_TRUE(Exists("/tmp/inside/jpg:/tmp/outside/o.jpg"));
    EXPECT_FALSE(Exists("/tmp/outside/o.jpg"));
    RemoveTree("/tmp/inside/jpg:/tmp/outside/o.jpg");
  }
}

TEST_F(Confinement, DoesNotOpenADirectoryThatAnOutputNames) {
  ASSERT_EQ(symlink(kOutside, "/tmp/inside/link"), 0);
  EXPECT_EQ(Confined([] { return ErrorOfOpening("/tmp/outside/new", O_WRONLY | O_CREAT); }),
            ErrorOutside());
}

/// A system call that every unconfined process may make.
struct Call {
  const char* name;
  std::function<long()> make;
};

std::vector<Call> RefusedCalls() {
  static int number = 0;
  static iovec part = {&number, sizeof number};
  return {
      {"socket", [] { return socket(AF_INET, SOCK_STREAM, 0); }},
      {"unix socket", [] { return socket(AF_UNIX, SOCK_STREAM, 0); }},
      {"connect", [] { return connect(-1, nullptr, 0); }},
      {"bind", [] { return bind(-1, nullptr, 0); }},
#ifndef __SANITIZE_ADDRESS__
      {"ptrace", [] { return ptrace(PTRACE_TRACEME, 0, nullptr, nullptr); }},
#endif
      {"process_vm_readv", [] { return process_vm_readv(getpid(), &part, 1, &part, 1, 0); }},
      {"keyctl", [] { return syscall(SYS_keyctl, -1, 0, 0, 0, 0); }},
      {"setns", [] { return setns(-1, 0); }},
      {"unshare", [] { return unshare(0); }},
      {"io_uring_enter", [] { return syscall(SYS_io_uring_enter, -1, 0, 0, 0, nullptr, 0); }},
      {"ioctl TIOCSTI", [] { return ioctl(-1, TIOCSTI, nullptr); }},
      {"ioctl TIOCLINUX", [] { return ioctl(-1, TIOCLINUX, nullptr); }},
      {"fchmod", [] { return fchmod(-1, 0600); }},
      {"chmod", [] { return chmod("/tmp/inside/file", 0666); }},
      {"fchmodat2", [] { return syscall(452, -1, "", 0600, 0); }},
      {"fchown", [] { return fchown(-1, 0, 0); }},
      {"lchown", [] { return lchown("/tmp/inside/none", 0, 0); }},
      {"utimensat", [] { return utimensat(AT_FDCWD, "/tmp/inside/file", nullptr, 0); }},
      {"setxattr", [] { return setxattr("/tmp/inside/none", "user.a", "", 0, 0); }},
      {"truncate", [] { return truncate("/tmp/inside/file", 1); }},
      {"symlink", [] { return symlink("a", "/tmp/none/a"); }},
      {"linkat", [] { return linkat(-1, "a", -1, "b", 0); }},
      {"kcmp", [] { return syscall(SYS_kcmp, getpid(), getpid(), -1, 0, 0); }},
      {"pidfd_send_signal", [] { return syscall(SYS_pidfd_send_signal, -1, 0, nullptr, 0); }},
  };
}

TEST_F(Confinement, RefusesUnneededSystemCalls) {
  for (const Call& call : RefusedCalls()) {
    EXPECT_NE(InChild([&call] { return ErrorOf(call.make()); }), EPERM) << call.name;
    EXPECT_EQ(Confined([&call] { return ErrorOf(call.make()); }), EPERM) << call.name;
  }
}

/// The error of creating a child with these flags.
int ErrorOfCloning(unsigned long flags) {
  const long child = syscall(SYS_clone, flags | SIGCHLD, 0, 0, 0, 0);
  if (child == 0) {
    _exit(0);
  }
  return ErrorOf(child);
}

TEST_F(Confinement, MakesNoNamespaces) {
  for (const unsigned long flag : {CLONE_NEWNS, CLONE_NEWCGROUP, CLONE_NEWUTS, CLONE_NEWIPC,
                                   CLONE_NEWUSER, CLONE_NEWPID, CLONE_NEWNET}) {
    EXPECT_NE(InChild([flag] { return ErrorOfCloning(flag); }), EPERM) << flag;
    EXPECT_EQ(Confined([flag] { return ErrorOfCloning(flag); }), EPERM) << flag;
  }
  EXPECT_EQ(Confined([] { return ErrorOfCloning(0); }), 0);
  EXPECT_EQ(Confined([] { return ErrorOf(syscall(SYS_clone3, nullptr, 0)); }), ENOSYS);
}

TEST_F(Confinement, GainsNoPrivileges) {
  EXPECT_EQ(Confined([] { return prctl(PR_GET_NO_NEW_PRIVS, 0, 0, 0, 0); }), 1);
}

TEST_F(Confinement, LeavesNoMemoryImage) {
  EXPECT_EQ(Confined([] {
              rlimit limit = {};
              getrlimit(RLIMIT_CORE, &limit);
              return limit.rlim_cur <= 1 && limit.rlim_max <= 1 ? 1 : 0;
            }),
            1);
}

int StartThreadAndProgram() {
  try {
    std::thread([] {}).join();
  } catch (const std::system_error& error) {
    return error.code().value();
  }
  const pid_t child = fork();
  if (child == 0) {
    execl("/bin/true", "true", nullptr);
    _exit(errno);
  }
  int status = 0;
  waitpid(child, &status, 0);
  return WEXITSTATUS(status);
}

TEST_F(Confinement, StartsThreadsAlwaysAndProgramsOnlyInTheFirstStage) {
  EXPECT_EQ(Confined(StartThreadAndProgram), 0);
  EXPECT_EQ(Confined([] {
              ConfineToThisProgram();
              return StartThreadAndProgram();
            }),
            EPERM);
}

TEST_F(Confinement, SignalsOnlyItselfInTheLastStage) {
  EXPECT_EQ(Confined([] {
              ConfineToThisProgram();
              return ErrorOf(kill(getppid(), 0));
            }),
            EPERM);
  EXPECT_EQ(Confined([] {
              ConfineToThisProgram();
              return ErrorOf(raise(0)) + ErrorOf(kill(getpid(), 0));
            }),
            0);
}

/// Starts a missing program: ENOENT where programs may be started.
int ErrorOfStartingNothing() {
  return ErrorOf(execl("/tmp/inside/none", "none", nullptr));
}

TEST_F(Confinement, AppliesToExistingThreadsInTheLastStage) {
  EXPECT_EQ(Confined([] {
              std::promise<void> confined;
              int error = 0;
              std::thread thread([&confined, &error] {
                confined.get_future().wait();
                error = ErrorOfStartingNothing();
              });
              ConfineToThisProgram();
              confined.set_value();
              thread.join();
              return error;
            }),
            EPERM);
}

TEST_F(Confinement, AppliesInTheLastStageWhenOtherThreadsCannotBeReached) {
  EXPECT_EQ(Confined([] {
              std::promise<void> done;
              std::promise<void> filtered;
              // A thread with its own filter cannot be synchronized with the others.
              std::thread thread([&done, &filtered] {
                SeccompFail({SYS_kcmp}, ENOSYS)();
                filtered.set_value();
                done.get_future().wait();
              });
              filtered.get_future().wait();
              ConfineToThisProgram();
              const int error = ErrorOfStartingNothing();
              done.set_value();
              thread.join();
              return error;
            }),
            EPERM);
}

TEST_F(Confinement, WorksInsideAnother) {
  EXPECT_EQ(Confined([] {
              Confine(FilesInside());
              return ErrorOfOpening("/tmp/inside/new", O_WRONLY | O_CREAT);
            }),
            0);
}

TEST_F(Confinement, IsSkippedWithoutKernelSupport) {
  const std::string photo = MakePhoto("a.jpg", 300, 200);
  ProgramOptions options;
  options.beforeExec = {SeccompFail({SYS_landlock_create_ruleset, SYS_seccomp, SYS_prctl}, ENOSYS)};
  const ProgramResult result = Convert(photo, UsualOutputs(), options);
  EXPECT_EQ(result.exitCode, 0) << result.err;
  EXPECT_EQ(result.err, "");
}

TEST_F(Confinement, LetsOutputsHaveRelativeNames) {
  const std::string photo = MakePhoto("a.jpg", 300, 200);
  MakeDirectories(directory_ + "/below");
  ProgramOptions options;
  options.workingDirectory = directory_;
  for (const char* name : {"bare.jpg", "./dot.jpg", "below/o.jpg", "../converter/up.jpg"}) {
    const CommandLine line{photo, "", {{{}, name}}};
    EXPECT_EQ(RunConverter(line.Arguments(), options).exitCode, 0) << name;
    EXPECT_TRUE(Exists(directory_ + "/" + name)) << name;
  }
}

TEST_F(Confinement, KeepsTheErrorForMissingDirectories) {
  const std::string photo = MakePhoto("a.jpg", 300, 200);
  const CommandLine line{photo, directory_ + "/gone", {{{}, directory_ + "/missing/o.jpg"}}};
  const ProgramResult result = RunConverter(line.Arguments());
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.err, "convert-thumb: cannot write " + directory_ + "/missing/o.jpg\n");
}

TEST_F(Confinement, AppliesToImageMagick) {
  const std::string source = MakeImage(directory_ + "/a.bmp", 300, 200);
  ProgramOptions options;
  options.workingDirectory = directory_;
  const ProgramResult result = RunConverter(
      {"-define", "registry:temporary-path=" + directory_, source, "-write", directory_ + "/o.png",
       "-set", "filename:a", "/tmp/outside/new", "%[filename:a].png"},
      options);
  if (ErrorOutside() != 0) {
    EXPECT_EQ(result.exitCode, 1);
    // Version 7 has another quotation mark.
    EXPECT_THAT(result.err,
                testing::ContainsRegex("unable to open image [`']/tmp/outside/new\\.png'"));
    EXPECT_FALSE(Exists(directory_ + "/o.png"));
    EXPECT_FALSE(Exists("/tmp/outside/new.png"));
  } else {
    EXPECT_TRUE(Exists(directory_ + "/o.png")) << result.err;
    EXPECT_TRUE(Exists("/tmp/outside/new.png"));
  }
}

}  // namespace
}  // namespace vela_test
