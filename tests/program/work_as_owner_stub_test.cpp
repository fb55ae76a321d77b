// Work in a directory with the identity of its owner.
#include <fcntl.h>
#include <grp.h>
#include <sys/ptrace.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <map>
#include <sstream>

#include "program/stub_program_test.h"
#include "support/build_paths.h"
#include "support/users.h"

namespace vela_test {
namespace {

using ::testing::AllOf;
using ::testing::Contains;
using ::testing::Each;
using ::testing::Field;
using ::testing::Not;
using ::testing::Pair;
using ::testing::StartsWith;

constexpr uid_t kAlice = 1000;
constexpr uid_t kBob = 2000;
constexpr uid_t kNobody = 3000;  ///< has no account

/// Replaces a file of the machine in the sandbox.
void ReplaceFile(const std::string& path, const std::string& content) {
  unlink(path.c_str());
  WriteFile(path, content);
}

void InstallForAllUsers(const std::string& program, const std::string& path) {
  unlink(path.c_str());
  CopyFile(program, path);
  ASSERT_EQ(chmod(path.c_str(), 0755), 0);
}

/// Gives a directory with everything in it to a user.
void Give(const std::string& directory, uid_t user, mode_t mode = 0755) {
  ASSERT_EQ(lchown(directory.c_str(), user, user), 0);
  ASSERT_EQ(chmod(directory.c_str(), mode), 0);
  for (const auto& entry : std::filesystem::recursive_directory_iterator(directory)) {
    ASSERT_EQ(lchown(entry.path().c_str(), user, user), 0);
  }
}

void MakeDirectoryOf(uid_t user, const std::string& directory) {
  MakePhotosIn({directory});
  Give(directory, user);
}

std::string OwnersOf(const std::string& path) {
  struct stat status = {};
  EXPECT_EQ(lstat(path.c_str(), &status), 0) << path;
  return std::to_string(status.st_uid) + ":" + std::to_string(status.st_gid);
}

/// The owners of a directory's metadata directory and of everything in it.
std::map<std::string, std::string> MetadataOwners(const std::string& directory) {
  const std::string root = directory + "/@eaDir";
  std::map<std::string, std::string> owners = {{"", OwnersOf(root)}};
  for (const std::string& name : ListTree(root)) {
    owners[name] = OwnersOf(root + "/" + name);
  }
  return owners;
}

/// The value of a line of /proc/<pid>/status, words separated by single blanks.
std::string StatusOf(pid_t pid, const std::string& key) {
  for (const std::string& line : ReadLines("/proc/" + std::to_string(pid) + "/status")) {
    if (line.compare(0, key.size() + 1, key + ":") == 0) {
      std::istringstream words(line.substr(key.size() + 1));
      std::string text;
      for (std::string word; words >> word;) {
        text += (text.empty() ? "" : " ") + word;
      }
      return text;
    }
  }
  return "no " + key;
}

/// Runs `action` as another user. Returns its errno, 0 when it succeeded.
int ErrorAs(uid_t user, const std::function<bool()>& action) {
  const pid_t child = fork();
  if (child == 0) {
    const bool isUser = setgroups(0, nullptr) == 0 && setgid(user) == 0 && setuid(user) == 0;
    _exit(!isUser ? 255 : action() ? 0 : errno);
  }
  int status = 0;
  EXPECT_EQ(waitpid(child, &status, 0), child);
  return WEXITSTATUS(status);
}

/// Every test needs more users than one. A sandbox that an ordinary user made has only one, to whom
/// every directory belongs: NothingChangesForOneUser is the test there.
class WorkAsOwner : public StubProgramTest {
 protected:
  void SetUp() override {
    StubProgramTest::SetUp();
    if (!HasOtherUsers()) {
      GTEST_SKIP() << "the sandbox has one user";
    }
    if (ErrorAs(kAlice, [] { return access(VelathumbPath().c_str(), X_OK) == 0; }) != 0) {
      GTEST_SKIP() << "other users cannot run the programs in the build directory";
    }
    InstallForAllUsers(StubToolPath(), kConverterPath);
    ReplaceFile(
        "/etc/passwd",
        "root:x:0:0::/:/bin/sh\nalice:x:1000:1000::/:/bin/sh\nbob:x:2000:2000::/:/bin/sh\n");
    ReplaceFile(
        "/etc/group",
        "root:x:0:\nalice:x:1000:\nbob:x:2000:\nfamily:x:5000:bob,alice\nclub:x:5001:alice\n");
    WriteFile(kSettings, "work_as_owner=\"yes\"\n");
  }

