// The entries in hand and the journal of those that are done.
#include "taken_queue.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/wait.h>

#include <atomic>
#include <cerrno>
#include <chrono>
#include <cstdio>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "platform/velaindex.h"
#include "queue_fixture.h"
#include "support/descriptor.h"
#include "support/files.h"
#include "support/mounts.h"
#include "support/privileges.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::AnyOf;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using Outcome = TakenQueue::Outcome;

class TakenQueueTest : public SandboxTest {
 protected:
  TakenQueue taken_{PhotoQueuePaths()};
};

TEST_F(TakenQueueTest, WithoutAQueueNothingWaits) {
  EXPECT_EQ(taken_.Take(), Outcome::kNothing);
  EXPECT_THAT(ListDirectory("/var/spool"), IsEmpty());
}

TEST_F(TakenQueueTest, TakesEachEntryOnceInTheOrderOfFirstAppearance) {
  WriteFile(kQueueFile, "/c\n/a\nR:/a\n/c\n/b\n/a\n");
  EXPECT_EQ(taken_.Take(), Outcome::kTaken);
  EXPECT_THAT(taken_.Entries(), ElementsAre("/c", "/a", "R:/a", "/b"));
  EXPECT_FALSE(Exists(kQueueFile));
  EXPECT_TRUE(Exists(kTakenFile));
}

TEST_F(TakenQueueTest, PassesOverLinesThatAreEmptyOrTooLong) {
  const std::string longest = '/' + std::string(4093, 'x');
  WriteFile(kQueueFile, "\n" + longest + "\n" + longest + "y\n/last without newline");
  EXPECT_EQ(taken_.Take(), Outcome::kTaken);
  EXPECT_THAT(taken_.Entries(), ElementsAre(longest, "/last without newline"));
}

TEST_F(TakenQueueTest, WhatAnEarlierRunHasLeftComesFirst) {
  WriteFile(kTakenFile, "/old\n");
  WriteFile(kQueueFile, "/new\n");
  EXPECT_EQ(taken_.Take(), Outcome::kResumed);
  EXPECT_THAT(taken_.Entries(), ElementsAre("/old"));
  EXPECT_EQ(ReadFile(kQueueFile), "/new\n");
  EXPECT_EQ(taken_.Finish(), 0);
  EXPECT_EQ(taken_.Take(), Outcome::kTaken);
  EXPECT_THAT(taken_.Entries(), ElementsAre("/new"));
}

TEST_F(TakenQueueTest, WhatIsNotedAsDoneIsNotRepeated) {
  WriteFile(kQueueFile, "/a\n/b\n/c\n/b\n");
  ASSERT_EQ(taken_.Take(), Outcome::kTaken);
  EXPECT_EQ(taken_.MarkDone("/b"), 0);
  TakenQueue later(PhotoQueuePaths());
  EXPECT_EQ(later.Take(), Outcome::kResumed);
  EXPECT_THAT(later.Entries(), ElementsAre("/a", "/c"));
}

TEST_F(TakenQueueTest, AJournalLineThatWasCutOffCountsForNothing) {
  WriteFile(kTakenFile, "/a\n/b\n/b/long\n");
  WriteFile(kJournalFile, "/a\n/b");
  EXPECT_EQ(taken_.Take(), Outcome::kResumed);
  EXPECT_THAT(taken_.Entries(), ElementsAre("/b", "/b/long"));
}

TEST_F(TakenQueueTest, AJournalLineThatWasCutOffDoesNotJoinTheNext) {
  WriteFile(kTakenFile, "/a/long\n/b\n/a/b\n");
  WriteFile(kJournalFile, "/a");
  ASSERT_EQ(taken_.Take(), Outcome::kResumed);
  EXPECT_EQ(taken_.MarkDone("/b"), 0);
  TakenQueue later(PhotoQueuePaths());
  EXPECT_EQ(later.Take(), Outcome::kResumed);
  EXPECT_THAT(later.Entries(), ElementsAre("/a/long", "/a/b"));
}

