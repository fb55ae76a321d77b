// Faults of the volume of the queue: no entry is lost.
#include <sys/syscall.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <random>
#include <thread>

#include "queue_fixture.h"
#include "support/mounts.h"
#include "support/profile_file.h"
#include "support/seccomp_fail.h"
#include "taken_queue.h"

using namespace vela;

namespace vela_test {
namespace {

using namespace ::testing;
using std::chrono::milliseconds;

class SpoolFaultTest : public QueueTest {
 protected:
  ProgramResult RunWith(const BeforeExec& fault) const {
    ProgramOptions options;
    options.beforeExec = {fault};
    return RunProgram(QueueProgramPath(), velathumb_.Arguments(), options);
  }

  /// The first velathumb fills the volume of the queue.
  void FillSpoolInFirstRun() { velathumb_.Stub().PlanCall(1, StubPlan().FillVolume("/var/spool")); }

  SmallVolume spool_{"/var/spool", 1 << 20};
};

TEST_F(SpoolFaultTest, EntriesThatCannotBeRecordedStayInTheQueue) {
  FillSpoolInFirstRun();
  Enqueue({"/tmp/a", "/tmp/b"});
  const ProgramResult result = velathumb_.Run();
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_THAT(result.err, HasSubstr("cannot record that an entry is done: No space left on"));
  EXPECT_EQ(ReadFile(kTakenFile), "/tmp/a\n/tmp/b\n");
  spool_.SetAvailable(1 << 20);
  ExpectRun({"/tmp/a", "/tmp/a", "/tmp/b"});
}

TEST_F(SpoolFaultTest, AFollowingRunnerContinuesWhenThereIsRoomAgain) {
  FillSpoolInFirstRun();
  Enqueue({"/tmp/a", "/tmp/b"});
  Program runner = velathumb_.Start({"--follow"});
  ASSERT_TRUE(velathumb_.WaitForStarts(2));
  EXPECT_EQ(ReadFile(kTakenFile), "/tmp/a\n/tmp/b\n");
  spool_.SetAvailable(1 << 20);
  ASSERT_TRUE(WaitUntilGone(kTakenFile, 30000));
  EXPECT_EQ(velathumb_.Entries().front(), "/tmp/a");
  EXPECT_EQ(velathumb_.Entries().back(), "/tmp/b");
  Stop(runner);
  EXPECT_THAT(runner.Error(), HasSubstr("trying again in 1 second\n"));
  ExpectQueueDone();
}

TEST_F(SpoolFaultTest, ASignalEndsTheWaitForRoom) {
  FillSpoolInFirstRun();
  Enqueue({"/tmp/a"});
  Program runner = velathumb_.Start({"--follow"});
  ASSERT_TRUE(velathumb_.WaitForStarts(3));
  Stop(runner);
  EXPECT_EQ(ReadFile(kTakenFile), "/tmp/a\n");
}

TEST_F(SpoolFaultTest, ADeferredEntryThatCannotBeSavedStaysInTheQueue) {
  FillSpoolInFirstRun();
  Enqueue({"/tmp/a"});
  velathumb_.Stub().PlanCall(1, StubPlan().Remove("/tmp/a").FillVolume("/var/spool"));
  const ProgramResult result = velathumb_.Run();
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_THAT(result.err, Not(HasSubstr("deferred")));
  EXPECT_EQ(ReadFile(kTakenFile), "/tmp/a\n");
}

TEST_F(SpoolFaultTest, ARecordThatExceedsTheQuotaKeepsTheQueue) {
  // Long enough that only the record of this entry is written with so many bytes at once.
  const std::string entry = "/tmp/" + std::string(207, 'q');
  const auto size = static_cast<uint32_t>(entry.size() + 1);
  Enqueue({entry});
  const ProgramResult result = RunWith(SeccompFail({{SYS_write, EDQUOT, 2, 0xffffffff, size}}));
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_THAT(result.err, HasSubstr("cannot record that an entry is done: Disk quota exceeded\n"));
  EXPECT_EQ(ReadFile(kTakenFile), entry + '\n');
  ExpectRun({entry, entry});
}

/// Fills and frees the volume of the queue at random times until it is destroyed.
class ChangingVolume {
 public:
  ChangingVolume(SmallVolume& volume, unsigned seed)
      : volume_(volume), thread_([this, seed] { Change(seed); }) {}
  ~ChangingVolume() {
    isOver_ = true;
    thread_.join();
    volume_.SetAvailable(kRoom);
  }
  ChangingVolume(const ChangingVolume&) = delete;
  ChangingVolume& operator=(const ChangingVolume&) = delete;

  static constexpr uint64_t kRoom = 1 << 20;

 private:
  void Change(unsigned seed) {
    std::mt19937 random(seed);
    std::uniform_int_distribution<int> pause(1, 30);
    for (bool isFull = true; !isOver_; isFull = !isFull) {
      volume_.SetAvailable(isFull ? 0 : kRoom);
      std::this_thread::sleep_for(milliseconds(pause(random)));
    }
  }

