// The command line and what is told.
#include <gmock/gmock.h>
#include <sys/stat.h>

#include <string>
#include <vector>

#include "queue_fixture.h"
#include "queue_program.h"
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
                      HasSubstr("--version"), HasSubstr("Exit status")));
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
  EXPECT_EQ(velathumb.Run({"--add", "/tmp/b"}).exitCode, 1);
  WriteFile("/tmp/go", "");
  EXPECT_TRUE(runner.Wait());
  EXPECT_THAT(velathumb.Entries(), ElementsAre("/tmp/a", "/tmp/b"));
}

TEST_F(OptionsTest, AnEntryWithANewlineIsRefused) {
  EXPECT_THAT(Refusal(QueueArguments(kProfiles, {"--add", "/tmp/a\n/tmp/b"})),
              HasSubstr("cannot append to /var/spool/thumb_create.queue: /tmp/a\\x0a/tmp/b: "));
}

TEST_F(OptionsTest, ALockFileThatCannotBeMadeIsAnError) {
  MakeDirectories("/run/velathumb-queue.lock");
  EXPECT_THAT(Refusal(QueueArguments(kProfiles)),
              StartsWith("velathumb-queue: cannot open /var/run/velathumb-queue.lock: "));
}

TEST_F(OptionsTest, ASpoolThatIsNotThereIsAnError) {
  RecordingVelathumb velathumb;
  MakeDirectories(kTakenFile);
  WriteFile(std::string(kTakenFile) + "/file", "");
  EXPECT_EQ(velathumb.Run().exitCode, 2);
  EXPECT_THAT(velathumb.Entries(), IsEmpty());
}

TEST_F(OptionsTest, LinesForTheJournalCarryTheirLevel) {
  const RecordingVelathumb velathumb;
  Enqueue({"/tmp/a"});
  ProgramOptions options;
  options.addedEnvironment = {"JOURNAL_STREAM=1:2"};
  const ProgramResult result = RunProgram(
      QueueProgramPath(),
      {"--velathumb", "/usr/vela/bin/velathumb-recorder", "--profile", kProfiles}, options);
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.err, "<6>took 1 entry\n");
}

TEST_F(OptionsTest, ControlCharactersOfAnEntryAreWrittenOut) {
  RecordingVelathumb velathumb;
  velathumb.Stub().PlanCall(1, StubPlan().Exit(1));
  Enqueue({"/tmp/\x1b[2J\r"});
  EXPECT_EQ(velathumb.Run().err,
            "velathumb-queue: took 1 entry\n"
            "velathumb-queue: velathumb was ended, trying again: /tmp/\\x1b[2J\\x0d\n");
}

}  // namespace
}  // namespace vela_test
