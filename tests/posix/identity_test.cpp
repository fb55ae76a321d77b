// The exchange of rights to files.
#include "posix/identity.h"

#include <fcntl.h>
#include <grp.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>

#include "posix/child_process.h"
#include "support/capabilities.h"
#include "support/files.h"
#include "support/privileges.h"
#include "support/quiet_test.h"
#include "support/users.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr uid_t kAlice = 1000;
constexpr gid_t kGroup = 1001;
const Identity kIdentity = {kAlice, kGroup, {5000, 5001}};

/// What this thread's rights are, by their effects and by the kernel's account.
struct Rights {
  uid_t fileUser;
  gid_t fileGroup;
  std::vector<gid_t> groups;
  uint64_t capabilities;
  int deathSignal;
};
bool operator==(const Rights& a, const Rights& b) {
  return a.fileUser == b.fileUser && a.fileGroup == b.fileGroup && a.groups == b.groups &&
         a.capabilities == b.capabilities && a.deathSignal == b.deathSignal;
}
void PrintTo(const Rights& rights, std::ostream* out) {
  *out << rights.fileUser << ":" << rights.fileGroup << " " << rights.groups.size() << " groups, "
       << rights.capabilities << ", signal " << rights.deathSignal;
}

Rights CurrentRights() {
  static int number = 0;
  const std::string file = "/tmp/file." + std::to_string(++number);
  close(open(file.c_str(), O_CREAT | O_EXCL | O_WRONLY | O_CLOEXEC, 0600));
  struct stat status = {};
  EXPECT_EQ(stat(file.c_str(), &status), 0);
  Rights rights = {status.st_uid, status.st_gid, std::vector<gid_t>(100), 0, 0};
  rights.groups.resize(static_cast<size_t>(getgroups(100, rights.groups.data())));
  bool isRead = false;
  rights.capabilities = EffectiveCapabilities(&isRead);
  EXPECT_TRUE(isRead);
  prctl(PR_GET_PDEATHSIG, &rights.deathSignal);
  return rights;
}

class IdentityTest : public QuietTest {
 protected:
  void SetUp() override {
    QuietTest::SetUp();
    own_ = CurrentRights();
  }
  void TearDown() override {
    EXPECT_EQ(CurrentRights(), own_);
    QuietTest::TearDown();
  }

  Rights own_;
};

TEST_F(IdentityTest, IsThatOfTheUserWithoutCapabilities) {
  const AssumedIdentity identity(kIdentity);
  if (!HasOtherUsers()) {
    EXPECT_NE(identity.Error(), 0);
    EXPECT_EQ(FileUser(), 0U);
    return;
  }
  EXPECT_EQ(identity.Error(), 0);
  EXPECT_EQ(CurrentRights(), (Rights{kAlice, kGroup, {5000, 5001}, 0xe0, own_.deathSignal}));
  EXPECT_EQ(FileUser(), kAlice);
  WriteFile("/tmp/own", "");
  EXPECT_EQ(open("/etc/shadow", O_RDONLY | O_CLOEXEC), -1);
  EXPECT_EQ(errno, EACCES);
  EXPECT_EQ(getuid(), 0U);
  EXPECT_EQ(geteuid(), 0U);
}

TEST_F(IdentityTest, IsInterruptedByTheOwnOne) {
  const AssumedIdentity identity(kIdentity);
  const Rights assumed = CurrentRights();
  for (int i = 0; i < 2; ++i) {
    const OwnIdentity own;
    const OwnIdentity again;
    Rights rights = CurrentRights();
    EXPECT_EQ(FileUser(), 0U);
    // Root needs no group.
    rights.groups = own_.groups;
    EXPECT_EQ(rights, own_);
  }
  EXPECT_EQ(CurrentRights(), assumed);
}

TEST_F(IdentityTest, TheOwnOneAloneChangesNothing) {
  const OwnIdentity own;
  EXPECT_EQ(CurrentRights(), own_);
  EXPECT_EQ(FileUser(), 0U);
}

TEST_F(IdentityTest, TheSignalAtTheEndOfTheParentIsKept) {
  ASSERT_EQ(prctl(PR_SET_PDEATHSIG, SIGUSR1), 0);
  {
    const AssumedIdentity identity(kIdentity);
    EXPECT_EQ(CurrentRights().deathSignal, SIGUSR1);
    {
      const OwnIdentity own;
      EXPECT_EQ(CurrentRights().deathSignal, SIGUSR1);
    }
    EXPECT_EQ(CurrentRights().deathSignal, SIGUSR1);
  }
  EXPECT_EQ(CurrentRights().deathSignal, SIGUSR1);
  ASSERT_EQ(prctl(PR_SET_PDEATHSIG, own_.deathSignal), 0);
}

TEST_F(IdentityTest, ASecondOneIsRefused) {
  const AssumedIdentity identity(kIdentity);
  const Rights assumed = CurrentRights();
  {
    const AssumedIdentity second({2000, 2000, {}});
    EXPECT_NE(second.Error(), 0);
    EXPECT_EQ(CurrentRights(), assumed);
  }
  EXPECT_EQ(CurrentRights(), assumed);
}