  SmallVolume& volume_;
  std::atomic<bool> isOver_ = false;
  std::thread thread_;
};

TEST_F(SpoolFaultTest, AVolumeThatIsFullAtRandomTimesLosesNoThumbnail) {
  constexpr int kDirectories = 8;
  constexpr unsigned kTrials = 10;
  const StubTool converter(kConverterPath);
  WriteProfileFile(kProfiles, UsualProfiles());
  WriteFile("/etc/velainfo.conf", "");
  WriteFile("/var/spool/used", "x");
  for (unsigned trial = 1; trial <= kTrials; ++trial) {
    SCOPED_TRACE(trial);
    RemoveTree("/tmp/p");
    for (int i = 0; i < kDirectories; ++i) {
      MakePhoto("/tmp/p/" + std::to_string(i) + "/a.jpg");
      AppendToQueue({"/tmp/p/" + std::to_string(i)});
    }
    {
      const ChangingVolume changing(spool_, trial);
      for (int run = 0; run < 5; ++run) {
        EXPECT_THAT(RunRunner().exitCode, AnyOf(0, 2));
      }
    }
    EXPECT_EQ(RunRunner().exitCode, 0);
    for (int i = 0; i < kDirectories; ++i) {
      EXPECT_THAT(ListDirectory("/tmp/p/" + std::to_string(i) + "/@eaDir/a.jpg"), SizeIs(4)) << i;
    }
  }
}

struct SyncFault {
  const char* name;
  std::vector<const char*> queued;  ///< directories that exist, or begin with /tmp/none
  const char* message;
};

class SyncFaultTest : public SpoolFaultTest, public WithParamInterface<SyncFault> {};

TEST_P(SyncFaultTest, KeepsTheQueue) {
  std::string lines;
  for (const char* entry : GetParam().queued) {
    lines += std::string(entry) + '\n';
  }
  MakeDirectories("/tmp/a");
  WriteFile(kQueueFile, lines);
  const ProgramResult result = RunWith(SeccompFail({SYS_fsync}, EIO));
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_THAT(result.err, HasSubstr(GetParam().message));
  EXPECT_EQ(ReadFile(kTakenFile), lines);
}

const SyncFault kSyncFaults[] = {
    {"OfTheRecords", {"/tmp/a"}, "cannot remove the finished queue: Input/output error\n"},
    {"OfADeferredEntry", {"/tmp/none"}, "cannot defer an entry: Input/output error\n"},
};

INSTANTIATE_TEST_SUITE_P(Sync, SyncFaultTest, ValuesIn(kSyncFaults),
                         [](const auto& test) { return test.param.name; });

TEST_F(SpoolFaultTest, AnEntryIsNotRecordedBeforeItsSecondPhaseIsOnTheDisk) {
  velathumb_.Stub().PlanCall(1, StubPlan().WriteFile(kQueueFile, "/tmp/a\n"));
  Enqueue({"/tmp/a"});
  const ProgramResult result = RunWith(SeccompFail({SYS_fsync}, EIO));
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_FALSE(Exists(kJournalFile));
  EXPECT_EQ(ReadFile(kTakenFile), "/tmp/a\n");
}

TEST_F(SpoolFaultTest, AnEntryThatCannotReachTheDiskIsNotAdded) {
  MakeDirectories("/tmp/a");
  ProgramOptions options;
  options.beforeExec = {SeccompFail({SYS_fsync}, EIO)};
  const ProgramResult result =
      RunProgram(QueueProgramPath(), velathumb_.Arguments({"--add", "/tmp/a"}), options);
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_THAT(velathumb_.Entries(), IsEmpty());
}

class SpoolFileFaultTest : public QueueSandboxTest {
 protected:
  SpoolFileFaultTest() { WriteFile("/var/spool/used", "x"); }

  SmallVolume spool_{"/var/spool", 1 << 20};
  TakenQueue taken_{PhotoQueuePaths()};
};

TEST_F(SpoolFileFaultTest, DeferredEntriesArePutBackWithoutRoom) {
  WriteFile(kLaterFile, "/a\n/b\n");
  spool_.SetAvailable(0);
  EXPECT_EQ(taken_.RequeueDeferred(), 0);
  EXPECT_EQ(ReadFile(kQueueFile), "/a\n/b\n");
  EXPECT_FALSE(Exists(kLaterFile));
}

TEST_F(SpoolFileFaultTest, DeferredEntriesArePutBackCompletelyOrNotAtAll) {
  // The last page of the queue has room for the first of them only.
  const std::string filler = '/' + std::string(SmallVolume::PageSize() - 12, 'f') + '\n';
  WriteFile(kQueueFile, filler);
  WriteFile(kLaterFile, "/a\n/some/longer/entry\n");
  spool_.SetAvailable(0);
  EXPECT_EQ(taken_.RequeueDeferred(), ENOSPC);
  EXPECT_EQ(ReadFile(kQueueFile), filler);
  EXPECT_EQ(ReadFile(kLaterFile), "/a\n/some/longer/entry\n");
}

TEST_F(SpoolFileFaultTest, ATakenFileThatCannotBeExaminedIsNotReplaced) {
  ASSERT_EQ(symlink(kTakenFile, kTakenFile), 0);
  WriteFile(kQueueFile, "/a\n");
  EXPECT_EQ(taken_.Take(), TakenQueue::Outcome::kFailed);
  EXPECT_EQ(taken_.LastError(), ELOOP);
  EXPECT_EQ(ReadFile(kQueueFile), "/a\n");
}

TEST_F(SpoolFileFaultTest, NothingIsRecordedAfterAFailure) {
  WriteFile(kQueueFile, "/a\n/b\n");
  ASSERT_EQ(taken_.Take(), TakenQueue::Outcome::kTaken);
  spool_.SetAvailable(0);
  EXPECT_EQ(taken_.MarkDone("/a"), ENOSPC);
  spool_.SetAvailable(1 << 20);
  EXPECT_EQ(taken_.MarkDone("/b"), ENOSPC);
  EXPECT_EQ(taken_.Finish(), ENOSPC);
  ASSERT_EQ(taken_.Take(), TakenQueue::Outcome::kResumed);
  EXPECT_EQ(taken_.Entries(), (std::vector<std::string>{"/a", "/b"}));
}

}  // namespace
}  // namespace vela_test
