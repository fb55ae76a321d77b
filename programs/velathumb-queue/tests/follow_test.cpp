// A runner with --follow, and appends that race with it.
#include <sys/wait.h>

#include <set>
#include <thread>

#include "queue_fixture.h"

namespace vela_test {
namespace {

using namespace ::testing;
using std::chrono::milliseconds;
using std::chrono::seconds;

using FollowTest = QueueTest;

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
  ExpectQueueDone();
}

TEST_F(FollowTest, DoesNotTakeAQueueBeforeItsFirstEntryIsWritten) {
  Program runner = velathumb_.Start({"--follow"});
  for (int i = 0; i < 100; ++i) {
    Enqueue({"/tmp/" + std::to_string(i)});
  }
  ASSERT_TRUE(velathumb_.WaitForStarts(100));
  EXPECT_THAT(runner.Error(), Not(HasSubstr("took 0 entries")));
  Stop(runner);
}

TEST_F(FollowTest, ReactsToARenamedQueue) {
  Program runner = velathumb_.Start({"-f"});
  EXPECT_FALSE(runner.Wait(milliseconds(200)));
  MakeEntryDirectories({"/tmp/a"});
  WriteFile("/var/spool/prepared", "/tmp/a\n");
  ASSERT_EQ(rename("/var/spool/prepared", kQueueFile), 0);
  EXPECT_TRUE(velathumb_.WaitForStarts(1));
  Stop(runner);
}

TEST_F(FollowTest, BeginsWithPendingEntries) {
  MakeEntryDirectories({"/tmp/old"});
  WriteFile(kTakenFile, "/tmp/old\n");
  Enqueue({"/tmp/new"});
  Program runner = velathumb_.Start({"--follow"});
  ASSERT_TRUE(velathumb_.WaitForStarts(2));
  EXPECT_THAT(velathumb_.Entries(), ElementsAre("/tmp/old", "/tmp/new"));
  EXPECT_TRUE(WaitUntilGone(kTakenFile));
  Stop(runner);
}

TEST_F(FollowTest, EveryEntryOfManyAppendersReachesVelathumb) {
  constexpr int kAppenders = 4;
  constexpr int kEntries = 60;
  for (int i = 0; i < kAppenders * kEntries; ++i) {
    MakeDirectories("/tmp/" + std::to_string(i % kAppenders) + '/' +
                    std::to_string(i / kAppenders));
  }
  std::vector<pid_t> appenders;
  for (int i = 0; i < kAppenders; ++i) {
    // The pauses give the runner time to take the queue.
    appenders.push_back(StartAppender("/tmp/" + std::to_string(i), kEntries,
                                      [i](int j) { return (i * 7 + j * 13) % 10 * 1000; }));
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
  ExpectQueueDone();
}

}  // namespace
}  // namespace vela_test
