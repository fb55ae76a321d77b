// Appending to queue files.
#include <fcntl.h>
#include <sys/file.h>
#include <sys/resource.h>
#include <sys/syscall.h>

#include <csignal>
#include <map>

#include "platform/platform_fixture.h"
#include "support/mounts.h"
#include "support/privileges.h"
#include "support/seccomp_fail.h"

namespace vela_test {
namespace {

constexpr const char* kQueue = "/var/spool/thumb_create.queue";

constexpr const char* kRenamedQueue = "/var/spool/thumb_create.queue.tmp";

int Append() {
  return WriteIndexQueue("/photo/a", kQueue);
}

class QueueFile : public SandboxTest {};

TEST_F(QueueFile, IsMadeWithMode0644) {
  const mode_t mask = umask(077);
  EXPECT_EQ(WriteIndexQueue("/photo/a", kQueue), 0);
  umask(mask);
  EXPECT_EQ(ReadFile(kQueue), "/photo/a\n");
  EXPECT_EQ(ModeOf(kQueue), 0644);
}

TEST_F(QueueFile, KeepsItsContentAndMode) {
  WriteFile(kQueue, "/photo/a\n");
  ASSERT_EQ(chmod(kQueue, 0600), 0);
  EXPECT_EQ(WriteIndexQueue("/photo/b", kQueue), 0);
  EXPECT_EQ(WriteIndexQueue("R:/photo/c \xff%s\t", kQueue), 0);
  EXPECT_EQ(ReadFile(kQueue), "/photo/a\n/photo/b\nR:/photo/c \xff%s\t\n");
  EXPECT_EQ(ModeOf(kQueue), 0600);
}

TEST_F(QueueFile, EndsALineThatHasNoNewlineYet) {
  WriteFile(kQueue, "/photo/a");
  EXPECT_EQ(WriteIndexQueue("/photo/b", kQueue), 0);
  EXPECT_EQ(ReadFile(kQueue), "/photo/a\n/photo/b\n");
}

TEST_F(QueueFile, RefusesPathsThatAreNoLine) {
  EXPECT_EQ(WriteIndexQueue("/photo\n/a", kQueue), -1);
  EXPECT_EQ(VLIBCErrGet(), EINVAL);
  EXPECT_EQ(WriteIndexQueue("\n", kQueue), -1);
  EXPECT_EQ(WriteIndexQueue("", kQueue), -1);
  EXPECT_EQ(WriteIndexQueue(nullptr, kQueue), -1);
  EXPECT_EQ(WriteIndexQueue("/photo/a", nullptr), -1);
  EXPECT_FALSE(Exists(kQueue));
}

TEST_F(QueueFile, FailsWhereItCannotBeWritten) {
  EXPECT_EQ(WriteIndexQueue("/photo/a", "/var/spool/absent/queue"), -1);
  EXPECT_EQ(VLIBCErrGet(), ENOENT);
  EXPECT_EQ(WriteIndexQueue("/photo/a", "/var/spool"), -1);
  ASSERT_EQ(mkfifo("/var/spool/fifo", 0600), 0);
  EXPECT_EQ(WriteIndexQueue("/photo/a", "/var/spool/fifo"), -1);
  WriteFile(kQueue, "");
  ASSERT_EQ(chmod(kQueue, 0444), 0);
  const WithoutCapabilities ordinary;
  EXPECT_EQ(WriteIndexQueue("/photo/a", kQueue), -1);
  EXPECT_EQ(VLIBCErrGet(), EACCES);
}

TEST_F(QueueFile, HoldsNoPartOfALineThatDoesNotFit) {
  WriteFile(kQueue, "/photo/a\n");
  InOwnProcess([] {
    signal(SIGXFSZ, SIG_IGN);
    const rlimit limit{12, 12};
    setrlimit(RLIMIT_FSIZE, &limit);
    EXPECT_EQ(WriteIndexQueue("/photo/b", kQueue), -1);
  });
  EXPECT_EQ(ReadFile(kQueue), "/photo/a\n");
}

TEST_F(QueueFile, FailsOnAFullVolume) {
  SmallVolume volume("/var/spool/small", 64 << 10);
  const std::string queue = "/var/spool/small/queue";
  const std::string content(SmallVolume::PageSize() - 1, 'x');
  WriteFile(queue, content + "\n");
  volume.SetAvailable(0);
  EXPECT_EQ(WriteIndexQueue("/photo/b", queue.c_str()), -1);
  EXPECT_EQ(VLIBCErrGet(), ENOSPC);
  EXPECT_EQ(ReadFile(queue), content + "\n");
}

/// Makes one call while these system calls fail with EIO. Returns the error it reports, 0 without
/// one.
int ErrorWithout(const std::vector<int>& calls) {
  return RunForked([&] {
    EXPECT_EQ(SeccompFail(calls, EIO)(), 0);
    return Append() == 0 ? 0 : VLIBCErrGet();
  });
}

TEST_F(QueueFile, ReportsAnEntryThatMayNotBeOnTheDisk) {
  WriteFile(kQueue, "");
  EXPECT_EQ(ErrorWithout({SYS_fdatasync}), EIO);
}

TEST_F(QueueFile, HoldsNoEntryBeforeItsNewNameIsOnTheDisk) {
  EXPECT_EQ(ErrorWithout({SYS_fsync}), EIO);
  EXPECT_EQ(ReadFile(kQueue), "");
  EXPECT_EQ(Append(), 0);
  EXPECT_EQ(ReadFile(kQueue), "/photo/a\n");
}

TEST_F(QueueFile, NeedsTheDirectoryOnlyForANewFile) {
  WriteFile(kQueue, "");
  EXPECT_EQ(ErrorWithout({SYS_fsync}), 0);
  EXPECT_EQ(ReadFile(kQueue), "/photo/a\n");
}

TEST_F(QueueFile, BeginsANewLineAfterAPartThatCouldNotBeRemoved) {
  WriteFile(kQueue, "/photo/x\n");
  InOwnProcess([] {
    signal(SIGXFSZ, SIG_IGN);
    const rlimit limit{12, 12};
    setrlimit(RLIMIT_FSIZE, &limit);
    EXPECT_EQ(SeccompFail({SYS_ftruncate}, EIO)(), 0);
    EXPECT_EQ(WriteIndexQueue("/photo/b", kQueue), -1);
  });
  EXPECT_EQ(ReadFile(kQueue), "/photo/x\n/ph");
  EXPECT_EQ(Append(), 0);
  EXPECT_EQ(ReadFile(kQueue), "/photo/x\n/ph\n/photo/a\n");
}

TEST_F(QueueFile, WaitsForTheLock) {
  WriteFile(kQueue, "");
  EXPECT_EQ(RunAgainstLock(kQueue, Append, [] { EXPECT_EQ(ReadFile(kQueue), ""); }), 0);
  EXPECT_EQ(ReadFile(kQueue), "/photo/a\n");
}

TEST_F(QueueFile, IsCreatedAgainWhenRenamedDuringTheWait) {
  WriteFile(kQueue, "/photo/old\n");
  EXPECT_EQ(RunAgainstLock(kQueue, Append, [] { ASSERT_EQ(rename(kQueue, kRenamedQueue), 0); }), 0);
  EXPECT_EQ(ReadFile(kRenamedQueue), "/photo/old\n");
  EXPECT_EQ(ReadFile(kQueue), "/photo/a\n");
}

TEST_F(QueueFile, IsTheNewOneWhenReplacedDuringTheWait) {
  WriteFile(kQueue, "/photo/old\n");
  const auto replace = [] {
    ASSERT_EQ(rename(kQueue, kRenamedQueue), 0);
    WriteFile(kQueue, "/photo/new\n");
  };
  EXPECT_EQ(RunAgainstLock(kQueue, Append, replace), 0);
  EXPECT_EQ(ReadFile(kRenamedQueue), "/photo/old\n");
  EXPECT_EQ(ReadFile(kQueue), "/photo/new\n/photo/a\n");
}

TEST_F(QueueFile, GetsEveryLineOfManyWritersOnce) {
  constexpr int kWriters = 6;
  constexpr int kLines = 100;
  std::vector<pid_t> writers;
  for (int writer = 0; writer < kWriters; ++writer) {
    writers.push_back(Fork([writer] {
      for (int line = 0; line < kLines; ++line) {
        const std::string path = "/photo/" + std::to_string(writer) + "/" + std::to_string(line) +
                                 std::string(static_cast<size_t>(line * 31 % 4000), 'x');
        if (WriteIndexQueue(path.c_str(), kQueue) != 0) return 1;
      }
      return 0;
    }));
  }
  // Meanwhile the queue is processed as usual: renamed under its lock.
  std::map<std::string, int> seen;
  const auto collect = [&seen](const std::string& file) {
    for (const std::string& line : ReadLines(file)) ++seen[line];
  };
  for (int round = 0; round < 40; ++round) {
    const int queue = open(kQueue, O_RDWR | O_CLOEXEC);
    if (queue >= 0) {
      ASSERT_EQ(flock(queue, LOCK_EX), 0);
      const std::string away = "/var/spool/away" + std::to_string(round);
      ASSERT_EQ(rename(kQueue, away.c_str()), 0);
      collect(away);
      close(queue);
    }
    usleep(1000);
  }
  for (const pid_t writer : writers) EXPECT_EQ(Join(writer), 0);
  if (Exists(kQueue)) collect(kQueue);
  EXPECT_EQ(seen.size(), size_t{kWriters * kLines});
  for (const auto& [line, count] : seen) EXPECT_EQ(count, 1) << line;
}

TEST_F(QueueFile, LeavesNoDescriptorOpen) {
  ExpectNoDescriptorLeak([] {
    for (int i = 0; i < 10; ++i) Append();
    WriteIndexQueue("/photo/a", "/var/spool");
  });
}

}  // namespace
}  // namespace vela_test
