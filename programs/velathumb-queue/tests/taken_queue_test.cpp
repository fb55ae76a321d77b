// The entries in progress and the journal of processed ones.
#include "taken_queue.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/wait.h>

#include <atomic>
#include <cerrno>
#include <cstdio>
#include <set>
#include <thread>

#include "queue_fixture.h"
#include "support/mounts.h"
#include "support/privileges.h"

using namespace vela;

namespace vela_test {
namespace {

constexpr const char* kQueueGuard = "/run/velathumb-lock.thumb_create.queue";

using namespace ::testing;
using Outcome = TakenQueue::Outcome;

class TakenQueueTest : public SandboxTest {
 protected:
  static void ExpectTake(TakenQueue& queue, Outcome outcome,
                         const std::vector<std::string>& entries) {
    EXPECT_EQ(queue.Take(), outcome);
    EXPECT_EQ(queue.Entries(), entries);
  }

  void ExpectTake(Outcome outcome, const std::vector<std::string>& entries) {
    ExpectTake(taken_, outcome, entries);
  }

  void TakeNewEntry() {
    AppendToQueue({"/a"});
    ASSERT_EQ(taken_.Take(), Outcome::kTaken);
  }

  TakenQueue taken_{PhotoQueuePaths()};
};

TEST_F(TakenQueueTest, WithoutAQueueThereIsNothing) {
  EXPECT_EQ(taken_.Take(), Outcome::kNothing);
  EXPECT_THAT(ListDirectory("/var/spool"), IsEmpty());
}

TEST_F(TakenQueueTest, TakesEachEntryOnceInTheOrderOfFirstAppearance) {
  WriteFile(kQueueFile, "/c\n/a\nR:/a\n/c\n/b\n/a\n");
  ExpectTake(Outcome::kTaken, {"/c", "/a", "R:/a", "/b"});
  EXPECT_FALSE(Exists(kQueueFile));
  EXPECT_TRUE(Exists(kTakenFile));
}

TEST_F(TakenQueueTest, SkipsLinesThatAreEmptyOrTooLong) {
  const std::string longest = '/' + std::string(4093, 'x');
  WriteFile(kQueueFile, "\n" + longest + "\n" + longest + "y\n/last without newline");
  ExpectTake(Outcome::kTaken, {longest, "/last without newline"});
}

TEST_F(TakenQueueTest, EntriesOfAnEarlierRunComeFirst) {
  WriteFile(kTakenFile, "/old\n");
  WriteFile(kQueueFile, "/new\n");
  ExpectTake(Outcome::kResumed, {"/old"});
  EXPECT_EQ(ReadFile(kQueueFile), "/new\n");
  EXPECT_EQ(taken_.Finish(), 0);
  ExpectTake(Outcome::kTaken, {"/new"});
}

TEST_F(TakenQueueTest, ProcessedEntriesAreNotRepeated) {
  WriteFile(kQueueFile, "/a\n/b\n/c\n/b\n");
  ASSERT_EQ(taken_.Take(), Outcome::kTaken);
  EXPECT_EQ(taken_.MarkDone("/b"), 0);
  TakenQueue next(PhotoQueuePaths());
  ExpectTake(next, Outcome::kResumed, {"/a", "/c"});
}

TEST_F(TakenQueueTest, ATruncatedJournalLineIsIgnored) {
  WriteFile(kTakenFile, "/a\n/b\n/b/long\n");
  WriteFile(kJournalFile, "/a\n/b");
  ExpectTake(Outcome::kResumed, {"/b", "/b/long"});
}

TEST_F(TakenQueueTest, ATruncatedJournalLineIsNotJoinedWithTheNext) {
  WriteFile(kTakenFile, "/a/long\n/b\n/a/b\n");
  WriteFile(kJournalFile, "/a");
  ASSERT_EQ(taken_.Take(), Outcome::kResumed);
  EXPECT_EQ(taken_.MarkDone("/b"), 0);
  TakenQueue next(PhotoQueuePaths());
  ExpectTake(next, Outcome::kResumed, {"/a/long", "/a/b"});
}

TEST_F(TakenQueueTest, AJournalOnAFullVolumeGetsNoPartOfALine) {
  SmallVolume volume("/tmp/spool", 1 << 20);
  const QueuePaths paths = {"/tmp/spool/queue", "/tmp/spool/taken", "/tmp/spool/journal",
                            "/tmp/spool/later"};
  TakenQueue taken(paths);
  // The last page of the journal has room for a part of the next line only.
  const std::string filler(SmallVolume::PageSize() - 11, 'f');
  WriteFile(paths.taken, "/a/b/c/d/e/f/g/h\n");
  WriteFile(paths.journal, filler + '\n');
  volume.SetAvailable(0);
  EXPECT_EQ(taken.MarkDone("/a/b/c/d/e/f/g/h"), ENOSPC);
  EXPECT_EQ(ReadFile(paths.journal), filler + '\n');
}

TEST_F(TakenQueueTest, AJournalWithoutItsEntriesIsRemoved) {
  WriteFile(kJournalFile, "/a\n");
  WriteFile(kQueueFile, "/a\n");
  ExpectTake(Outcome::kTaken, {"/a"});
  EXPECT_FALSE(Exists(kJournalFile));
}

TEST_F(TakenQueueTest, FinishLeavesNothing) {
  TakeNewEntry();
  EXPECT_EQ(taken_.MarkDone("/a"), 0);
  EXPECT_EQ(taken_.Finish(), 0);
  EXPECT_THAT(taken_.Entries(), IsEmpty());
  EXPECT_THAT(ListDirectory("/var/spool"), IsEmpty());
}

TEST_F(TakenQueueTest, ReportsThatAnEntryCannotBeRecorded) {
  MakeDirectories(kJournalFile);
  EXPECT_EQ(taken_.MarkDone("/a"), EISDIR);
}

TEST_F(TakenQueueTest, AFifoInPlaceOfTheJournalIsNotWaitedFor) {
  ASSERT_EQ(mkfifo(kJournalFile, 0644), 0);
  const auto start = std::chrono::steady_clock::now();
  alarm(15);  // ends a test that is stuck
  EXPECT_NE(taken_.MarkDone("/a"), 0);
  alarm(0);
  EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(5));
}

TEST_F(TakenQueueTest, AnUnreadableQueueIsKept) {
  WriteFile(kQueueFile, "/a\n");
  ASSERT_EQ(chmod(kQueueFile, 0), 0);
  {
    const WithoutCapabilities asOrdinaryUser;
    EXPECT_EQ(taken_.Take(), Outcome::kFailed);
  }
  EXPECT_EQ(ReadFile(kQueueFile), "/a\n");
}

TEST_F(TakenQueueTest, AQueueThatCannotBeRenamedIsKept) {
  WriteFile(kQueueFile, "/a\n");
  const ReadOnlyMount spool("/var/spool");
  EXPECT_EQ(taken_.Take(), Outcome::kFailed);
  EXPECT_EQ(ReadFile(kQueueFile), "/a\n");
}

TEST_F(TakenQueueTest, TakesNoQueueDuringAnAppend) {
  Descriptor queue = HoldLock(kQueueFile, O_WRONLY | O_CREAT | O_APPEND);
  EXPECT_EQ(taken_.Take(), Outcome::kBusy);
  EXPECT_FALSE(Exists(kTakenFile));
  EXPECT_EQ(write(queue.Get(), "/late\n", 6), 6);
  EXPECT_EQ(taken_.Take(), Outcome::kBusy);
  queue.Close();
  ExpectTake(Outcome::kTaken, {"/late"});
}

TEST_F(TakenQueueTest, AFifoInPlaceOfTheQueueIsRefused) {
  ASSERT_EQ(mkfifo(kQueueFile, 0644), 0);
  EXPECT_EQ(taken_.Take(), Outcome::kFailed);
  EXPECT_TRUE(Exists(kQueueFile));
  EXPECT_FALSE(Exists(kTakenFile));
}

TEST_F(TakenQueueTest, SpellingsOfOnePathAreOneEntry) {
  WriteFile(kQueueFile, "/a/\n/a\n//a\n/./a/.\nR:/a/\nR:/a\n/\n//\n/a b\n/a/b\n");
  ExpectTake(Outcome::kTaken, {"/a/", "R:/a/", "/", "/a b", "/a/b"});
}

TEST_F(TakenQueueTest, ProcessedEntriesAreRecognizedInAnySpelling) {
  WriteFile(kTakenFile, "/a/\n//b\n/c\n");
  WriteFile(kJournalFile, "/a\n/b/\n");
  ExpectTake(Outcome::kResumed, {"/c"});
}

TEST_F(TakenQueueTest, APathThroughALinkAndBackIsAnEntryOfItsOwn) {
  // With /link -> /elsewhere/deep the second one is /elsewhere/a.
  WriteFile(kQueueFile, "/a\n/link/../a\n");
  ExpectTake(Outcome::kTaken, {"/a", "/link/../a"});
}

TEST_F(TakenQueueTest, ALineAppendedToTheTakenFileIsNotLost) {
  TakeNewEntry();
  AppendToFile(kTakenFile, "/late\n");
  EXPECT_EQ(taken_.MarkDone("/a"), 0);
  EXPECT_EQ(taken_.Finish(), 0);
  ExpectTake(Outcome::kResumed, {"/late"});
  EXPECT_EQ(taken_.MarkDone("/late"), 0);
  EXPECT_EQ(taken_.Finish(), 0);
  EXPECT_THAT(ListDirectory("/var/spool"), IsEmpty());
}

TEST_F(TakenQueueTest, ALockedTakenFileIsKept) {
  TakeNewEntry();
  EXPECT_EQ(taken_.MarkDone("/a"), 0);
  Descriptor held = HoldLock(kTakenFile, O_RDONLY);
  EXPECT_EQ(taken_.Finish(), EWOULDBLOCK);
  EXPECT_TRUE(Exists(kTakenFile));
  held.Close();
  EXPECT_EQ(taken_.Finish(), 0);
  EXPECT_THAT(ListDirectory("/var/spool"), IsEmpty());
}

/// Calls `act` while it finds the file locked, at most 10 s. Returns its last result.
template <typename Result>
Result RepeatWhile(Result locked, const std::function<Result()>& act) {
  const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(10);
  Result result = act();
  while (result == locked && std::chrono::steady_clock::now() < end) {
    usleep(10000);
    result = act();
  }
  return result;
}

TEST_F(TakenQueueTest, AQueueThatAReaderKeepsLockedIsTaken) {
  WriteFile(kQueueFile, "/a\n");
  const Descriptor held = HoldLock(kQueueFile, O_RDONLY);
  EXPECT_EQ(RepeatWhile<Outcome>(Outcome::kBusy, [&] { return taken_.Take(); }), Outcome::kTaken);
  EXPECT_THAT(taken_.Entries(), ElementsAre("/a"));
}

TEST_F(TakenQueueTest, ATakenFileThatAReaderKeepsLockedIsRemoved) {
  TakeNewEntry();
  EXPECT_EQ(taken_.MarkDone("/a"), 0);
  const Descriptor held = HoldLock(kTakenFile, O_RDONLY);
  EXPECT_EQ(RepeatWhile<int>(EWOULDBLOCK, [&] { return taken_.Finish(); }), 0);
  EXPECT_THAT(ListDirectory("/var/spool"), IsEmpty());
}

TEST_F(TakenQueueTest, EntriesArePutBackIntoAQueueThatAReaderKeepsLocked) {
  WriteFile(kLaterFile, "/b\n/c\n");
  WriteFile(kQueueFile, "/a\n");
  const Descriptor held = HoldLock(kQueueFile, O_RDONLY);
  EXPECT_EQ(RepeatWhile<int>(EWOULDBLOCK, [&] { return taken_.RequeueDeferred(); }), 0);
  EXPECT_EQ(ReadFile(kQueueFile), "/a\n/b\n/c\n");
}

TEST_F(TakenQueueTest, AQueueWithItsGuardHeldIsNeverTaken) {
  WriteFile(kQueueFile, "/a\n");
  const Descriptor reader = HoldLock(kQueueFile, O_RDONLY);
  WriteFile(kQueueGuard, "");
  ASSERT_EQ(chmod(kQueueGuard, 0600), 0);
  const Descriptor held = HoldLock(kQueueGuard, O_RDONLY);
  for (int i = 0; i < 300; ++i) {
    ASSERT_EQ(taken_.Take(), Outcome::kBusy);
    usleep(10000);
  }
  EXPECT_TRUE(Exists(kQueueFile));
}

TEST_F(TakenQueueTest, ADeferredEntryIsPutBack) {
  AppendToQueue({"/a", "/b", "/c"});
  ASSERT_EQ(taken_.Take(), Outcome::kTaken);
  EXPECT_EQ(taken_.Defer({"/c"}), 0);
  EXPECT_EQ(taken_.Defer({"/a"}), 0);
  EXPECT_EQ(ReadFile(kLaterFile), "/c\n/a\n");
  ExpectTake(Outcome::kResumed, {"/b"});
  EXPECT_EQ(taken_.Finish(), 0);
  EXPECT_EQ(taken_.RequeueDeferred(), 0);
  EXPECT_FALSE(Exists(kLaterFile));
  ExpectTake(Outcome::kTaken, {"/c", "/a"});
}

TEST_F(TakenQueueTest, WithoutDeferredEntriesNothingIsPutBack) {
  EXPECT_EQ(taken_.RequeueDeferred(), 0);
  EXPECT_THAT(ListDirectory("/var/spool"), IsEmpty());
}

TEST_F(TakenQueueTest, AnEntryThatCannotBeDeferredIsNotMarkedAsDone) {
  TakeNewEntry();
  MakeDirectories(kLaterFile);
  EXPECT_EQ(taken_.Defer({"/a"}), EISDIR);
  EXPECT_FALSE(Exists(kJournalFile));
}

TEST_F(TakenQueueTest, EntriesThatCannotBePutBackAreKept) {
  WriteFile(kLaterFile, "/a\n");
  MakeDirectories(kQueueFile);
  EXPECT_NE(taken_.RequeueDeferred(), 0);
  EXPECT_EQ(ReadFile(kLaterFile), "/a\n");
}

TEST_F(TakenQueueTest, ANewEmptyQueueIsLeftToItsWriter) {
  WriteFile(kQueueFile, "");
  EXPECT_EQ(taken_.Take(), Outcome::kBusy);
  EXPECT_TRUE(Exists(kQueueFile));
  EXPECT_FALSE(Exists(kTakenFile));
  AppendToQueue({"/a"});
  ExpectTake(Outcome::kTaken, {"/a"});
}

TEST_F(TakenQueueTest, AnOldEmptyQueueIsRemoved) {
  WriteFile(kQueueFile, "");
  SetFileTimeFromNow(kQueueFile, -60);
  EXPECT_EQ(taken_.Take(), Outcome::kNothing);
  EXPECT_THAT(ListDirectory("/var/spool"), IsEmpty());
}

TEST_F(TakenQueueTest, NoEntryIsLostWhileOthersAppend) {
  constexpr int kAppenders = 4;
  constexpr int kEntries = 500;
  std::vector<pid_t> appenders;
  for (int i = 0; i < kAppenders; ++i) {
    // The pauses give the test time to take the queue.
    appenders.push_back(StartAppender('/' + std::to_string(i), kEntries,
                                      [](int j) { return j % 5 == 4 ? 1000 : 0; }));
  }
  std::atomic<bool> isOver = false;
  std::thread waiting([&] {
    for (const pid_t appender : appenders) {
      int status = -1;
      waitpid(appender, &status, 0);
      EXPECT_EQ(status, 0);
    }
    isOver = true;
  });
  std::multiset<std::string> seen;
  int takes = 0;
  for (bool isLast = false; !isLast;) {
    isLast = isOver;
    const Outcome outcome = taken_.Take();
    isLast = isLast && outcome == Outcome::kNothing;
    if (outcome == Outcome::kTaken || outcome == Outcome::kResumed) {
      ++takes;
      for (const std::string& entry : taken_.Entries()) {
        seen.insert(entry);
        EXPECT_EQ(taken_.MarkDone(entry), 0);
      }
      // An appender that waited for the lock before the renaming holds it for a moment.
      EXPECT_THAT(taken_.Finish(), AnyOf(0, EWOULDBLOCK));
    }
  }
  waiting.join();
  EXPECT_GT(takes, 1);
  EXPECT_EQ(seen.size(), static_cast<size_t>(kAppenders * kEntries));
  EXPECT_EQ(std::set<std::string>(seen.begin(), seen.end()).size(), seen.size());
}

}  // namespace
}  // namespace vela_test
