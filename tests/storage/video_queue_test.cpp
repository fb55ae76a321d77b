// The videos of a queue file that need work.
#include <gmock/gmock.h>
#include <sys/stat.h>

#include <string>

#include "storage/media_fixture.h"
#include "storage/velamk_thumb_status.h"
#include "support/files.h"
#include "support/privileges.h"
#include "support/sandbox.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr const char* kQueue = "/var/spool/flv_create.queue";
constexpr const char* kQueueInWork = "/var/spool/flv_create.queue.tmp";
constexpr const char* kOtherQueue = "/var/spool/other.queue";

int Count(const std::string& file = kOtherQueue) {
  return CountVideoQueueWork(file.c_str());
}

/// The work that a queue of this content holds.
int CountIn(const std::string& content) {
  WriteFile(kOtherQueue, content);
  return Count();
}

class VideoQueue : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    for (const char* name : {"a.mp4", "b.mp4", "tree/1.mp4", "tree/below/2.mp4"}) {
      WriteFile(std::string("/tmp/") + name, "video");
    }
  }
};

TEST_F(VideoQueue, HoldsNoWorkWhenThereIsNone) {
  EXPECT_EQ(Count(), 0);
  EXPECT_EQ(Count(kQueue), 0);
  EXPECT_EQ(Count("/tmp/tree"), 0);
  EXPECT_EQ(CountIn(""), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(VideoQueue, ThatCannotBeOpenedIsLogged) {
  WriteFile(kQueue, "/tmp/a.mp4\n");
  ASSERT_EQ(chmod(kQueue, 0), 0);
  const WithoutCapabilities ordinary;
  EXPECT_EQ(Count(kQueue), 0);
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velamk_thumb_status:416 [Error] fopen: /var/spool/flv_create.queue"));
}

TEST_F(VideoQueue, EveryLineIsAVideo) {
  WriteFile("/tmp/a.jpg", "photo");
  EXPECT_EQ(CountIn("/tmp/a.mp4\n"), 1);
  EXPECT_EQ(CountIn("/tmp/a.mp4\n/tmp/b.mp4\n"), 2);
  EXPECT_EQ(CountIn("/tmp/none.mp4\n/tmp/a.jpg\n/tmp\n/tmp/b.mp4\n"), 1);
  EXPECT_EQ(CountIn("/tmp/a.mp4\n/tmp/a.mp4\n"), 2);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(VideoQueue, TheLastLineNeedsNoNewline) {
  EXPECT_EQ(CountIn("/tmp/a.mp4"), 1);
  EXPECT_EQ(CountIn("/tmp/a.mp4\n/tmp/b.mp4"), 2);
  EXPECT_EQ(CountIn("R:/tmp/tree"), 2);
}

TEST_F(VideoQueue, OnlyOneNewlineIsNoPartOfTheLine) {
  EXPECT_EQ(CountIn("\n\n/tmp/a.mp4\n\n"), 1);
  EXPECT_EQ(CountIn("/tmp/a.mp4\r\n/tmp/b.mp4 \n /tmp/b.mp4\n"), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(VideoQueue, ATreeCountsAllItsVideos) {
  EXPECT_EQ(CountIn("R:/tmp/tree\n"), 2);
  EXPECT_EQ(CountIn("/tmp/a.mp4\nR:/tmp/tree\n/tmp/b.mp4\n"), 4);
  EXPECT_EQ(CountIn("R:/tmp/tree\nR:/tmp/tree/below\n"), 3);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(VideoQueue, ATreeEndsAtTheNextColon) {
  WriteFile("/tmp/tree:more/3.mp4", "video");
  EXPECT_EQ(CountIn("R:/tmp/tree:more\n"), 2);
  EXPECT_EQ(CountIn("R:/tmp/tree/below:\n"), 1);
  EXPECT_EQ(CountIn("R:/tmp/tree/below:/tmp/tree:/tmp\n"), 1);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(VideoQueue, OnlyItsTwoLettersMakeATree) {
  WriteFile("/tmp/R:.mp4", "video");
  EXPECT_EQ(CountIn("/tmp/R:.mp4\n"), 1);
  EXPECT_EQ(CountIn("r:/tmp/tree\n R:/tmp/tree\nR/tmp/tree\nRR:/tmp/tree\n:/tmp/tree\nR\n"), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(VideoQueue, ATreeThatIsNotThereIsLoggedAndStopsNothing) {
  EXPECT_EQ(CountIn("R:/tmp/nowhere\nR:\n/tmp/a.mp4\n"), 1);
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velamk_thumb_status:332 [Error] dir doesn't exist: /tmp/nowhere",
                          "velamk_thumb_status:332 [Error] dir doesn't exist: "));
}

/// A line that names a tree and has `length` bytes without its newline.
std::string TreeLine(size_t length) {
  std::string line = "R:/tmp/tree:";
  line.resize(length, 'x');
  return line;
}

TEST_F(VideoQueue, LinesAreTakenUpToALengthThatCountsTheNewline) {
  EXPECT_EQ(CountIn(TreeLine(4094) + "\n"), 2);
  EXPECT_EQ(CountIn(TreeLine(4095) + "\n"), 0);
  EXPECT_EQ(CountIn(TreeLine(4999) + "\n"), 0);
  EXPECT_EQ(CountIn(TreeLine(100000) + "\n"), 0);
  EXPECT_EQ(CountIn(TreeLine(4095)), 2);
  EXPECT_EQ(CountIn(TreeLine(4096)), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(VideoQueue, NoPartOfALongLineIsTakenForALine) {
  EXPECT_EQ(CountIn("/tmp/b.mp4\n" + std::string(4096, 'x') + "/tmp/a.mp4\n/tmp/a.mp4\n"), 2);
  EXPECT_EQ(CountIn(std::string(4095, 'x') + "/tmp/a.mp4"), 0);
}

TEST_F(VideoQueue, AVideoWhosePathIsTooLongIsLogged) {
  const std::string path = PathOfLength(4094, "a.mp4");
  WriteFile(path, "video");
  EXPECT_EQ(CountIn(path + "\n/tmp/a.mp4\n"), 1);
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velamk_thumb_status:295 [Error] path is too long and can't create "
                          "thumbnail: " +
                          path));
}

TEST_F(VideoQueue, WhatIsInWorkIsLeftOutOfTheMainQueue) {
  WriteFile(kQueueInWork, "/tmp/a.mp4\nR:/tmp/tree");
  WriteFile(kQueue, "/tmp/a.mp4\n/tmp/b.mp4\nR:/tmp/tree\nR:/tmp/tree/below\n");
  EXPECT_EQ(Count(kQueue), 2);
}

TEST_F(VideoQueue, OnlyWholeLinesInWorkAreLeftOut) {
  WriteFile(kQueueInWork, "/tmp/a.mp4x\n/tmp/b.mp\nR:/tmp/tree/below\nR:/tmp/b.mp4\n");
  WriteFile(kQueue, "/tmp/a.mp4\n/tmp/b.mp4\nR:/tmp/tree\n");
  EXPECT_EQ(Count(kQueue), 4);
}

TEST_F(VideoQueue, WhatIsInWorkCountsInEveryOtherFile) {
  WriteFile(kQueueInWork, "/tmp/a.mp4\n");
  WriteFile(kQueue, "/tmp/a.mp4\n");
  EXPECT_EQ(Count(kQueue), 0);
  EXPECT_EQ(Count(kQueueInWork), 1);
  EXPECT_EQ(Count("/var/spool//flv_create.queue"), 1);
  EXPECT_EQ(CountIn("/tmp/a.mp4\n"), 1);
}

TEST_F(VideoQueue, AVideoOfATreeThatIsQueuedItselfCountsOnce) {
  WriteFile(kQueue, "/tmp/tree/1.mp4\nR:/tmp/tree\n");
  EXPECT_EQ(Count(kQueue), 2);
}

TEST_F(VideoQueue, StaysAsItIs) {
  const std::string content = "/tmp/a.mp4\nR:/tmp/tree\n/tmp/none.mp4";
  WriteFile(kQueue, content);
  WriteFile(kQueueInWork, content);
  Count(kQueue);
  EXPECT_EQ(ReadFile(kQueue), content);
  EXPECT_EQ(ReadFile(kQueueInWork), content);
}

}  // namespace
}  // namespace vela_test