TEST_F(TakenQueueTest, AJournalOnAFullVolumeKeepsNoPartOfALine) {
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

TEST_F(TakenQueueTest, AJournalWithoutItsEntriesIsForgotten) {
  WriteFile(kJournalFile, "/a\n");
  WriteFile(kQueueFile, "/a\n");
  EXPECT_EQ(taken_.Take(), Outcome::kTaken);
  EXPECT_THAT(taken_.Entries(), ElementsAre("/a"));
  EXPECT_FALSE(Exists(kJournalFile));
}

TEST_F(TakenQueueTest, FinishLeavesNothing) {
  AppendToQueue({"/a"});
  ASSERT_EQ(taken_.Take(), Outcome::kTaken);
  EXPECT_EQ(taken_.MarkDone("/a"), 0);
  EXPECT_EQ(taken_.Finish(), 0);
  EXPECT_THAT(taken_.Entries(), IsEmpty());
  EXPECT_THAT(ListDirectory("/var/spool"), IsEmpty());
}

TEST_F(TakenQueueTest, TellsThatAnEntryCannotBeNoted) {
  MakeDirectories(kJournalFile);
  EXPECT_EQ(taken_.MarkDone("/a"), EISDIR);
}

TEST_F(TakenQueueTest, AQueueThatCannotBeReadStaysWhereItIs) {
  WriteFile(kQueueFile, "/a\n");
  ASSERT_EQ(chmod(kQueueFile, 0), 0);
  {
    const WithoutCapabilities asOrdinaryUser;
    EXPECT_EQ(taken_.Take(), Outcome::kFailed);
  }
  EXPECT_EQ(ReadFile(kQueueFile), "/a\n");
}

TEST_F(TakenQueueTest, AQueueThatCannotBeRenamedStaysWhereItIs) {
  WriteFile(kQueueFile, "/a\n");
  const ReadOnlyMount spool("/var/spool");
  EXPECT_EQ(taken_.Take(), Outcome::kFailed);
  EXPECT_EQ(ReadFile(kQueueFile), "/a\n");
}

/// The queue, locked as by somebody who appends.
Descriptor LockedQueue() {
  Descriptor queue(open(kQueueFile, O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0644));
  EXPECT_EQ(flock(queue.Get(), LOCK_EX), 0);
  return queue;
}

TEST_F(TakenQueueTest, TakesNoQueueWhileAnAppendIsUnderWay) {
  Descriptor queue = LockedQueue();
  EXPECT_EQ(taken_.Take(), Outcome::kBusy);
  EXPECT_FALSE(Exists(kTakenFile));
  EXPECT_EQ(write(queue.Get(), "/late\n", 6), 6);
  EXPECT_EQ(taken_.Take(), Outcome::kBusy);
  queue.Close();
  EXPECT_EQ(taken_.Take(), Outcome::kTaken);
  EXPECT_THAT(taken_.Entries(), ElementsAre("/late"));
}

TEST_F(TakenQueueTest, AFifoInTheQueuesPlaceIsRefused) {
  ASSERT_EQ(mkfifo(kQueueFile, 0644), 0);
  EXPECT_EQ(taken_.Take(), Outcome::kFailed);
  EXPECT_TRUE(Exists(kQueueFile));
  EXPECT_FALSE(Exists(kTakenFile));
}

TEST_F(TakenQueueTest, SpellingsOfOnePathAreOneEntry) {
  WriteFile(kQueueFile, "/a/\n/a\n//a\n/./a/.\nR:/a/\nR:/a\n/\n//\n/a b\n/a/b\n");
  EXPECT_EQ(taken_.Take(), Outcome::kTaken);
  EXPECT_THAT(taken_.Entries(), ElementsAre("/a/", "R:/a/", "/", "/a b", "/a/b"));
}

TEST_F(TakenQueueTest, WhatIsDoneIsKnownByWhateverSpelling) {
  WriteFile(kTakenFile, "/a/\n//b\n/c\n");
  WriteFile(kJournalFile, "/a\n/b/\n");
  EXPECT_EQ(taken_.Take(), Outcome::kResumed);
  EXPECT_THAT(taken_.Entries(), ElementsAre("/c"));
}

TEST_F(TakenQueueTest, APathThroughALinkAndBackIsAnEntryOfItsOwn) {
  // With /link -> /elsewhere/deep the second one is /elsewhere/a.
  WriteFile(kQueueFile, "/a\n/link/../a\n");
  EXPECT_EQ(taken_.Take(), Outcome::kTaken);
  EXPECT_THAT(taken_.Entries(), ElementsAre("/a", "/link/../a"));
}

TEST_F(TakenQueueTest, ALineThatIsAppendedToWhatWasTakenIsNotLost) {
  AppendToQueue({"/a"});
  ASSERT_EQ(taken_.Take(), Outcome::kTaken);
  AppendToFile(kTakenFile, "/late\n");
  EXPECT_EQ(taken_.MarkDone("/a"), 0);
  EXPECT_EQ(taken_.Finish(), 0);
  EXPECT_EQ(taken_.Take(), Outcome::kResumed);
  EXPECT_THAT(taken_.Entries(), ElementsAre("/late"));
  EXPECT_EQ(taken_.MarkDone("/late"), 0);
  EXPECT_EQ(taken_.Finish(), 0);
  EXPECT_THAT(ListDirectory("/var/spool"), IsEmpty());
}

TEST_F(TakenQueueTest, WhatIsDoneStaysWhileSomebodyHoldsIt) {
  AppendToQueue({"/a"});
  ASSERT_EQ(taken_.Take(), Outcome::kTaken);
  EXPECT_EQ(taken_.MarkDone("/a"), 0);
  Descriptor held(open(kTakenFile, O_RDONLY | O_CLOEXEC));
  ASSERT_EQ(flock(held.Get(), LOCK_EX), 0);
  EXPECT_EQ(taken_.Finish(), EWOULDBLOCK);
  EXPECT_TRUE(Exists(kTakenFile));
  held.Close();
  EXPECT_EQ(taken_.Finish(), 0);
  EXPECT_THAT(ListDirectory("/var/spool"), IsEmpty());
}

TEST_F(TakenQueueTest, WhatIsLeftForLaterIsDoneForNowAndComesBack) {
  AppendToQueue({"/a", "/b", "/c"});
  ASSERT_EQ(taken_.Take(), Outcome::kTaken);
  EXPECT_EQ(taken_.Defer("/c"), 0);
  EXPECT_EQ(taken_.Defer("/a"), 0);
  EXPECT_EQ(ReadFile(kLaterFile), "/c\n/a\n");
  EXPECT_EQ(taken_.Take(), Outcome::kResumed);
  EXPECT_THAT(taken_.Entries(), ElementsAre("/b"));
  EXPECT_EQ(taken_.Finish(), 0);
  EXPECT_EQ(taken_.RequeueDeferred(), 0);
  EXPECT_FALSE(Exists(kLaterFile));
  EXPECT_EQ(taken_.Take(), Outcome::kTaken);
  EXPECT_THAT(taken_.Entries(), ElementsAre("/c", "/a"));
}

TEST_F(TakenQueueTest, WithNothingLeftForLaterNothingIsPutBack) {
  EXPECT_EQ(taken_.RequeueDeferred(), 0);
  EXPECT_THAT(ListDirectory("/var/spool"), IsEmpty());
}

TEST_F(TakenQueueTest, AnEntryThatCannotBeKeptIsNotDone) {
  AppendToQueue({"/a"});
  ASSERT_EQ(taken_.Take(), Outcome::kTaken);
  MakeDirectories(kLaterFile);
  EXPECT_EQ(taken_.Defer("/a"), EISDIR);
  EXPECT_FALSE(Exists(kJournalFile));
}

TEST_F(TakenQueueTest, WhatCannotBePutBackIsKept) {
  WriteFile(kLaterFile, "/a\n");
  MakeDirectories(kQueueFile);
  EXPECT_NE(taken_.RequeueDeferred(), 0);
  EXPECT_EQ(ReadFile(kLaterFile), "/a\n");
}

TEST_F(TakenQueueTest, AnEmptyQueueIsLeftToWhoeverIsAboutToWriteIt) {
  WriteFile(kQueueFile, "");
  EXPECT_EQ(taken_.Take(), Outcome::kNothing);
  EXPECT_TRUE(Exists(kQueueFile));
  EXPECT_FALSE(Exists(kTakenFile));
  AppendToQueue({"/a"});
  EXPECT_EQ(taken_.Take(), Outcome::kTaken);
  EXPECT_THAT(taken_.Entries(), ElementsAre("/a"));
}

TEST_F(TakenQueueTest, AnEmptyQueueThatNobodyWritesIsRemoved) {
  WriteFile(kQueueFile, "");
  SetFileTimeFromNow(kQueueFile, -60);
  EXPECT_EQ(taken_.Take(), Outcome::kNothing);
  EXPECT_THAT(ListDirectory("/var/spool"), IsEmpty());
}

/// Starts a process that appends `count` entries of its own, one after the other.
pid_t StartAppender(int number, int count) {
  const pid_t child = fork();
  if (child != 0) {
    return child;
  }
  for (int i = 0; i < count; ++i) {
    const std::string entry = '/' + std::to_string(number) + '/' + std::to_string(i);
    if (WriteIndexQueue(entry.c_str(), kQueueFile) != 0) {
      _exit(1);
    }
    if (i % 5 == 4) {
      usleep(1000);  // who takes comes to his turn
    }
  }
  _exit(0);
}

TEST_F(TakenQueueTest, NoEntryIsLostWhileOthersAppend) {
  constexpr int kAppenders = 4;
  constexpr int kEntries = 500;
  std::vector<pid_t> appenders;
  for (int i = 0; i < kAppenders; ++i) {
    appenders.push_back(StartAppender(i, kEntries));
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
      // Whoever waited for the lock before the renaming has it for a moment.
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