TEST_F(IdentityTest, IsRefusedWithoutCapabilities) {
  const WithoutCapabilities ordinary;
  const AssumedIdentity identity(kIdentity);
  EXPECT_EQ(identity.Error(), EPERM);
  EXPECT_EQ(FileUser(), 0U);
}

TEST_F(IdentityTest, ResumeEndsItForGood) {
  const AssumedIdentity identity(kIdentity);
  ResumeOwnIdentity();
  Rights rights = CurrentRights();
  rights.groups = own_.groups;
  EXPECT_EQ(rights, own_);
}

/// The real, effective, saved and file user of a child that is started now.
std::string UsersOfChild() {
  char shell[] = "/bin/sh";
  char option[] = "-c";
  char command[] = "grep '^Uid' /proc/self/status > /tmp/users";
  char* const arguments[] = {shell, option, command, nullptr};
  pid_t pid = 0;
  EXPECT_EQ(StartChild("/bin/sh", arguments, {}, {}, pid), 0);
  EXPECT_TRUE(HasSucceeded(ReapChild(pid)));
  const std::string text = ReadFile("/tmp/users");
  RemoveTree("/tmp/users");
  return text;
}

TEST_F(IdentityTest, AChildHasNoOther) {
  EXPECT_EQ(UsersOfChild(), "Uid:\t0\t0\t0\t0\n");
  const AssumedIdentity identity(kIdentity);
  EXPECT_EQ(UsersOfChild(),
            HasOtherUsers() ? "Uid:\t1000\t1000\t1000\t1000\n" : "Uid:\t0\t0\t0\t0\n");
  const OwnIdentity own;
  EXPECT_EQ(UsersOfChild(), "Uid:\t0\t0\t0\t0\n");
}

/// A process of another user that stops all others of the user, over and over.
class Stopper {
 public:
  explicit Stopper(uid_t user) : pid_(fork()) {
    if (pid_ == 0) {
      const bool isUser = setgroups(0, nullptr) == 0 && setgid(user) == 0 && setuid(user) == 0;
      while (isUser) {
        kill(-1, SIGSTOP);
      }
      _exit(1);
    }
  }
  ~Stopper() {
    kill(pid_, SIGKILL);
    waitpid(pid_, nullptr, 0);
  }
  Stopper(const Stopper&) = delete;
  Stopper& operator=(const Stopper&) = delete;

 private:
  pid_t pid_;
};

TEST_F(IdentityTest, AUserWhoStopsAChildAtItsStartDoesNotStopItsParent) {
  if (!HasOtherUsers()) {
    return;  // nobody else can stop the child
  }
  const Stopper stopper(kAlice);
  const AssumedIdentity identity(kIdentity);
  // A child that is stopped early enough to suspend its parent is given up; others have started.
  int result = 0;
  for (int i = 0; i < 200 && result == 0; ++i) {
    char program[] = "/bin/true";
    char* const arguments[] = {program, nullptr};
    pid_t pid = 0;
    result = StartChild(program, arguments, {}, {}, pid);
    if (result == 0) {
      kill(pid, SIGKILL);
      ReapChild(pid);
    }
  }
  EXPECT_TRUE(result == 0 || result == ETIMEDOUT) << result;
}

TEST_F(IdentityTest, TheOwnerOfADirectory) {
  MakeDirectories("/tmp/dir");
  WriteFile("/tmp/file", "");
  const bool isGiven = chown("/tmp/dir", kAlice, kGroup) == 0;
  ASSERT_EQ(symlink("dir", "/tmp/link"), 0);
  for (const char* path : {"/tmp/dir", "/tmp/link"}) {
    const auto owner = OwnerOf(path);
    ASSERT_TRUE(owner.has_value());
    EXPECT_EQ(owner->user, isGiven ? kAlice : 0);
    EXPECT_EQ(owner->group, isGiven ? kGroup : 0);
    EXPECT_THAT(owner->groups, IsEmpty());
  }
  EXPECT_FALSE(OwnerOf("/tmp/file").has_value());
  EXPECT_EQ(errno, ENOTDIR);
  EXPECT_FALSE(OwnerOf("/tmp/none").has_value());
  EXPECT_EQ(errno, ENOENT);
}

TEST_F(IdentityTest, AnAccountHasItsGroups) {
  unlink("/etc/passwd");
  unlink("/etc/group");
  WriteFile("/etc/passwd", "alice:x:1000:77::/:/bin/sh\n");
  std::string groups = "first:x:77:\nother:x:78:bob\n";
  for (int i = 0; i < 100; ++i) {
    groups += "g" + std::to_string(i) + ":x:" + std::to_string(100 + i) + ":bob,alice\n";
  }
  WriteFile("/etc/group", groups);
  const Identity alice = AccountIdentity({1000, 5, {}});
  EXPECT_EQ(alice.user, 1000U);
  EXPECT_EQ(alice.group, 77U);
  EXPECT_EQ(alice.groups.size(), 101U);
  const Identity unknown = AccountIdentity({3000, 5, {}});
  EXPECT_EQ(unknown.user, 3000U);
  EXPECT_EQ(unknown.group, 5U);
  EXPECT_THAT(unknown.groups, IsEmpty());
}

}  // namespace
}  // namespace vela_test
