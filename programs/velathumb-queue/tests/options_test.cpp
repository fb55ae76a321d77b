// The command line and what is told.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <string>
#include <vector>

#include "queue_fixture.h"
#include "queue_program.h"
#include "support/descriptor.h"
#include "support/files.h"

namespace vela_test {
namespace {

using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::MatchesRegex;
using ::testing::StartsWith;

class OptionsTest : public QueueTest {
 protected:
  /// The runner must refuse the arguments and leave the queue.
  static std::string Refusal(const std::vector<std::string>& arguments) {
    Enqueue({"/tmp/a"});
    const ProgramResult result = RunProgram(QueueProgramPath(), arguments);
    EXPECT_EQ(result.exitCode, 2);
    EXPECT_EQ(result.out, "");
    EXPECT_EQ(ReadFile(kQueueFile), "/tmp/a\n");
    EXPECT_FALSE(Exists(kTakenFile));
    return result.err;
  }
};

TEST_F(OptionsTest, HelpTellsEveryOption) {
  for (const char* word : {"-h", "--help"}) {
    const ProgramResult result = RunProgram(QueueProgramPath(), {word});
    EXPECT_EQ(result.exitCode, 0);
    EXPECT_EQ(result.err, "");
    EXPECT_THAT(result.out,
                AllOf(HasSubstr("--follow"), HasSubstr("--jobs"), HasSubstr("--profile"),
                      HasSubstr("--velathumb"), HasSubstr("--check-videos"), HasSubstr("--add"),
                      HasSubstr("--version"), HasSubstr("--wait"), HasSubstr("Exit status")));
  }
}

TEST_F(OptionsTest, VersionTellsTheVersion) {
  const ProgramResult result = RunProgram(QueueProgramPath(), {"--version"});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_THAT(result.out, MatchesRegex("velathumb-queue [0-9]+\\.[0-9]+\\.[0-9]+\n"));
}

TEST_F(OptionsTest, AnUnknownOptionIsRefused) {
  EXPECT_THAT(Refusal({"--nonsense"}), HasSubstr("--nonsense"));
}

TEST_F(OptionsTest, AWordThatIsNoOptionIsRefused) {
  EXPECT_THAT(Refusal(QueueArguments(kProfiles, {"/tmp/a"})), HasSubstr("/tmp/a"));
}

TEST_F(OptionsTest, ANumberOfJobsOutOfRangeIsRefused) {
  EXPECT_THAT(Refusal(QueueArguments(kProfiles, {"--jobs", "0"})), HasSubstr("--jobs"));
}

TEST_F(OptionsTest, JobsThatAreNoNumberAreRefused) {
  EXPECT_THAT(Refusal(QueueArguments(kProfiles, {"--jobs", "many"})), HasSubstr("--jobs"));
}

TEST_F(OptionsTest, AProfileThatIsNotThereIsRefused) {
  EXPECT_EQ(Refusal(QueueArguments("/tmp/none.conf")),
            "velathumb-queue: /tmp/none.conf: No such file or directory\n");
}

TEST_F(OptionsTest, AVelathumbThatIsNoProgramIsRefused) {
  WriteFile("/tmp/text", "");
  ASSERT_EQ(chmod("/tmp/text", 0644), 0);
  EXPECT_EQ(Refusal({"--velathumb", "/tmp/text", "--profile", kProfiles}),
            "velathumb-queue: /tmp/text: Permission denied\n");
}

TEST_F(OptionsTest, EntriesCanBeAddedToTheQueue) {
  const RecordingVelathumb velathumb;
  Enqueue({"/tmp/a"});
  MakeEntryDirectories({"/tmp/b", "/tmp/-c d"});
  EXPECT_EQ(velathumb.Run({"--add", "R:/tmp/b", "-a", "/tmp/a", "--add", "/tmp/-c d"}).exitCode, 0);
  EXPECT_THAT(velathumb.Entries(), ElementsAre("/tmp/a", "R:/tmp/b", "/tmp/-c d"));
  ExpectNothingWaits();
}

TEST_F(OptionsTest, EntriesAreAddedForTheRunnerThatRuns) {
  RecordingVelathumb velathumb;
  velathumb.Stub().PlanCall(1, StubPlan().WaitForFile("/tmp/go"));
  Enqueue({"/tmp/a"});
  Program runner = velathumb.Start();
  ASSERT_TRUE(velathumb.WaitForStarts(1));
  MakeEntryDirectories({"/tmp/b"});
  EXPECT_EQ(velathumb.Run({"--add", "/tmp/b"}).exitCode, 1);
  WriteFile("/tmp/go", "");
  EXPECT_TRUE(runner.Wait());
  EXPECT_THAT(velathumb.Entries(), ElementsAre("/tmp/a", "/tmp/b"));
}

TEST_F(OptionsTest, AnEntryWithANewlineIsRefused) {
  EXPECT_THAT(Refusal(QueueArguments(kProfiles, {"--add", "/tmp/a\n/tmp/b"})),
              HasSubstr("cannot add /tmp/a\\n/tmp/b: an entry cannot contain a newline\n"));
}

TEST_F(OptionsTest, AnEntryIsAddedWithItsWholePath) {
  const RecordingVelathumb velathumb;
  MakeEntryDirectories({"/tmp/p/a b", "/tmp/p/tree", "/tmp/q"});
  ProgramOptions options;
  options.workingDirectory = "/tmp/p";
  const ProgramResult result = RunProgram(
      QueueProgramPath(),
      velathumb.Arguments({"-a", "a b", "-a", "R:tree/", "-a", ".", "-a", "../q", "-a", "/tmp/q/"}),
      options);
  EXPECT_EQ(result.exitCode, 0) << result.err;
  EXPECT_THAT(velathumb.Entries(), ElementsAre("/tmp/p/a b", "R:/tmp/p/tree", "/tmp/p", "/tmp/q"));
}

TEST_F(OptionsTest, AnEntryWithoutADirectoryIsRefused) {
  for (const char* entry : {"/tmp/none", "R:/tmp/none", "none", "", "R:", "/tmp/profiles.conf"}) {
    ResetQueueSandbox();
    EXPECT_THAT(Refusal(QueueArguments(kProfiles, {"--add", entry})),
                HasSubstr(std::string("cannot add ") + entry + ": there is no such directory\n"));
  }
}

TEST_F(OptionsTest, ATreeThatVelathumbWouldLeaveOutIsRefused) {
  const RecordingVelathumb velathumb;
  MakeDirectories("/tmp/a:b");
  MakeDirectories("/tmp/@eaDir");
  EXPECT_THAT(Refusal(velathumb.Arguments({"--add", "R:/tmp/a:b"})), HasSubstr("colon"));
  RemoveTree(kQueueFile);
  EXPECT_THAT(Refusal(velathumb.Arguments({"--add", "R:/tmp/@eaDir/"})),
              HasSubstr("velathumb skips a tree of this name\n"));
  EXPECT_EQ(velathumb.Run({"--add", "/tmp/a:b"}).exitCode, 0);
  EXPECT_THAT(velathumb.Entries(), ElementsAre("/tmp/a", "/tmp/a:b"));
}

TEST_F(OptionsTest, WithAnEntryThatIsRefusedNoneIsAdded) {
  MakeDirectories("/tmp/b");
  Refusal(QueueArguments(kProfiles, {"--add", "/tmp/b", "--add", "/tmp/none"}));
}

TEST_F(OptionsTest, AProfileThatCannotBeReadAsOneLeavesTheQueue) {
  WriteFile(kProfiles, "[thumb_s\nsize=120\n");
  EXPECT_EQ(Refusal(QueueArguments(kProfiles)),
            "velathumb-queue: no profile file, or no thumbnail in it: /tmp/profiles.conf\n");
}

TEST_F(OptionsTest, AProfileWithoutAnyThumbnailLeavesTheQueue) {
  WriteFile(kProfiles, "; nothing\n");
  EXPECT_EQ(Refusal(QueueArguments(kProfiles)),
            "velathumb-queue: no profile file, or no thumbnail in it: /tmp/profiles.conf\n");
}

TEST_F(OptionsTest, ADirectoryForAProfileLeavesTheQueue) {
  MakeDirectories("/tmp/directory");
  EXPECT_EQ(Refusal(QueueArguments("/tmp/directory")),
            "velathumb-queue: no profile file, or no thumbnail in it: /tmp/directory\n");
}

TEST_F(OptionsTest, AFifoInTheQueuesPlaceIsAnError) {
  const RecordingVelathumb velathumb;
  ASSERT_EQ(mkfifo(kQueueFile, 0644), 0);
  Program runner = velathumb.Start();
  const auto result = runner.Wait(std::chrono::seconds(10));
  ASSERT_TRUE(result);
  EXPECT_EQ(result->exitCode, 2);
}

TEST_F(OptionsTest, ALockFileThatCannotBeMadeIsAnError) {
  MakeDirectories("/run/velathumb-queue.lock");
  EXPECT_THAT(Refusal(QueueArguments(kProfiles)),
              StartsWith("velathumb-queue: cannot lock /var/run/velathumb-queue.lock: "));
}

TEST_F(OptionsTest, ASpoolThatIsNotThereIsAnError) {
  RecordingVelathumb velathumb;
  MakeDirectories(kTakenFile);
  WriteFile(std::string(kTakenFile) + "/file", "");
  EXPECT_EQ(velathumb.Run().exitCode, 2);
  EXPECT_THAT(velathumb.Entries(), IsEmpty());
}

/// Runs the runner for one entry with its standard error in a file of which JOURNAL_STREAM tells
/// this inode number plus `offset`. Returns what it wrote.
std::string ErrorWithJournalStream(const RecordingVelathumb& velathumb, ino_t offset) {
  Enqueue({"/tmp/a"});
  const Descriptor error(open("/tmp/err", O_RDWR | O_CREAT | O_TRUNC | O_CLOEXEC, 0644));
  struct stat status = {};
  EXPECT_EQ(fstat(error.Get(), &status), 0);
  ProgramOptions options;
  options.addedEnvironment = {"JOURNAL_STREAM=" + std::to_string(status.st_dev) + ':' +
                              std::to_string(status.st_ino + offset)};
  options.beforeExec = {[&] { return dup2(error.Get(), STDERR_FILENO) < 0 ? errno : 0; }};
  EXPECT_EQ(RunProgram(QueueProgramPath(), velathumb.Arguments(), options).exitCode, 0);
  return ReadFile("/tmp/err");
}

TEST_F(OptionsTest, LinesForTheJournalCarryTheirLevel) {
  EXPECT_EQ(ErrorWithJournalStream(RecordingVelathumb(), 0), "<6>took 1 entry\n");
}

TEST_F(OptionsTest, LinesForAFileCarryNoLevelWhenTheJournalIsThatOfAProgramAbove) {
  EXPECT_EQ(ErrorWithJournalStream(RecordingVelathumb(), 1), "velathumb-queue: took 1 entry\n");
}

TEST_F(OptionsTest, ControlCharactersOfAnEntryAreWrittenOut) {
  RecordingVelathumb velathumb;
  velathumb.Stub().PlanCall(1, StubPlan().Exit(1));
  Enqueue({"/tmp/\x1b[2J\r"});
  EXPECT_EQ(velathumb.Run().err,
            "velathumb-queue: took 1 entry\n"
            "velathumb-queue: velathumb did not complete, trying again: /tmp/\\x1b[2J\\x0d\n");
}

}  // namespace
}  // namespace vela_test
