// Several instances of velathumb at the same time.
#include <fcntl.h>
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

}  // namespace
}  // namespace vela_test
