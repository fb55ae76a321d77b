// Adding entries: who does the work, and the message to the user.
#include <fcntl.h>
#include <grp.h>
#include <poll.h>
#include <sched.h>
#include <signal.h>
#include <sys/inotify.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "fake_systemd.h"
#include "posix/file_lock.h"
#include "queue_fixture.h"
#include "service_state.h"
#include "support/named_case.h"
#include "support/other_user.h"
#include "support/users.h"

using namespace vela;

namespace vela_test {
namespace {

using namespace ::testing;
using std::chrono::seconds;

constexpr char kService[] = "velathumb-queue.service";
constexpr char kPath[] = "velathumb-queue.path";
constexpr char kTimer[] = "velathumb-queue.timer";
constexpr char kRunnerLock[] = "/var/run/velathumb-queue.lock";

int BecomeOtherUser() {
  return setgroups(0, nullptr) == 0 && setgid(kOwner) == 0 && setuid(kOwner) == 0 ? 0 : errno;
}

bool WriteText(const char* file, const std::string& text) {
  const Descriptor out(open(file, O_WRONLY | O_CLOEXEC));
  return write(out.Get(), text.data(), text.size()) == static_cast<ssize_t>(text.size());
}

/// For a sandbox with one user: gives that one, who has no privileges then, another number.
int TakeOtherName() {
  const std::string map = std::to_string(kOwner) + " 0 1\n";
  return unshare(CLONE_NEWUSER) == 0 && WriteText("/proc/self/setgroups", "deny") &&
                 WriteText("/proc/self/gid_map", map) && WriteText("/proc/self/uid_map", map)
             ? 0
             : errno;
}

/// In a sandbox with one user, keeps the owner of a file from changing it as if it were that of
/// another one, as long as the object exists.
class ClosedToOwner {
 public:
  explicit ClosedToOwner(const char* path) : path_(path) {
    struct stat status = {};
    EXPECT_EQ(stat(path, &status), 0) << path;
    mode_ = status.st_mode & 07777;
    Set(HasOtherUsers() ? mode_ : S_ISDIR(status.st_mode) ? 0555 : 0);
  }
  ~ClosedToOwner() { Set(mode_); }
  ClosedToOwner(const ClosedToOwner&) = delete;
  ClosedToOwner& operator=(const ClosedToOwner&) = delete;

 private:
  void Set(mode_t mode) const { EXPECT_EQ(chmod(path_, mode), 0) << path_; }

  const char* path_;
  mode_t mode_ = 0;
};

/// Notices how often a file is opened.
class OpenWatch {
 public:
  explicit OpenWatch(const char* path) : events_(inotify_init1(IN_CLOEXEC)) {
    EXPECT_GE(inotify_add_watch(events_.Get(), path, IN_OPEN), 0) << path;
  }

  /// Waits until this has happened `count` times, at most 20 s each; returns whether it has.
  bool WaitFor(int count) const {
    for (int i = 0; i < count; ++i) {
      pollfd event = {events_.Get(), POLLIN, 0};
      inotify_event one = {};
      if (poll(&event, 1, 20000) != 1 || read(events_.Get(), &one, sizeof one) != sizeof one) {
        return false;
      }
    }
    return true;
  }

 private:
  Descriptor events_;
};

class AddTest : public QueueTest {
 protected:
  AddTest() { MakeEntryDirectories({"/tmp/a", "/tmp/b"}); }

  /// Starts a runner that adds /tmp/a, and returns it when it has asked for the lock, which another
  /// one must hold, more than once.
  Program AddAndWaitForTheLock() const {
    const OpenWatch lock(kRunnerLock);
    Program runner = velathumb_.Start({"--add", "/tmp/a"});
    EXPECT_TRUE(lock.WaitFor(2));
    EXPECT_EQ(ReadFile(kQueueFile), "/tmp/a\n");
    return runner;
  }

  /// The same with a runner that ends without taking the entry.
  Program AddBeforeTheEndOfAnotherRunner() const {
    const FileDescriptor lock = TakeProcessLock(kRunnerLock, false);
    EXPECT_TRUE(lock.IsOpen());
    return AddAndWaitForTheLock();
  }

