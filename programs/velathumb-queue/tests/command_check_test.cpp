// A profile or a velathumb that cannot be used: the runner ends, and no entry is lost.
#include "command_check.h"

#include <sys/stat.h>

#include "checks/configuration_check.h"
#include "queue_fixture.h"
#include "support/daemon_peer.h"

namespace vela_test {
namespace {

using namespace ::testing;

/// What systemd is told when only a change of the configuration helps.
constexpr int kMisconfigured = 78;

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

  /// Lets velathumb change the profile, runs the runner for two entries and expects the status for
  /// a wrong configuration; both entries are left. Returns the messages.
  std::string EndOfRun(const StubPlan& plan, const std::vector<std::string>& options = {}) {
    velathumb_.Stub().PlanCall(1, plan);
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
      {"/tmp/invalid.conf", "cannot parse the profile /tmp/invalid.conf"},
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
            "velathumb-queue: cannot parse the profile /tmp/profiles.conf\n");
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a"));
}

TEST_F(CommandCheckTest, ARunnerThatFollowsTheQueueEndsAsWell) {
  EndOfRun(StubPlan().Remove(kProfiles), {"--follow"});
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
