// Several instances of velathumb at the same time.
#include <fcntl.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <map>
#include <thread>

#include "queue_fixture.h"

namespace vela_test {
namespace {

using namespace ::testing;
using std::chrono::milliseconds;
using std::chrono::seconds;

/// The largest number of calls at the same time; 0 when one did not end.
int MostAtOnce(const std::vector<StubCall>& calls) {
  int most = 0;
  for (const StubCall& call : calls) {
    if (call.endSequence == 0) {
      return 0;
    }
    const auto others = std::count_if(calls.begin(), calls.end(), [&](const StubCall& other) {
      return other.startSequence <= call.startSequence && other.endSequence > call.startSequence;
    });
    most = std::max(most, static_cast<int>(others));
  }
  return most;
}

bool DidOverlap(const StubCall& a, const StubCall& b) {
  return a.startSequence < b.endSequence && b.startSequence < a.endSequence;
}

/// Whether both contain the same digit.
bool HaveCommon(const std::string& a, const std::string& b) {
  return std::any_of(a.begin(), a.end(),
                     [&](char c) { return c != ' ' && b.find(c) != std::string::npos; });
}

class JobsTest : public QueueTest {
 protected:
  static void ExpectSuccess(Program& runner) {
    ExpectEnd(runner, 0);
    ExpectQueueDone();
  }
};

TEST_F(JobsTest, OneAtATimeByDefault) {
  velathumb_.Stub().Plan(StubPlan().Sleep(20));
  Enqueue({"/tmp/a", "/tmp/b", "/tmp/c"});
  EXPECT_EQ(velathumb_.Run().exitCode, 0);
  EXPECT_EQ(MostAtOnce(velathumb_.Stub().Calls()), 1);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a", "/tmp/b", "/tmp/c"));
}

TEST_F(JobsTest, AsManyAtATimeAsRequested) {
  velathumb_.Stub().Plan(StubPlan().WaitForFile("/tmp/go"));
  Enqueue({"/tmp/a", "/tmp/b", "/tmp/c", "/tmp/d", "/tmp/e", "/tmp/f"});
  Program runner = velathumb_.Start({"--jobs", "3"});
  ASSERT_TRUE(velathumb_.WaitForStarts(3));
  std::this_thread::sleep_for(milliseconds(300));
  EXPECT_THAT(velathumb_.Entries(), UnorderedElementsAre("/tmp/a", "/tmp/b", "/tmp/c"));
  Release();
  ExpectSuccess(runner);
  EXPECT_THAT(velathumb_.Entries(), SizeIs(6));
  EXPECT_EQ(MostAtOnce(velathumb_.Stub().Calls()), 3);
}

TEST_F(JobsTest, NeverTwoForTheSameDirectory) {
  MakeDirectories("/tmp/a/b/c");
  MakeDirectories("/tmp/ab");
  ASSERT_EQ(symlink("a/b", "/tmp/alias"), 0);
  velathumb_.Stub().Plan(StubPlan().Sleep(60));
  // Which of the four directories each entry covers.
  const std::map<std::string, std::string> directories = {
      {"R:/tmp/a", "1 2 3"}, {"/tmp/a/b", "2"},     {"/tmp/alias", "2"},    {"R:/tmp/alias", "2 3"},
      {"/tmp/ab", "4"},      {"/tmp/a", "1"},       {"R::/tmp/a", "1 2 3"}, {"/tmp/alias/c", "3"},
      {"R:/tmp/a/b", "2 3"}, {"/tmp/a/../ab", "4"}, {"R:/tmp/ab:x", "4"},   {"/tmp/a/b/c", "3"},
  };
  for (const auto& [entry, numbers] : directories) {
    Enqueue({entry});
  }
  EXPECT_EQ(velathumb_.Run({"--jobs", "8"}).exitCode, 0);
  const std::vector<StubCall> calls = velathumb_.Stub().Calls();
  ASSERT_THAT(calls, SizeIs(directories.size()));
  EXPECT_GE(MostAtOnce(calls), 2);
  for (const StubCall& a : calls) {
    for (const StubCall& b : calls) {
      const std::string first = a.Parameters().back();
      const std::string second = b.Parameters().back();
      if (a.number < b.number && HaveCommon(directories.at(first), directories.at(second))) {
        EXPECT_FALSE(DidOverlap(a, b)) << first << ' ' << second;
      }
    }
  }
}

TEST_F(JobsTest, ALockedDirectoryIsConvertedLater) {
  const StubTool converter(kConverterPath);
  const std::string locked = MakePhoto("/tmp/p/locked/a.jpg");
  const std::string inTree = MakePhoto("/tmp/p/tree/below/b.jpg");
  const std::string free = MakePhoto("/tmp/p/free/c.jpg");
  MakeDirectories("/tmp/p/locked/@eaDir");
  MakeDirectories("/tmp/p/tree/below/@eaDir");
  Descriptor first = HoldLock("/tmp/p/locked/@eaDir", O_RDONLY);
  Descriptor second = HoldLock("/tmp/p/tree/below/@eaDir", O_RDONLY);
  Enqueue({"/tmp/p/locked", "R:/tmp/p/tree", "/tmp/p/free"});
  Program runner = StartRunner();
  EXPECT_TRUE(WaitUntilExists("/tmp/p/free/@eaDir/c.jpg/VELAPHOTO_THUMB_S.jpg"));
  std::this_thread::sleep_for(milliseconds(300));
  EXPECT_FALSE(HasThumb(locked));
  EXPECT_FALSE(HasThumb(inTree));
  EXPECT_FALSE(runner.Wait(milliseconds(0)));
  first.Close();
  second.Close();
  ExpectSuccess(runner);
  EXPECT_TRUE(HasThumb(locked));
  EXPECT_TRUE(HasThumb(inTree));
  EXPECT_TRUE(HasThumb(free));
}

TEST_F(JobsTest, ASecondRunnerIsRefused) {
  velathumb_.Stub().Plan(StubPlan().WaitForFile("/tmp/go"));
  Enqueue({"/tmp/a"});
  Program runner = velathumb_.Start();
  ASSERT_TRUE(velathumb_.WaitForStarts(1));
  Enqueue({"/tmp/b"});
  const ProgramResult second = velathumb_.Run();
  EXPECT_EQ(second.exitCode, 1);
  EXPECT_EQ(second.err, "velathumb-queue: another velathumb-queue is already running\n");
  EXPECT_EQ(ReadFile(kQueueFile), "/tmp/b\n");
  Release();
  ExpectSuccess(runner);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a", "/tmp/b"));
}

TEST_F(JobsTest, ADirectoryThatWasLockedMeanwhileIsRepeated) {
  MakeDirectories("/tmp/a/@eaDir");
  Program runner = StartAndHold({"/tmp/a"});
  Descriptor metadata = HoldLock("/tmp/a/@eaDir", O_RDONLY);
  Release();
  EXPECT_FALSE(runner.Wait(milliseconds(500)));
  EXPECT_FALSE(Exists(kJournalFile));
  metadata.Close();
  ExpectSuccess(runner);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a", "/tmp/a"));
}

TEST_F(JobsTest, ASecondRunnerThatWaitsContinuesAfterTheFirst) {
  Program first = StartAndHold({"/tmp/a"});
  Program second = velathumb_.Start({"--wait"});
  EXPECT_FALSE(second.Wait(milliseconds(300)));
  EXPECT_THAT(velathumb_.Entries(), SizeIs(1));
  Stop(first);
  ExpectSuccess(second);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a", "/tmp/a"));
}

TEST_F(JobsTest, ARunnerThatWaitsForARemovedLockFileWaitsForTheNewOne) {
  Program first = StartAndHold({"/tmp/a"});
  Program second = velathumb_.Start({"--wait"});
  EXPECT_FALSE(second.Wait(milliseconds(300)));
  RemoveTree("/run/velathumb-queue.lock");
  const Descriptor made(open("/run/velathumb-queue.lock", O_RDWR | O_CREAT | O_CLOEXEC, 0644));
  struct flock whole = {};
  whole.l_type = F_WRLCK;
  whole.l_whence = SEEK_SET;
  ASSERT_EQ(fcntl(made.Get(), F_SETLK, &whole), 0);
  Stop(first);
  EXPECT_FALSE(second.Wait(milliseconds(300)));
  EXPECT_THAT(velathumb_.Entries(), SizeIs(1));
  whole.l_type = F_UNLCK;
  ASSERT_EQ(fcntl(made.Get(), F_SETLK, &whole), 0);
  ExpectSuccess(second);
  EXPECT_THAT(velathumb_.Entries(), SizeIs(2));
}

constexpr const char* kRunnerLock = "/run/velathumb-queue.lock";

/// A process with a lock on the whole lock file, which anybody who can read the file can take when
/// it is a read lock.
class LockHolder {
 public:
  explicit LockHolder(short type) {
    const Descriptor file(open(kRunnerLock, O_RDWR | O_CREAT | O_CLOEXEC, 0644));
    EXPECT_EQ(chmod(kRunnerLock, 0644), 0);
    process_ = fork();
    if (process_ == 0) {
      struct flock whole = {};
      whole.l_type = type;
      whole.l_whence = SEEK_SET;
      const bool isLocked = fcntl(file.Get(), F_SETLK, &whole) == 0;
      WriteFile(isLocked ? "/tmp/locked" : "/tmp/not-locked", "");
      pause();
      _exit(0);
    }
    EXPECT_TRUE(WaitUntilExists("/tmp/locked"));
  }
  LockHolder(const LockHolder&) = delete;
  LockHolder& operator=(const LockHolder&) = delete;
  ~LockHolder() { End(); }