  /// Fails the test unless adding the entry succeeds and leaves it to others. Returns the messages.
  std::string LeftToOthers(const std::vector<std::string>& arguments) const {
    const ProgramResult result = velathumb_.Run(arguments);
    EXPECT_EQ(result.exitCode, 0) << result.err;
    EXPECT_EQ(result.out, "");
    EXPECT_EQ(ReadFile(kQueueFile), "/tmp/a\n");
    EXPECT_THAT(velathumb_.Entries(), IsEmpty());
    return result.err;
  }

  /// Runs the runner as an ordinary user.
  ProgramResult RunAsOtherUser(const std::vector<std::string>& arguments) const {
    // Where others can reach it.
    constexpr char kCopy[] = "/tmp/velathumb-queue";
    CopyFile(QueueProgramPath(), kCopy);
    EXPECT_EQ(chmod(kCopy, 0755), 0);
    ProgramOptions options;
    options.beforeExec = {HasOtherUsers() ? BecomeOtherUser : TakeOtherName};
    return RunProgram(kCopy, velathumb_.Arguments(arguments), options);
  }
};

TEST_F(AddTest, WithoutAServiceTheWorkIsDoneHere) {
  const ProgramResult result = velathumb_.Run({"--add", "/tmp/a"});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_THAT(result.err, StartsWith("velathumb-queue: queued /tmp/a\n"
                                     "velathumb-queue: took 1 entry\n"));
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a"));
  ExpectQueueDone();
}

TEST_F(AddTest, QueueOnlyNeverWorks) {
  EXPECT_EQ(LeftToOthers({"--add", "/tmp/a", "--queue-only"}), "velathumb-queue: queued /tmp/a\n");
  EXPECT_EQ(velathumb_.Run({"-a", "/tmp/a", "-a", "R:/tmp/b", "--queue-only"}).err,
            "velathumb-queue: queued 2 entries\n");
  EXPECT_EQ(ReadFile(kQueueFile), "/tmp/a\n/tmp/a\nR:/tmp/b\n");
}

TEST_F(AddTest, QueueOnlyNeedsNoProfile) {
  RemoveTree(kProfiles);
  LeftToOthers({"--add", "/tmp/a", "--queue-only"});
}

TEST_F(AddTest, AnotherRunnerThatIsRunningDoesTheWork) {
  Program runner = StartAndHold({"/tmp/a"});
  const ProgramResult result = velathumb_.Run({"--add", "/tmp/b"});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(
      result.err,
      "velathumb-queue: queued /tmp/b\n"
      "velathumb-queue: the running velathumb-queue does the work unless it is being stopped; "
      "then they stay queued\n");
  Release();
  EXPECT_TRUE(runner.Wait());
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a", "/tmp/b"));
}

TEST_F(AddTest, ARunnerThatHasTakenTheEntriesDoesTheWork) {
  FileDescriptor lock = TakeProcessLock(kRunnerLock, false);
  ASSERT_TRUE(lock.IsOpen());
  Program runner = velathumb_.Start({"--add", "/tmp/a"});
  ASSERT_TRUE(WaitUntilExists(kQueueFile));
  ASSERT_EQ(rename(kQueueFile, kTakenFile), 0);
  const auto result = runner.Wait();
  ASSERT_TRUE(result);
  EXPECT_EQ(result->exitCode, 0);
  EXPECT_EQ(result->err,
            "velathumb-queue: queued /tmp/a\n"
            "velathumb-queue: the running velathumb-queue does the work\n");
}

TEST_F(AddTest, TheWorkOfARunnerThatEndsWithoutTakingItIsDoneHere) {
  Program runner = AddBeforeTheEndOfAnotherRunner();
  ExpectEnd(runner, 0);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a"));
  ExpectQueueDone();
}

TEST_F(AddTest, TheWorkOfARunnerThatIsBeingStoppedIsDoneHere) {
  // A velathumb that converts may also take a moment to end.
  velathumb_.Stub().PlanCall(
      1, StubPlan().IgnoreSignal(SIGTERM).CreateFile("/tmp/here").WaitForFile("/tmp/go"));
  Enqueue({"/tmp/b"});
  Program stopped = velathumb_.Start();
  ASSERT_TRUE(WaitUntilExists("/tmp/here"));
  stopped.Kill(SIGTERM);
  Program runner = AddAndWaitForTheLock();
  Release();
  ExpectEnd(stopped, 1);
  ExpectEnd(runner, 0);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/b", "/tmp/a"));
  ExpectQueueDone();
}

TEST_F(AddTest, NowTellsByItsStatusThatAnotherRunnerHasTheWork) {
  Program runner = StartAndHold({"/tmp/a"});
  EXPECT_EQ(velathumb_.Run({"--add", "/tmp/b", "--now"}).exitCode, 1);
  Release();
  EXPECT_TRUE(runner.Wait());
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a", "/tmp/b"));
}

TEST_F(AddTest, NowKeepsAFasterServiceFromTakingTheWork) {
  // The service starts when the queue exists: here it does while the entry is being appended.
  constexpr char kGuard[] = "/run/velathumb-lock.thumb_create.queue";
  WriteFile(kGuard, "");
  ASSERT_EQ(chmod(kGuard, 0600), 0);
  Descriptor guard = HoldLock(kGuard, O_RDWR);
  Program runner = velathumb_.Start({"--add", "/tmp/a", "--now"});
  ASSERT_TRUE(WaitUntilExists("/run/velathumb-queue.lock"));
  const ProgramResult service = velathumb_.Run();
  EXPECT_EQ(service.exitCode, 1);
  EXPECT_EQ(service.err, "velathumb-queue: another velathumb-queue is already running\n");
  guard.Close();
  ExpectEnd(runner, 0);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a"));
}

TEST_F(AddTest, AUserWithoutPermissionIsToldWhoMayAddToTheQueue) {
  const ClosedToOwner spool("/var/spool");
  const ProgramResult result = RunAsOtherUser({"--add", "/tmp/a"});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.err,
            "velathumb-queue: cannot add to the queue /var/spool/thumb_create.queue: only root may "
            "do that; use sudo, or run velathumb for directories of your own\n");
  EXPECT_FALSE(Exists(kQueueFile));
}

TEST_F(AddTest, AUserWithoutPermissionIsToldWhoMayProcessTheQueue) {
  // With and without the file of an earlier run.
  for (const bool hasFile : {false, true}) {
    if (hasFile) {
      EXPECT_EQ(velathumb_.Run().exitCode, 0);
    }
    const ClosedToOwner lock(hasFile ? kRunnerLock : "/run");
    const ProgramResult result = RunAsOtherUser({});
    EXPECT_EQ(result.exitCode, 2);
    EXPECT_EQ(result.err,
              "velathumb-queue: cannot lock /var/run/velathumb-queue.lock: only root may do that; "
              "use sudo, or run velathumb for directories of your own\n");
  }
}

struct ServiceCase : NamedCase {
  FakeUnits units;
  std::string worker;
};

class ServiceTest : public AddTest, public WithParamInterface<ServiceCase> {};

TEST_P(ServiceTest, DoesTheWork) {
  const FakeSystemd systemd(GetParam().units);
  // The own profile is not used.
  RemoveTree(kProfiles);
  EXPECT_EQ(LeftToOthers({"--add", "/tmp/a"}),
            "velathumb-queue: queued /tmp/a; " + GetParam().worker + "\n");
}

const ServiceCase kServices[] = {
    {{"Running"}, {{{kService, "active"}}, {}}, "the running velathumb-queue does the work"},
    {{"Starting"}, {{{kService, "activating"}}, {}}, "the running velathumb-queue does the work"},
    {{"Watching"},
     {{{kPath, "active"}, {kTimer, "active"}}, {kPath, kTimer}},
     "velathumb-queue.service does the work"},
    {{"WatchingNotEnabled"}, {{{kPath, "active"}}, {}}, "velathumb-queue.service does the work"},
    {{"Scheduled"},
     {{{kTimer, "active"}}, {kTimer}},
     "velathumb-queue.timer will start the service; to start it now: systemctl start "
     "velathumb-queue.service"},
    {{"EnabledOnly"},
     {{}, {kPath}},
     "the service is enabled, but has not been started: systemctl start velathumb-queue.path "
     "velathumb-queue.timer"},
    {{"WatchingAfterAFailure"},
     {{{kService, "failed"}, {kPath, "active"}}, {kPath}},
     "velathumb-queue.service does the work"},
    {{"Failed"},
     {{{kService, "failed"}}, {kPath}},
     "but velathumb-queue.service has failed: systemctl status velathumb-queue.service tells why, "
     "systemctl start velathumb-queue.service starts it again"},
    {{"PathFailed"},
     {{{kPath, "failed"}}, {kPath}},
     "but velathumb-queue.service has failed: systemctl status velathumb-queue.service tells why, "
     "systemctl start velathumb-queue.service starts it again"},
};
INSTANTIATE_TEST_SUITE_P(States, ServiceTest, ValuesIn(kServices), CaseName());

TEST_F(AddTest, AServiceThatNobodyWantsIsNoService) {
  const FakeSystemd systemd({{{kService, "failed"}, {kPath, "inactive"}}, {}});
  EXPECT_EQ(velathumb_.Run({"--add", "/tmp/a"}).exitCode, 0);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a"));
}

TEST_F(AddTest, NowAndFollowAndWaitWorkHereInSpiteOfAService) {
  const FakeSystemd systemd({{{kPath, "active"}}, {kPath}});
  EXPECT_EQ(velathumb_.Run({"--add", "/tmp/a", "--now"}).exitCode, 0);
  EXPECT_EQ(velathumb_.Run({"--add", "/tmp/b", "--wait"}).exitCode, 0);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a", "/tmp/b"));
  Program runner = velathumb_.Start({"--add", "/tmp/a", "--follow"});
  EXPECT_TRUE(velathumb_.WaitForStarts(3));
  Stop(runner);
}

TEST_F(AddTest, ARunnerThatHasTheLockDoesTheWorkOfAServiceThatHasNotBeenStarted) {
  const FakeSystemd systemd({{}, {kPath}});
  Program runner = StartAndHold({"/tmp/a"});
  EXPECT_EQ(velathumb_.Run({"--add", "/tmp/b"}).err,
            "velathumb-queue: queued /tmp/b; the running velathumb-queue does the work\n");
  Release();
  ExpectEnd(runner, 0);
}

TEST_F(AddTest, AServiceThatIsBeingStoppedDoesNotDoTheWork) {
  const FakeSystemd systemd({{{kService, "deactivating"}}, {kPath}});
  const FileDescriptor lock = TakeProcessLock(kRunnerLock, false);
  ASSERT_TRUE(lock.IsOpen());
  EXPECT_EQ(LeftToOthers({"--add", "/tmp/a"}),
            "velathumb-queue: queued /tmp/a; the service is enabled, but has not been started: "
            "systemctl start velathumb-queue.path velathumb-queue.timer\n");
}

TEST_F(AddTest, ARunnerThatIsAboutToEndDoesNotDoTheWorkOfAService) {
  const FakeSystemd systemd({{}, {kPath}});
  Program runner = AddBeforeTheEndOfAnotherRunner();
  ExpectEnd(runner, 0);
  EXPECT_EQ(runner.Error(),
            "velathumb-queue: queued /tmp/a; the service is enabled, but has not been started: "
            "systemctl start velathumb-queue.path velathumb-queue.timer\n");
}

TEST_F(AddTest, ASystemdThatDoesNotAnswerMayHaveAService) {
  const Descriptor silent = MakeSilentSystemd();
  EXPECT_EQ(LeftToOthers({"--add", "/tmp/a"}),
            "velathumb-queue: queued /tmp/a; but systemd does not answer: unless "
            "velathumb-queue.service does the work, start velathumb-queue\n");
}

TEST_F(AddTest, ASystemdThatDoesNotAnswerIsNotWaitedFor) {
  const Descriptor silent = MakeSilentSystemd();
  const auto start = std::chrono::steady_clock::now();
  EXPECT_FALSE(HasService(AskForService(seconds(1))));
  EXPECT_LT(std::chrono::steady_clock::now() - start, seconds(3));
}

TEST_F(AddTest, WithoutSystemdThereIsNoService) {
  // A leftover of a container image.
  const FakeSystemd systemd({{{kService, "active"}}, {}});
  RemoveTree("/run/systemd/system");
  EXPECT_FALSE(HasService(AskForService(seconds(1))));
}

}  // namespace
}  // namespace vela_test
