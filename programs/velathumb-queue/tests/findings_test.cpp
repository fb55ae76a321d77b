// Mistakes in the configuration files are logged at the start.
#include "queue_fixture.h"
#include "support/profile_file.h"

namespace vela_test {
namespace {

using namespace ::testing;

using Findings = QueueTest;

constexpr const char* kSettings = "/etc/velainfo.conf";
constexpr const char* kRightSettings = "photo_thumb_size_map=\"1\"\n";

TEST_F(Findings, AreLoggedAtTheStart) {
  WriteFile(kSettings, std::string(kRightSettings) + "stall_timeout=soon\n");
  WriteFile(kProfiles, ReadFile(kProfiles) + "qualty=90\n");
  const ProgramResult result = RunRunner();
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_THAT(result.err,
              StartsWith("velathumb-queue: /etc/velainfo.conf:2: warning: stall_timeout is not a "
                         "number of seconds, or 0 for no limit: \"soon\"; 900 is used\n"
                         "velathumb-queue: /tmp/profiles.conf:6: warning: there is no key "
                         "\"qualty\"; did you mean quality?\n"));
}

TEST_F(Findings, KeepTheQueueWhenEveryPhotoWouldFail) {
  WriteFile(kProfiles, ReadFile(kProfiles) + "unsharp=foo\n");
  Enqueue({"/tmp/a"});
  const ProgramResult result = RunRunner();
  EXPECT_EQ(result.exitCode, 78);
  EXPECT_THAT(result.err,
              AllOf(StartsWith("velathumb-queue: /tmp/profiles.conf:6: error: unsharp is not "),
                    EndsWith("\nvelathumb-queue: the queue is kept until the errors are "
                             "corrected\n")));
  EXPECT_EQ(ReadFile(kQueueFile), "/tmp/a\n");
}

TEST_F(Findings, KeepTheQueueWhenNothingRightWouldBeMade) {
  WriteFile(kProfiles, ReadFile(kProfiles) + "size=0\n");
  Enqueue({"/tmp/a"});
  const ProgramResult result = RunRunner();
  EXPECT_EQ(result.exitCode, 78);
  EXPECT_THAT(result.err, HasSubstr("; no thumbnail has the right size\n"));
  EXPECT_EQ(ReadFile(kQueueFile), "/tmp/a\n");
}

TEST_F(Findings, StopTheServiceWithTheirErrorInTheLogAfterManyForeignSettings) {
  std::string settings = kRightSettings;
  for (int i = 0; i < 30; ++i) {
    settings += "foreign_key_" + std::to_string(i) + "=1\n";
  }
  WriteFile(kSettings, settings);
  WriteFile(kProfiles, ReadFile(kProfiles) + "unsharp=foo\n");
  const ProgramResult result = RunRunner();
  EXPECT_EQ(result.exitCode, 78);
  EXPECT_THAT(result.err,
              StartsWith("velathumb-queue: /tmp/profiles.conf:6: error: unsharp is not "));
}

TEST_F(Findings, AreMissingWithoutAMistake) {
  WriteFile(kSettings, kRightSettings);
  EXPECT_THAT(RunRunner().err, Not(HasSubstr(".conf")));
}

}  // namespace
}  // namespace vela_test
