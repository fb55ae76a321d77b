// A runner that stays, and appends that race with it.
#include <gmock/gmock.h>
#include <sys/wait.h>

#include <chrono>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "platform/velaindex.h"
#include "queue_fixture.h"
#include "support/files.h"

namespace vela_test {
namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::Not;

class FollowTest : public QueueTest {
 protected:
  static void Stop(Program& runner) {
    runner.Kill(SIGTERM);
    const auto result = runner.Wait(seconds(5));
    ASSERT_TRUE(result);
    EXPECT_EQ(result->exitCode, 1);
  }

  RecordingVelathumb velathumb_;
};

TEST_F(FollowTest, ReactsToANewQueue) {
  Program runner = velathumb_.Start({"--follow"});
  for (const char* entry : {"/tmp/a", "/tmp/b", "/tmp/c"}) {
    EXPECT_FALSE(runner.Wait(milliseconds(200)));
    const size_t before = velathumb_.Entries().size();
    const auto began = std::chrono::steady_clock::now();
    Enqueue({entry});
    ASSERT_TRUE(velathumb_.WaitForStarts(before + 1));
    EXPECT_LT(std::chrono::steady_clock::now() - began, seconds(5));
    EXPECT_TRUE(WaitUntilGone(kTakenFile));
  }
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/a", "/tmp/b", "/tmp/c"));
  Stop(runner);
  ExpectNothingWaits();
}

TEST_F(FollowTest, TakesNoQueueFromUnderTheHandsOfWhoeverMakesIt) {
  Program runner = velathumb_.Start({"--follow"});
  for (int i = 0; i < 100; ++i) {
    Enqueue({"/tmp/" + std::to_string(i)});
  }
  ASSERT_TRUE(velathumb_.WaitForStarts(100));
  EXPECT_THAT(runner.Error(), Not(HasSubstr("took 0 entries")));
  Stop(runner);
}

TEST_F(FollowTest, ReactsToAQueueThatIsPutInPlaceByRenaming) {
  Program runner = velathumb_.Start({"-f"});
  EXPECT_FALSE(runner.Wait(milliseconds(200)));
  MakeEntryDirectories({"/tmp/a"});
  WriteFile("/var/spool/prepared", "/tmp/a\n");
  ASSERT_EQ(rename("/var/spool/prepared", kQueueFile), 0);
  EXPECT_TRUE(velathumb_.WaitForStarts(1));
  Stop(runner);
}

TEST_F(FollowTest, BeginsWithWhatWaits) {
  MakeEntryDirectories({"/tmp/old"});
  WriteFile(kTakenFile, "/tmp/old\n");
  Enqueue({"/tmp/new"});
  Program runner = velathumb_.Start({"--follow"});
  ASSERT_TRUE(velathumb_.WaitForStarts(2));
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/old", "/tmp/new"));
  EXPECT_TRUE(WaitUntilGone(kTakenFile));
  Stop(runner);
}

/// Starts a process that appends `count` entries, with pauses in which the queue is taken.
pid_t StartAppender(int number, int count) {
  const pid_t child = fork();
  if (child != 0) {
    return child;
  }
  for (int i = 0; i < count; ++i) {
    const std::string entry = "/tmp/" + std::to_string(number) + '/' + std::to_string(i);
    if (WriteIndexQueue(entry.c_str(), kQueueFile) != 0) {
      _exit(1);
    }
    usleep(static_cast<useconds_t>((number * 7 + i * 13) % 10) * 1000);
  }
  _exit(0);
}

TEST_F(FollowTest, EveryEntryOfManyAppendersReachesVelathumb) {
  constexpr int kAppenders = 4;
  constexpr int kEntries = 60;
  std::vector<pid_t> appenders;
  for (int i = 0; i < kAppenders; ++i) {
    for (int j = 0; j < kEntries; ++j) {
      MakeDirectories("/tmp/" + std::to_string(i) + '/' + std::to_string(j));
    }
  }
  for (int i = 0; i < kAppenders; ++i) {
    appenders.push_back(StartAppender(i, kEntries));
  }
  size_t takes = 0;
  bool isLast = false;
  while (!isLast) {
    int status = -1;
    while (!appenders.empty() && waitpid(appenders.back(), &status, WNOHANG) > 0) {
      EXPECT_EQ(status, 0);
      appenders.pop_back();
    }
    isLast = appenders.empty() && !Exists(kQueueFile);
    const ProgramResult result = velathumb_.Run({"--jobs", "2"});
    EXPECT_EQ(result.exitCode, 0) << result.err;
    for (size_t place = 0; (place = result.err.find("took", place)) != std::string::npos; ++place) {
      ++takes;
    }
  }
  EXPECT_GT(takes, 1U) << "the queue was never taken while entries were appended";
  const std::vector<std::string> entries = velathumb_.Entries();
  EXPECT_EQ(entries.size(), static_cast<size_t>(kAppenders * kEntries));
  EXPECT_EQ(std::set<std::string>(entries.begin(), entries.end()).size(), entries.size());
  ExpectNothingWaits();
}

}  // namespace
}  // namespace vela_test