  std::vector<uid_t> ToolUsers() const {
    std::vector<uid_t> users;
    for (const StubCall& call : Converter().Calls()) {
      users.push_back(call.user);
    }
    return users;
  }
};

TEST_F(WorkAsOwner, OutputsBelongToTheOwner) {
  MakeDirectoryOf(kAlice, kPhotos);
  EXPECT_SUCCESS(Run());
  EXPECT_EQ(MetadataOf(kPhoto), kThumbsOfFirstRun);
  EXPECT_THAT(MetadataOwners(kPhotos), Each(Pair(::testing::_, "1000:1000")));
  EXPECT_THAT(ToolUsers(), Each(kAlice));
  EXPECT_EQ(ModeOf(Thumb(kPhoto, "XL")), 0777);
  EXPECT_EQ(ModeOf("/tmp/photos/@eaDir"), 0777);
}

TEST_F(WorkAsOwner, OnlyWhenItIsSwitchedOn) {
  for (const char* settings : {"", "work_as_owner=\"no\"\n", "work_as_owner=\"1\"\n"}) {
    WriteFile(kSettings, settings);
    MakeDirectoryOf(kAlice, "/tmp/other");
    EXPECT_SUCCESS(Run({"/tmp/other"}));
    EXPECT_THAT(MetadataOwners("/tmp/other"), Each(Pair(::testing::_, "0:0")));
    RemoveTree("/tmp/other");
  }
  EXPECT_THAT(ToolUsers(), Each(0U));
}

TEST_F(WorkAsOwner, ADirectoryOfRootIsNoDifferent) {
  MakePhotosIn({kPhotos});
  EXPECT_SUCCESS(Run());
  EXPECT_THAT(MetadataOwners(kPhotos), Each(Pair(::testing::_, "0:0")));
  EXPECT_THAT(ToolUsers(), Each(0U));
}

TEST_F(WorkAsOwner, AToolHasTheAccountsRightsAndNoOthers) {
  MakeDirectoryOf(kAlice, kPhotos);
  Program program = StartAndPause();
  const pid_t tool = Converter().Calls()[0].pid;
  EXPECT_EQ(StatusOf(tool, "Uid"), "1000 1000 1000 1000");
  EXPECT_EQ(StatusOf(tool, "Gid"), "1000 1000 1000 1000");
  EXPECT_EQ(StatusOf(tool, "Groups"), "1000 5000 5001");
  EXPECT_EQ(StatusOf(tool, "CapPrm"), "0000000000000000");
  EXPECT_EQ(StatusOf(tool, "CapEff"), "0000000000000000");
  GoAndFinish(program);
}

TEST_F(WorkAsOwner, AnOwnerWithoutAnAccountHasTheGroupOfTheDirectoryOnly) {
  MakeDirectoryOf(kNobody, kPhotos);
  ASSERT_EQ(chown(kPhotos, kNobody, 4000), 0);
  Program program = StartAndPause();
  const pid_t tool = Converter().Calls()[0].pid;
  EXPECT_EQ(StatusOf(tool, "Uid"), "3000 3000 3000 3000");
  EXPECT_EQ(StatusOf(tool, "Gid"), "4000 4000 4000 4000");
  EXPECT_EQ(StatusOf(tool, "Groups"), "");
  GoAndFinish(program);
  EXPECT_THAT(MetadataOwners(kPhotos), Each(Pair(::testing::_, "3000:4000")));
}

TEST_F(WorkAsOwner, TheOwnerCannotInfluenceTheProgramItself) {
  MakeDirectoryOf(kAlice, kPhotos);
  Program program = StartAndPause();
  const pid_t pid = program.Pid();
  EXPECT_EQ(StatusOf(pid, "Uid"), "0 0 0 1000");
  EXPECT_EQ(StatusOf(pid, "Gid"), "0 0 0 1000");
  EXPECT_EQ(StatusOf(pid, "CapEff"), "00000000000000e0") << "KILL, SETGID, SETUID";
  const rlimit small = {1, 1};
  EXPECT_EQ(ErrorAs(kAlice, [&] { return kill(pid, SIGKILL) == 0; }), EPERM);
  EXPECT_EQ(ErrorAs(kAlice, [&] { return ptrace(PTRACE_SEIZE, pid, 0, 0) == 0; }), EPERM);
  EXPECT_EQ(ErrorAs(kAlice, [&] { return setpriority(PRIO_PROCESS, pid, 19) == 0; }), EPERM);
  EXPECT_EQ(ErrorAs(kAlice, [&] { return prlimit(pid, RLIMIT_CPU, &small, nullptr) == 0; }), EPERM);
  const std::string memory = "/proc/" + std::to_string(pid) + "/mem";
  EXPECT_EQ(ErrorAs(kAlice, [&] { return open(memory.c_str(), O_RDWR) >= 0; }), EACCES);
  GoAndFinish(program);
}

TEST_F(WorkAsOwner, TheFilesOfTheSystemAreStillThoseOfRoot) {
  MakeDirectoryOf(kAlice, kPhotos);
  WriteFile(kPhotoProgress, "completed=\"4\"\n");
  WriteFile(kQueue, "/other\n");
  ASSERT_EQ(chmod(kPhotoProgress, 0600), 0);
  ASSERT_EQ(chmod(kQueue, 0600), 0);
  ASSERT_EQ(chmod(kSettings, 0600), 0);
  ASSERT_EQ(chmod(kProfiles, 0600), 0);
  EXPECT_THAT(RunWithDaemon(), ElementsAre(kVersionRequest, kReport));
  EXPECT_THAT(ErrorLines(), IsEmpty());
  ExpectProgress(4, 3);
  EXPECT_THAT(ReadLines(kQueue), ElementsAre("/other", "/tmp/photos"));
  for (const char* file : {kPhotoProgress, kQueue, "/var/lib/velaindex/index.db"}) {
    EXPECT_EQ(OwnersOf(file), "0:0") << file;
  }
  EXPECT_THAT(ListDirectory("/var/run"), Not(Contains(StartsWith("velathumb"))));
}

TEST_F(WorkAsOwner, EachDirectoryHasItsOwner) {
  MakeDirectoryOf(kAlice, "/tmp/a");
  MakeDirectoryOf(kBob, "/tmp/b");
  MakeDirectoryOf(0, "/tmp/c");
  MakeDirectoryOf(kNobody, "/tmp/d");
  EXPECT_SUCCESS(Run({"/tmp/a", "/tmp/b", "/tmp/c", "/tmp/d", "/tmp/a"}));
  EXPECT_THAT(MetadataOwners("/tmp/a"), Each(Pair(::testing::_, "1000:1000")));
  EXPECT_THAT(MetadataOwners("/tmp/b"), Each(Pair(::testing::_, "2000:2000")));
  EXPECT_THAT(MetadataOwners("/tmp/c"), Each(Pair(::testing::_, "0:0")));
  EXPECT_THAT(MetadataOwners("/tmp/d"), Each(Pair(::testing::_, "3000:3000")));
  EXPECT_EQ(MetadataOf("/tmp/a/a.jpg"), kAllThumbs);
}

TEST_F(WorkAsOwner, ATreeHasManyOwners) {
  // Closed to everybody else: only root can walk it.
  MakePhotosIn({kPhotos, "/tmp/photos/alice", "/tmp/photos/alice/below", "/tmp/photos/bob"});
  Give("/tmp/photos/alice", kAlice, 0700);
  Give("/tmp/photos/alice/below", kAlice, 0700);
  Give("/tmp/photos/bob", kBob, 0700);
  EXPECT_SUCCESS(Run({"R:/tmp/photos"}));
  EXPECT_THAT(MetadataOwners("/tmp/photos"), Each(Pair(::testing::_, "0:0")));
  EXPECT_THAT(MetadataOwners("/tmp/photos/alice"), Each(Pair(::testing::_, "1000:1000")));
  EXPECT_THAT(MetadataOwners("/tmp/photos/alice/below"), Each(Pair(::testing::_, "1000:1000")));
  EXPECT_THAT(MetadataOwners("/tmp/photos/bob"), Each(Pair(::testing::_, "2000:2000")));
}

TEST_F(WorkAsOwner, ThumbnailsOfRootAreReplaced) {
  MakePhotosIn({kPhotos});
  PutThumbs(kPhoto, {"XL", "M"});
  for (const char* path : {"/tmp/photos/@eaDir", "/tmp/photos/@eaDir/a.jpg"}) {
    ASSERT_EQ(chmod(path, 0777), 0);
  }
  SetFileTimeFromNow(Thumb(kPhoto, "XL"), -3600);
  ASSERT_EQ(chown(kPhotos, kAlice, kAlice), 0);
  EXPECT_SUCCESS(Run());
  EXPECT_EQ(OwnersOf("/tmp/photos/@eaDir"), "0:0");
  EXPECT_EQ(OwnersOf(Thumb(kPhoto, "XL")), "1000:1000");
  EXPECT_THAT(ErrorLines(), Not(Contains(::testing::HasSubstr("chmod"))));
}

TEST_F(WorkAsOwner, ADirectoryThatItsOwnerCannotChangeIsSkipped) {
  MakeDirectoryOf(kAlice, kPhotos);
  ASSERT_EQ(chmod(kPhotos, 0555), 0);
  EXPECT_SUCCESS(Run());
  EXPECT_FALSE(Exists("/tmp/photos/@eaDir"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(WorkAsOwner, APhotoThatTheOwnerCannotReadFails) {
  InstallForAllUsers(OwnConverterPath(), kConverterPath);
  RemoveTree("/usr/vela/etc");  // the list of tools that run unconfined
  MakePhotosIn({kPhotos});
  MakePhoto(InPhotos("b.jpg"));
  Give(kPhotos, kAlice);
  ASSERT_EQ(chown(kPhoto, kBob, kBob), 0);
  ASSERT_EQ(chmod(kPhoto, 0600), 0);
  EXPECT_SUCCESS(Run());
  EXPECT_EQ(MetadataOf(kPhoto), kAllMarkers);
  EXPECT_EQ(MetadataOf(InPhotos("b.jpg")), kThumbsOfFirstRun);
}

TEST_F(WorkAsOwner, ALinkReachesOnlyWhatTheOwnerMayChange) {
  MakeDirectoryOf(kAlice, kPhotos);
  MakeDirectories("/tmp/root/a.jpg");
  ASSERT_EQ(chmod("/tmp/root", 0755), 0);
  ASSERT_EQ(chmod("/tmp/root/a.jpg", 0755), 0);
  WriteFile("/tmp/root/a.jpg/x.fail", "");
  // A link that root would follow.
  ASSERT_EQ(symlink("/tmp/root", "/tmp/photos/@eaDir"), 0);
  EXPECT_SUCCESS(Run());
  EXPECT_THAT(ListTree("/tmp/root"), ElementsAre("a.jpg/", "a.jpg/x.fail"));
}

TEST_F(WorkAsOwner, TerminationRemovesThePidFileAndEndsTheTool) {
  MakeDirectoryOf(kAlice, kPhotos);
  Program program = StartAndPause();
  const pid_t tool = Converter().Calls()[0].pid;
  EXPECT_THAT(ListDirectory("/var/run"), Contains(StartsWith("velathumb")));
  program.Kill(SIGTERM);
  EXPECT_EQ(program.Wait()->exitCode, 1);
  EXPECT_THAT(ListDirectory("/var/run"), Not(Contains(StartsWith("velathumb"))));
  EXPECT_TRUE(WaitUntilGone("/proc/" + std::to_string(tool)));
}

TEST_F(WorkAsOwner, AnOverdueToolIsKilled) {
  MakeDirectoryOf(kAlice, kPhotos);
  WriteFile(kSettings, "work_as_owner=\"yes\"\ntool_timeout=\"1\"\n");
  Converter().PlanCall(1, StubPlan().WaitForFile("/tmp/never"));
  EXPECT_SUCCESS(Run());
  EXPECT_THAT(ErrorLines(), Contains("/usr/vela/bin/convert-thumb has not ended within 1 seconds "
                                     "(tool_timeout) and was killed"));
  EXPECT_EQ(MetadataOf(kPhoto), kAllMarkers);
}

TEST_F(WorkAsOwner, WithoutThePrivilegeItIsOffAndLoggedOnce) {
  MakePhotosIn({"/tmp/a", "/tmp/b"});
  Give("/tmp/a", kAlice, 0777);
  Give("/tmp/b", kBob, 0777);
  EXPECT_SUCCESS(Run({"/tmp/a", "/tmp/b"}, WithSteps({DropCapabilities()})));
  EXPECT_THAT(MetadataOwners("/tmp/a"), Each(Pair(::testing::_, "0:0")));
  EXPECT_THAT(MetadataOwners("/tmp/b"), Each(Pair(::testing::_, "0:0")));
  EXPECT_THAT(ErrorLines(),
              Contains("work_as_owner has no effect: cannot take the identity of user 1000: "
                       "Operation not permitted")
                  .Times(1));
}

using OneUser = StubProgramTest;

TEST_F(OneUser, NothingChangesWithWorkAsOwner) {
  WriteFile(kSettings, "work_as_owner=\"yes\"\n");
  MakePhotosIn({kPhotos});
  EXPECT_SUCCESS(Run());
  EXPECT_EQ(MetadataOf(kPhoto), kThumbsOfFirstRun);
  EXPECT_THAT(MetadataOwners(kPhotos), Each(Pair(::testing::_, "0:0")));
  EXPECT_EQ(Converter().Calls()[0].user, 0U);
}

}  // namespace
}  // namespace vela_test
