// The command line and the messages.
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "queue_fixture.h"
#include "support/daemon_peer.h"
#include "support/descriptor.h"

namespace vela_test {
namespace {

using namespace ::testing;

class OptionsTest : public QueueTest {
 protected:
  /// Fails the test unless the runner refuses the arguments, ends with this status and keeps the
  /// queue. Returns the message.
  static std::string Refusal(const std::vector<std::string>& arguments, int exitCode = 2) {
    Enqueue({"/tmp/a"});
    const ProgramResult result = RunProgram(QueueProgramPath(), arguments);
    EXPECT_EQ(result.exitCode, exitCode);
    EXPECT_EQ(result.out, "");
    EXPECT_EQ(ReadFile(kQueueFile), "/tmp/a\n");
    EXPECT_FALSE(Exists(kTakenFile));
    return result.err;
  }
};

TEST_F(OptionsTest, HelpListsEveryOption) {
  for (const char* word : {"-h", "--help"}) {
    const ProgramResult result = RunProgram(QueueProgramPath(), {word});
    EXPECT_EQ(result.exitCode, 0);
    EXPECT_EQ(result.err, "");
    EXPECT_THAT(result.out,
                AllOf(HasSubstr("--follow"), HasSubstr("--jobs"), HasSubstr("--profile"),
                      HasSubstr("--velathumb"), HasSubstr("--check-videos"), HasSubstr("--add"),
                      HasSubstr("--version"), HasSubstr("--wait"), HasSubstr("--now"),
                      HasSubstr("--queue-only"), HasSubstr("Exit status"),
                      HasSubstr("64 invalid command line"),
                      HasSubstr("78 velathumb cannot be started, or would make nothing, or nothing "
                                "right, with this profile or these settings.")));
  }
}

TEST_F(OptionsTest, PrintsItsVersion) {
  const ProgramResult result = RunProgram(QueueProgramPath(), {"--version"});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_THAT(result.out, MatchesRegex("velathumb-queue [0-9]+\\.[0-9]+\\.[0-9]+\n"));
}

TEST_F(OptionsTest, InvalidArgumentsAreRefused) {
  const std::pair<std::vector<std::string>, const char*> cases[] = {
      {{"--nonsense"}, "--nonsense"},
      {{"--profile"}, "--profile"},
      {QueueArguments(kProfiles, {"/tmp/a"}), "/tmp/a"},
      {QueueArguments(kProfiles, {"--jobs", "0"}), "--jobs"},
      {QueueArguments(kProfiles, {"--jobs", "many"}), "--jobs"},
      {QueueArguments(kProfiles, {"--queue-only"}), "--queue-only needs --add"},
      {QueueArguments(kProfiles, {"--add", "/tmp/a", "--queue-only", "--now"}), "excludes --now"},
  };
  for (const auto& [arguments, message] : cases) {
    ResetQueueSandbox();
    SCOPED_TRACE(message);
    // Not the status of an error that may pass, after which systemd starts the service again.
    EXPECT_THAT(Refusal(arguments, 64), HasSubstr(message));
  }
}

TEST_F(OptionsTest, AnEntryOfSeveralLinesIsRefused) {
  EXPECT_THAT(Refusal(QueueArguments(kProfiles, {"--add", "/tmp/a\n/tmp/b"})),
              HasSubstr("cannot add /tmp/a\\n/tmp/b: an entry cannot contain a newline\n"));
}

TEST_F(OptionsTest, EntriesCanBeAddedToTheQueue) {
  Enqueue({"/tmp/a"});
  MakeEntryDirectories({"/tmp/b", "/tmp/-c d"});
  EXPECT_EQ(velathumb_.Run({"--add", "R:/tmp/b", "-a", "/tmp/a", "--add", "/tmp/-c d"}).exitCode,
            0);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a", "R:/tmp/b", "/tmp/-c d"));
  ExpectQueueDone();
}

TEST_F(OptionsTest, AnEntryIsAddedWithItsWholePath) {
  MakeEntryDirectories({"/tmp/p/a b", "/tmp/p/tree", "/tmp/q"});
  ProgramOptions options;
  options.workingDirectory = "/tmp/p";
  const ProgramResult result =
      RunProgram(QueueProgramPath(),
                 velathumb_.Arguments(
                     {"-a", "a b", "-a", "R:tree/", "-a", ".", "-a", "../q", "-a", "/tmp/q/"}),
                 options);
  EXPECT_EQ(result.exitCode, 0) << result.err;
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/p/a b", "R:/tmp/p/tree", "/tmp/p", "/tmp/q"));
}

TEST_F(OptionsTest, AnEntryWithoutADirectoryIsRefused) {
  for (const char* entry : {"/tmp/none", "R:/tmp/none", "none", "", "R:", "/tmp/profiles.conf"}) {
    ResetQueueSandbox();
    EXPECT_THAT(Refusal(QueueArguments(kProfiles, {"--add", entry})),
                HasSubstr(std::string("cannot add ") + entry + ": there is no such directory\n"));
  }
}

TEST_F(OptionsTest, ATreeThatVelathumbWouldSkipIsRefused) {
  MakeDirectories("/tmp/a:b");
  MakeDirectories("/tmp/@eaDir");
  EXPECT_THAT(Refusal(velathumb_.Arguments({"--add", "R:/tmp/a:b"})), HasSubstr("colon"));
  RemoveTree(kQueueFile);
  EXPECT_THAT(Refusal(velathumb_.Arguments({"--add", "R:/tmp/@eaDir/"})),
              HasSubstr("velathumb skips a tree of this name\n"));
  EXPECT_EQ(velathumb_.Run({"--add", "/tmp/a:b"}).exitCode, 0);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a", "/tmp/a:b"));
}

TEST_F(OptionsTest, ARefusedEntryKeepsOthersFromBeingAdded) {
  MakeDirectories("/tmp/b");
  Refusal(QueueArguments(kProfiles, {"--add", "/tmp/b", "--add", "/tmp/none"}));
}

TEST_F(OptionsTest, AFifoInPlaceOfTheQueueIsAnError) {
  ASSERT_EQ(mkfifo(kQueueFile, 0644), 0);
  Program runner = velathumb_.Start();
  const auto result = runner.Wait(std::chrono::seconds(10));
  ASSERT_TRUE(result);
  EXPECT_EQ(result->exitCode, 2);
}

TEST_F(OptionsTest, ALockFileThatCannotBeCreatedIsAnError) {
  MakeDirectories("/run/velathumb-queue.lock");
  EXPECT_THAT(Refusal(QueueArguments(kProfiles)),
              StartsWith("velathumb-queue: cannot lock /var/run/velathumb-queue.lock: "));
}

TEST_F(OptionsTest, ATakenFileThatIsADirectoryIsAnError) {
  MakeDirectories(kTakenFile);
  WriteFile(std::string(kTakenFile) + "/file", "");
  EXPECT_EQ(velathumb_.Run().exitCode, 2);
  EXPECT_THAT(velathumb_.Entries(), IsEmpty());
}

/// Runs the runner for one entry with its standard error in a file. JOURNAL_STREAM names the inode
/// number of that file plus `offset`. Returns the content of the file.
std::string ErrorWithJournalStream(ino_t offset) {
  const RecordingVelathumb velathumb;
  const DaemonPeer daemon;
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

TEST_F(OptionsTest, LinesForTheJournalHaveTheirLevel) {
  EXPECT_EQ(ErrorWithJournalStream(0), "<6>took 1 entry\n");
}

TEST_F(OptionsTest, LinesForAFileHaveNoLevelWhenTheJournalIsThatOfAParent) {
  EXPECT_EQ(ErrorWithJournalStream(1), "velathumb-queue: took 1 entry\n");
}

TEST_F(OptionsTest, ControlCharactersOfAnEntryAreEscaped) {
  const DaemonPeer daemon;
  velathumb_.Stub().PlanCall(1, StubPlan().Exit(1));
  Enqueue({"/tmp/\x1b[2J\r"});
  EXPECT_EQ(velathumb_.Run().err,
            "velathumb-queue: took 1 entry\n"
            "velathumb-queue: velathumb did not complete, trying again: /tmp/\\x1b[2J\\x0d\n");
}

}  // namespace
}  // namespace vela_test
