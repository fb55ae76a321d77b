// Directories that are locked by others, and work that velathumb has left: nothing is lost, and no
// other entry waits.
#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include "batch.h"
#include "entry_check.h"
#include "queue_fixture.h"
#include "storage/unfinished_directories.h"
#include "support/build_paths.h"
#include "support/mounts.h"
#include "support/profile_file.h"
#include "support/users.h"

using namespace vela;

namespace vela_test {
namespace {

using namespace ::testing;
using std::chrono::milliseconds;
using std::chrono::seconds;

/// Locks a directory in the given way, as any user who can read it may.
Descriptor LockDirectory(const std::string& path, int kind) {
  MakeDirectories(path);
  Descriptor held(open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  EXPECT_EQ(flock(held.Get(), kind), 0) << path;
  return held;
}

class LockedDirectoryTest : public QueueTest, public WithParamInterface<int> {
 protected:
  const StubTool converter_{kConverterPath};
};

TEST_P(LockedDirectoryTest, IsProcessedWhenItIsFree) {
  const std::string photo = MakePhoto("/tmp/p/a.jpg");
  Descriptor held = LockDirectory("/tmp/p/@eaDir", GetParam());
  Enqueue({"/tmp/p"});
  Program runner = StartRunner();
  EXPECT_FALSE(runner.Wait(milliseconds(500)));
  held.Close();
  ExpectEnd(runner, 0);
  EXPECT_TRUE(HasThumb(photo));
  ExpectQueueDone();
}

TEST_P(LockedDirectoryTest, IsProcessedWhenItWasLockedOnlyWhileVelathumbRan) {
  velathumb_.Stub().PlanCall(1, StubPlan()
                                    .CreateFile("/tmp/here")
                                    .WaitForFile("/tmp/go")
                                    .PassThrough(VelathumbPath())
                                    .CreateFile("/tmp/skipped")
                                    .WaitForFile("/tmp/end"));
  velathumb_.Stub().Plan(StubPlan().PassThrough(VelathumbPath()));
  const std::string photo = MakePhoto("/tmp/p/a.jpg");
  Enqueue({"/tmp/p"});
  Program runner = velathumb_.Start();
  ASSERT_TRUE(WaitUntilExists("/tmp/here"));
  Descriptor held = LockDirectory("/tmp/p/@eaDir", GetParam());
  WriteFile("/tmp/go", "");
  ASSERT_TRUE(WaitUntilExists("/tmp/skipped"));
  held.Close();
  WriteFile("/tmp/end", "");
  ExpectEnd(runner, 0);
  EXPECT_TRUE(HasThumb(photo));
  // The second one queues the directory for the phases after the first.
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/p", "/tmp/p", "/tmp/p"));
  ExpectQueueDone();
}

TEST_P(LockedDirectoryTest, DoesNotDelayTheOthersOfItsTree) {
  const std::string locked = MakePhoto("/tmp/p/a/1.jpg");
  const std::string other = MakePhoto("/tmp/p/b/2.jpg");
  Descriptor held = LockDirectory("/tmp/p/a/@eaDir", GetParam());
  Enqueue({"R:/tmp/p"});
  Program runner = StartRunner();
  EXPECT_TRUE(WaitUntilExists("/tmp/p/b/@eaDir/2.jpg/VELAPHOTO_THUMB_S.jpg"));
  EXPECT_FALSE(runner.Wait(milliseconds(500)));
  EXPECT_FALSE(HasThumb(locked));
  held.Close();
  ExpectEnd(runner, 0);
  EXPECT_TRUE(HasThumb(locked));
  EXPECT_TRUE(HasThumb(other));
  ExpectQueueDone();
}

TEST_P(LockedDirectoryTest, DoesNotDelayNewEntries) {
  Descriptor held = LockDirectory("/tmp/p/@eaDir", GetParam());
  Enqueue({"/tmp/p"});
  Program runner = velathumb_.Start();
  EXPECT_FALSE(runner.Wait(milliseconds(300)));
  Enqueue({"/tmp/new"});
  ASSERT_TRUE(velathumb_.WaitForStarts(1));
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/new"));
  Enqueue({"/tmp/newer"});
  ASSERT_TRUE(velathumb_.WaitForStarts(2));
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/new", "/tmp/newer"));
  held.Close();
  ExpectEnd(runner, 0);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/new", "/tmp/newer", "/tmp/p"));
  ExpectQueueDone();
}

TEST_P(LockedDirectoryTest, IsDeferredToALaterRunInTheEnd) {
  const Descriptor held = LockDirectory("/tmp/p/@eaDir", GetParam());
  Enqueue({"/tmp/p"});
  TakenQueue taken(PhotoQueuePaths());
  ASSERT_EQ(taken.Take(), TakenQueue::Outcome::kTaken);
  const RunSettings settings;
  EventWait events;
  PauseGate gate;
  EntryHistories histories = {{"/tmp/p", {0, 10, {}}}};
  const ProgressLine progress;
  Batch batch(settings, taken, events, gate, histories, progress);
  EXPECT_EQ(batch.Run(), RunEnd::kEmpty);
  EXPECT_EQ(batch.DeferredCount(), 1);
  EXPECT_EQ(ReadFile(kLaterFile), "/tmp/p\n");
}

INSTANTIATE_TEST_SUITE_P(Kinds, LockedDirectoryTest, Values(LOCK_SH, LOCK_EX),
                         [](const auto& test) {
                           return test.param == LOCK_SH ? "Shared" : "Exclusive";
                         });

TEST(PostponementTest, GrowsAndEndsAfterAWhile) {
  std::vector<long> pauses;
  seconds sum(0);
  for (int count = 1; const auto pause = PostponementFor(count); ++count) {
    pauses.push_back(static_cast<long>(pause->count()));
    sum += *pause;
  }
  EXPECT_THAT(pauses, ElementsAre(2, 4, 8, 16, 32, 64, 128, 256, 300, 300));
  EXPECT_LT(sum, std::chrono::minutes(20));
}

using LockProbeTest = QueueSandboxTest;

TEST_F(LockProbeTest, FollowsTheLinksThatVelathumbFollows) {
  const Descriptor held = LockDirectory("/tmp/elsewhere", LOCK_EX);
  MakeDirectories("/tmp/p");
  ASSERT_EQ(symlink("/tmp/elsewhere", "/tmp/p/@eaDir"), 0);
  EXPECT_THAT(FindSkippedDirectories({"/tmp/p", false}).locked, ElementsAre("/tmp/p"));
  if (HasOtherUsers()) {
    ASSERT_EQ(lchown("/tmp/p/@eaDir", 1, 1), 0);
    EXPECT_THAT(FindSkippedDirectories({"/tmp/p", false}).locked, IsEmpty());
  }
}

TEST_F(LockProbeTest, LeavesNoLock) {
  MakeDirectories("/tmp/p/@eaDir");
  EXPECT_THAT(FindSkippedDirectories({"/tmp/p", false}).locked, IsEmpty());
  LockDirectory("/tmp/p/@eaDir", LOCK_EX | LOCK_NB);
}

class UnfinishedTest : public QueueTest {
 protected:
  UnfinishedTest() {
    WriteProfileFile(kProfiles, UsualProfiles());
    WriteFile("/etc/velainfo.conf", "");
    MakePhoto("/tmp/p/a.jpg");
  }

  /// What all phases make.
  static void ExpectAllThumbs() {
    EXPECT_THAT(ListDirectory("/tmp/p/@eaDir/a.jpg"),
                ElementsAre("VELAPHOTO_THUMB_B.jpg", "VELAPHOTO_THUMB_M.jpg",
                            "VELAPHOTO_THUMB_S.jpg", "VELAPHOTO_THUMB_XL.jpg"));
  }

  const StubTool converter_{kConverterPath};
};

TEST_F(UnfinishedTest, APhaseThatVelathumbCannotQueueIsMade) {
  // No file can be appended to at the path of the queue while the second conversion runs.
  converter_.PlanCall(2, StubPlan::Normal().CreateFile(kQueueFile).ReplaceByDirectory(kQueueFile));
  converter_.PlanCall(3, StubPlan::Normal().Remove(kQueueFile));
  Enqueue({"/tmp/p"});
  ConvertQueue();
  EXPECT_THAT(converter_.Calls(), SizeIs(3));
  ExpectAllThumbs();
}

TEST_F(UnfinishedTest, APhaseOfATreeThatVelathumbCannotQueueIsMade) {
  converter_.PlanCall(2, StubPlan::Normal().CreateFile(kQueueFile).ReplaceByDirectory(kQueueFile));
  Enqueue({"R:/tmp/p"});
  Program runner = StartRunner();
  ExpectEnd(runner, 2);
  EXPECT_EQ(ReadFile(kTakenFile), "R:/tmp/p\n");
  RemoveTree(kQueueFile);
  ConvertQueue();
  ExpectAllThumbs();
}

TEST_F(UnfinishedTest, APhaseThatAnyVelathumbCouldNotQueueIsMade) {
  EXPECT_EQ(RunRunner().exitCode, 0);
  MakeDirectories(kQueueFile);
  EXPECT_EQ(RunProgram(VelathumbPath(), {kProfiles, "/tmp/p"}).exitCode, 0);
  RemoveTree(kQueueFile);
  EXPECT_THAT(converter_.Calls(), SizeIs(2));
  ConvertQueue();
  ExpectAllThumbs();
}

TEST_F(UnfinishedTest, AFullVolumeOfTheQueueLosesNoPhase) {
  converter_.PlanCall(2, StubPlan::Normal().FillVolume("/var/spool"));
  {
    SmallVolume spool("/var/spool", 1 << 20);
    Enqueue({"/tmp/p"});
    Program runner = StartRunner();
    ExpectEnd(runner, 2);
    EXPECT_EQ(ReadFile(kTakenFile), "/tmp/p\n");
    spool.SetAvailable(1 << 20);
    EXPECT_EQ(RunRunner().exitCode, 0);
    EXPECT_FALSE(Exists(kTakenFile));
  }
  ExpectAllThumbs();
}

}  // namespace
}  // namespace vela_test
