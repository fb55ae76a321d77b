// A profile or a velathumb that cannot be used: the runner ends, and no entry is lost.
#include "command_check.h"

#include <sys/stat.h>

#include "checks/configuration_check.h"
#include "queue_fixture.h"
#include "support/daemon_peer.h"

namespace vela_test {
namespace {

using namespace ::testing;

/// Exit status when only a change of the configuration helps.
constexpr int kMisconfigured = 78;

/// Shorter than the runner waits for the writer of a profile, longer than it takes to give up.
constexpr std::chrono::milliseconds kMoment(200);

class CommandCheckTest : public QueueTest {
 protected:
  /// Fails the test unless the runner ends with the status for a wrong configuration, has started
  /// no velathumb and keeps the queue. Returns its messages.
  std::string Refusal(const std::string& velathumb, const std::string& profile) const {
    Enqueue({"/tmp/a"});
    const ProgramResult result =
        RunProgram(QueueProgramPath(), {"--velathumb", velathumb, "--profile", profile});
    EXPECT_EQ(result.exitCode, kMisconfigured);
    EXPECT_EQ(ReadFile(kQueueFile), "/tmp/a\n");
    EXPECT_FALSE(Exists(kTakenFile));
    RemoveTree(kQueueFile);
    return result.err;
  }

  /// The recording velathumb.
  std::string Recorder() const { return velathumb_.Arguments()[1]; }