  void End() {
    if (process_ > 0) {
      kill(process_, SIGKILL);
      waitpid(process_, nullptr, 0);
      process_ = 0;
    }
  }

 private:
  pid_t process_ = 0;
};

TEST_F(JobsTest, TheLockFileIsPrivate) {
  Program runner = StartAndHold({"/tmp/a"});
  EXPECT_EQ(ModeOf(kRunnerLock), 0600);
  Release();
  ExpectSuccess(runner);
}

TEST_F(JobsTest, AReadLockOnALockFileOfAnEarlierVersionStopsNoRunner) {
  for (const std::vector<std::string>& arguments :
       {std::vector<std::string>{}, std::vector<std::string>{"--wait"}}) {
    const LockHolder reader(F_RDLCK);
    Enqueue({"/tmp/a"});
    Program runner = velathumb_.Start(arguments);
    ExpectSuccess(runner);
    EXPECT_EQ(ModeOf(kRunnerLock), 0600);
    EXPECT_THAT(ListDirectory("/run"), Not(Contains("velathumb-queue.lock.new")));
    RemoveTree(kRunnerLock);
    RemoveTree("/tmp/locked");
  }
}

TEST_F(JobsTest, ARunnerOfAnEarlierVersionIsNoticedAndWaitedFor) {
  LockHolder earlier(F_WRLCK);
  Enqueue({"/tmp/a"});
  const ProgramResult second = velathumb_.Run();
  EXPECT_EQ(second.exitCode, 1);
  EXPECT_EQ(second.err, "velathumb-queue: another velathumb-queue is already running\n");
  Program waiting = velathumb_.Start({"--wait"});
  EXPECT_FALSE(waiting.Wait(milliseconds(300)));
  EXPECT_EQ(ModeOf(kRunnerLock), 0644);
  earlier.End();
  ExpectSuccess(waiting);
  EXPECT_EQ(ModeOf(kRunnerLock), 0600);
}

TEST_F(JobsTest, OneOfTheRunnersThatReplaceALockFileRuns) {
  const LockHolder reader(F_RDLCK);
  velathumb_.Stub().Plan(StubPlan().Sleep(20));
  Enqueue({"/tmp/a", "/tmp/b", "/tmp/c"});
  std::vector<Program> runners;
  for (int i = 0; i < 6; ++i) {
    runners.push_back(velathumb_.Start({"--wait"}));
  }
  for (Program& runner : runners) {
    ExpectEnd(runner, 0);
  }
  ExpectQueueDone();
  EXPECT_EQ(MostAtOnce(velathumb_.Stub().Calls()), 1);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a", "/tmp/b", "/tmp/c"));
}

TEST_F(JobsTest, ALockFileThatIsNotTheRunnersOwnIsRefused) {
  WriteFile("/run/precious", "precious");
  ASSERT_EQ(chmod("/run/precious", 0600), 0);
  const std::pair<std::function<int()>, const char*> places[] = {
      {[] { return mkfifo(kRunnerLock, 0644); }, "Invalid argument"},
      {[] { return symlink("/run/precious", kRunnerLock); }, "Too many levels of symbolic links"},
      {[] { return symlink("/run/new", kRunnerLock); }, "Too many levels of symbolic links"},
      {[] { return link("/run/precious", kRunnerLock); }, "Too many links"}};
  Enqueue({"/tmp/a"});
  for (const auto& [put, message] : places) {
    ASSERT_EQ(put(), 0);
    Program runner = velathumb_.Start({"--wait"});
    const auto result = runner.Wait(seconds(10));
    ASSERT_TRUE(result) << message;
    EXPECT_EQ(result->exitCode, 2);
    EXPECT_EQ(result->err, "velathumb-queue: cannot lock /var/run/velathumb-queue.lock: " +
                               std::string(message) + "\n");
    ASSERT_EQ(unlink(kRunnerLock), 0);
  }
  EXPECT_EQ(ReadFile("/run/precious"), "precious");
  EXPECT_FALSE(Exists("/run/new"));
  EXPECT_THAT(velathumb_.Entries(), IsEmpty());
}

TEST_F(JobsTest, ReadersThatLockTheQueueFilesDoNotStopARun) {
  Enqueue({"/tmp/a"});
  const Descriptor queue = HoldLock(kQueueFile, O_RDONLY);
  MakeDirectories("/tmp/b");
  Program runner = velathumb_.Start({"--add", "/tmp/b"});
  ExpectSuccess(runner);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a", "/tmp/b"));
}

}  // namespace
}  // namespace vela_test