  /// Lets velathumb change the profile for the first of two entries, runs the runner for them and
  /// expects the status for a wrong configuration; both entries are left. Returns the messages.
  std::string EndOfRun(const StubPlan& plan, const std::vector<std::string>& options = {}) {
    velathumb_.Stub().PlanWhen("/tmp/a", plan);
    Enqueue({"/tmp/a", "/tmp/b"});
    const ProgramResult result = velathumb_.Run(options);
    EXPECT_EQ(result.exitCode, kMisconfigured);
    EXPECT_EQ(ReadFile(kTakenFile), "/tmp/a\n/tmp/b\n");
    EXPECT_FALSE(Exists(kJournalFile));
    EXPECT_FALSE(Exists(kLaterFile));
    return result.err;
  }
};

TEST_F(CommandCheckTest, AProfileThatCannotBeUsedKeepsTheQueue) {
  WriteFile("/tmp/invalid.conf", "[thumb_s\nsize=120\n");
  WriteFile("/tmp/empty.conf", "; nothing\n");
  WriteFile("/tmp/other.conf", "[thumb_s]\nfilename=VELAPHOTO_THUMB_XL.jpg\nsize=1280\n");
  MakeDirectories("/tmp/directory");
  const std::pair<std::string, std::string> cases[] = {
      {"/tmp/none.conf", "cannot read the profile /tmp/none.conf: No such file or directory"},
      {"/tmp/a\x1b.conf", "cannot read the profile /tmp/a\\x1b.conf: No such file or directory"},
      {"/tmp/invalid.conf",
       "cannot parse the profile /tmp/invalid.conf: line 1: a section is a name in brackets, alone "
       "in its line: \"[thumb_s\"; the whole file is rejected"},
      {"/tmp/directory", "cannot parse the profile /tmp/directory"},
      {"/tmp/empty.conf",
       "the profile /tmp/empty.conf defines no thumbnail, or photo_thumb_size_map excludes all of "
       "them"},
      {"/tmp/other.conf",
       "the profile /tmp/other.conf defines no thumbnail, or photo_thumb_size_map excludes all of "
       "them"},
  };
  for (const auto& [profile, message] : cases) {
    EXPECT_EQ(Refusal(Recorder(), profile), "velathumb-queue: " + message + "\n");
  }
  EXPECT_THAT(velathumb_.Entries(), IsEmpty());
}

TEST_F(CommandCheckTest, AProfileThatMayNotBeReadKeepsTheQueue) {
  ASSERT_EQ(chmod(kProfiles, 0), 0);
  Enqueue({"/tmp/a"});
  ProgramOptions options;
  options.beforeExec = {DropCapabilities()};
  const ProgramResult result = RunProgram(QueueProgramPath(), velathumb_.Arguments(), options);
  EXPECT_EQ(result.exitCode, kMisconfigured);
  EXPECT_EQ(result.err,
            "velathumb-queue: cannot read the profile /tmp/profiles.conf: Permission denied\n");
  EXPECT_EQ(ReadFile(kQueueFile), "/tmp/a\n");
}

TEST_F(CommandCheckTest, AVelathumbThatCannotBeStartedKeepsTheQueue) {
  WriteFile("/tmp/text", "");
  ASSERT_EQ(chmod("/tmp/text", 0644), 0);
  EXPECT_EQ(Refusal("/tmp/text", kProfiles),
            "velathumb-queue: cannot run /tmp/text: Permission denied\n");
  EXPECT_EQ(Refusal("/tmp/none", kProfiles),
            "velathumb-queue: cannot run /tmp/none: No such file or directory\n");
}

TEST_F(CommandCheckTest, AnEntryWhoseProfileHasBecomeUnusableIsNotDone) {
  const DaemonPeer daemon;
  EXPECT_EQ(EndOfRun(StubPlan().WriteFile(kProfiles, "[thumb_s\n")),
            "velathumb-queue: took 2 entries\n"
            "velathumb-queue: cannot parse the profile /tmp/profiles.conf: line 1: a section is a "
            "name in brackets, alone in its line: \"[thumb_s\"; the whole file is rejected\n");
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a"));
}

TEST_F(CommandCheckTest, ARunnerThatFollowsTheQueueEndsAsWell) {
  EndOfRun(StubPlan().Remove(kProfiles), {"--follow"});
}

TEST_F(CommandCheckTest, AProfileThatIsBeingWrittenAtTheStartIsWaitedFor) {
  const std::string profile = ReadFile(kProfiles);
  for (const char* unfinished : {"", "[thumb_s]\nfilename=VELAPHOTO_THUMB_S.jpg\nphase=2\n"}) {
    WriteFile(kProfiles, unfinished);
    Enqueue({"/tmp/a"});
    const size_t starts = velathumb_.Entries().size();
    Program runner = velathumb_.Start();
    EXPECT_FALSE(runner.Wait(kMoment)) << unfinished;
    WriteFile(kProfiles, profile);
    ExpectEnd(runner, 0);
    EXPECT_EQ(velathumb_.Entries().size(), starts + 1);
    EXPECT_THAT(runner.Error(), Not(HasSubstr("profile"))) << unfinished;
  }
}

TEST_F(CommandCheckTest, AProfileThatIsBeingWrittenDuringAnEntryIsWaitedFor) {
  const std::string profile = ReadFile(kProfiles);
  velathumb_.Stub().PlanCall(1, StubPlan().WriteFile(kProfiles, "").CreateFile("/tmp/here"));
  Enqueue({"/tmp/a", "/tmp/b"});
  Program runner = velathumb_.Start();
  ASSERT_TRUE(WaitUntilExists("/tmp/here"));
  EXPECT_FALSE(runner.Wait(kMoment));
  WriteFile(kProfiles, profile);
  ExpectEnd(runner, 0);
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a", "/tmp/b", "/tmp/a"));
  ExpectQueueDone();
}

TEST_F(CommandCheckTest, AProfileThatIsBeingWrittenWhenEntriesComeIsWaitedFor) {
  const std::string profile = ReadFile(kProfiles);
  Program runner = velathumb_.Start({"--follow"});
  EXPECT_FALSE(runner.Wait(kMoment));
  WriteFile(kProfiles, "");
  Enqueue({"/tmp/a"});
  EXPECT_FALSE(runner.Wait(kMoment));
  WriteFile(kProfiles, profile);
  EXPECT_TRUE(velathumb_.WaitForStarts(1));
  EXPECT_TRUE(WaitUntilGone(kTakenFile));
  Stop(runner);
}

TEST_F(CommandCheckTest, ASignalEndsTheWaitForTheWriterOfAProfile) {
  velathumb_.Stub().PlanCall(1, StubPlan().WriteFile(kProfiles, "").CreateFile("/tmp/here"));
  Enqueue({"/tmp/a", "/tmp/b"});
  Program runner = velathumb_.Start();
  ASSERT_TRUE(WaitUntilExists("/tmp/here"));
  EXPECT_FALSE(runner.Wait(kMoment));
  Stop(runner);
  EXPECT_EQ(ReadFile(kTakenFile), "/tmp/a\n/tmp/b\n");
  EXPECT_EQ(velathumb_.Entries().size(), 1U);
  EXPECT_THAT(runner.Error(), Not(HasSubstr("profile")));
}

TEST_F(CommandCheckTest, TheFaultIsLoggedOnceForAllJobs) {
  velathumb_.Stub().PlanWhen("/tmp/b", StubPlan().WaitForFile("/tmp/go"));
  const std::string messages =
      EndOfRun(StubPlan().Remove(kProfiles).CreateFile("/tmp/go"), {"--jobs", "2"});
  EXPECT_EQ(messages.find("cannot read"), messages.rfind("cannot read"));
}

TEST_F(CommandCheckTest, AnEntryIsRepeatedOnceWhenTheProfileHasChangedMeanwhile) {
  // Another valid one: in between it may have been empty.
  const std::string profile = ReadFile(kProfiles) + "\n";
  velathumb_.Stub().PlanWhen("/tmp/a", StubPlan().WriteFile(kProfiles, profile + "; changed\n"));
  Enqueue({"/tmp/a", "/tmp/b"});
  ExpectRun({"/tmp/a", "/tmp/b", "/tmp/a"});
}

TEST_F(CommandCheckTest, TheProfileOfTheAdministratorGoesFirst) {
  const auto choose = [] { return vela::ChooseProfileFile("/tmp/etc.conf", "/tmp/share.conf"); };
  EXPECT_EQ(choose(), "/tmp/share.conf");
  WriteFile("/tmp/etc.conf", "");
  EXPECT_EQ(choose(), "/tmp/etc.conf");
  ASSERT_EQ(chmod("/tmp/etc.conf", 0), 0);
  EXPECT_EQ(choose(), "/tmp/etc.conf");
}

}  // namespace
}  // namespace vela_test
