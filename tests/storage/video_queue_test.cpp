// The videos of a queue file that need work.
#include <sys/stat.h>

#include "storage/media_fixture.h"
#include "storage/velamk_thumb_status.h"
#include "support/files.h"
#include "support/named_case.h"
#include "support/privileges.h"
#include "support/quiet_test.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;

constexpr const char* kQueue = "/var/spool/flv_create.queue";
constexpr const char* kQueueInProgress = "/var/spool/flv_create.queue.tmp";
constexpr const char* kOtherQueue = "/var/spool/other.queue";

int Count(const std::string& file = kOtherQueue) {
  return CountVideoQueueWork(file.c_str());
}

/// The number of videos that need work in a queue of this content.
int CountIn(const std::string& content) {
  WriteFile(kOtherQueue, content);
  return Count();
}

class VideoQueue : public QuietTest {
 protected:
  void SetUp() override {
    QuietTest::SetUp();
    for (const char* name : {"a.mp4", "b.mp4", "tree/1.mp4", "tree/below/2.mp4"}) {
      WriteFile(std::string("/tmp/") + name, "video");
    }
  }
};

TEST_F(VideoQueue, HoldsNoWorkWhenItIsMissing) {
  EXPECT_EQ(Count(), 0);
  EXPECT_EQ(Count(kQueue), 0);
  EXPECT_EQ(Count("/tmp/tree"), 0);
}

TEST_F(VideoQueue, ThatCannotBeOpenedIsLogged) {
  WriteFile(kQueue, "/tmp/a.mp4\n");
  ASSERT_EQ(chmod(kQueue, 0), 0);
  const WithoutCapabilities ordinary;
  EXPECT_EQ(Count(kQueue), 0);
  EXPECT_THAT(TakeErrorLines(),
              ElementsAre("velamk_thumb_status:416 [Error] fopen: /var/spool/flv_create.queue"));
}

/// A line for a tree that has `length` bytes without its newline.
std::string TreeLine(size_t length) {
  std::string line = "R:/tmp/tree:";
  line.resize(length, 'x');
  return line;
}

struct QueueCase : NamedCase {
  std::string content;
  int work;
};

class VideoQueueLines : public VideoQueue, public ::testing::WithParamInterface<QueueCase> {};

TEST_P(VideoQueueLines, AreCounted) {
  for (const char* name : {"a.jpg", "tree:more/3.mp4", "R:.mp4"}) {
    WriteFile(std::string("/tmp/") + name, "media");
  }
  EXPECT_EQ(CountIn(GetParam().content), GetParam().work);
}

const QueueCase kCases[] = {
    {"Empty", "", 0},
    {"OneVideo", "/tmp/a.mp4\n", 1},
    {"TwoVideos", "/tmp/a.mp4\n/tmp/b.mp4\n", 2},
    {"OneVideoTwice", "/tmp/a.mp4\n/tmp/a.mp4\n", 2},
    {"OtherFiles", "/tmp/none.mp4\n/tmp/a.jpg\n/tmp\n/tmp/b.mp4\n", 1},
    {"VideoWithoutNewline", "/tmp/a.mp4", 1},
    {"SecondVideoWithoutNewline", "/tmp/a.mp4\n/tmp/b.mp4", 2},
    {"TreeWithoutNewline", "R:/tmp/tree", 2},
    {"EmptyLines", "\n\n/tmp/a.mp4\n\n", 1},
    {"OtherWhiteSpaceIsKept", "/tmp/a.mp4\r\n/tmp/b.mp4 \n /tmp/b.mp4\n", 0},
    {"Tree", "R:/tmp/tree\n", 2},
    {"TreeBetweenVideos", "/tmp/a.mp4\nR:/tmp/tree\n/tmp/b.mp4\n", 4},
    {"TreeInTree", "R:/tmp/tree\nR:/tmp/tree/below\n", 3},
    {"TreeUpToTheNextColon", "R:/tmp/tree:more\n", 2},
    {"TreeBeforeAColon", "R:/tmp/tree/below:\n", 1},
    {"TreeBeforeSeveralColons", "R:/tmp/tree/below:/tmp/tree:/tmp\n", 1},
    {"PrefixInAName", "/tmp/R:.mp4\n", 1},
    {"OtherPrefixes", "r:/tmp/tree\n R:/tmp/tree\nR/tmp/tree\nRR:/tmp/tree\n:/tmp/tree\nR\n", 0},
    {"LongestLine", TreeLine(4094) + "\n", 2},
    {"LineOfOneByteMore", TreeLine(4095) + "\n", 0},
    {"LongLine", TreeLine(4999) + "\n", 0},
    {"VeryLongLine", TreeLine(100000) + "\n", 0},
    {"LongestLineWithoutNewline", TreeLine(4095), 2},
    {"LongLineWithoutNewline", TreeLine(4096), 0},
    {"PathInALongLine", "/tmp/b.mp4\n" + std::string(4096, 'x') + "/tmp/a.mp4\n/tmp/a.mp4\n", 2},
    {"PathInALongLineWithoutNewline", std::string(4095, 'x') + "/tmp/a.mp4", 0},
};
INSTANTIATE_TEST_SUITE_P(Queue, VideoQueueLines, ::testing::ValuesIn(kCases), CaseName());

TEST_F(VideoQueue, AMissingTreeIsLoggedAndStopsNothing) {
  EXPECT_EQ(CountIn("R:/tmp/nowhere\nR:\n/tmp/a.mp4\n"), 1);
  EXPECT_THAT(TakeErrorLines(),
              ElementsAre("velamk_thumb_status:332 [Error] dir doesn't exist: /tmp/nowhere",
                          "velamk_thumb_status:332 [Error] dir doesn't exist: "));
}

TEST_F(VideoQueue, AVideoWhosePathIsTooLongIsLogged) {
  const std::string path = PathOfLength(4094, "a.mp4");
  WriteFile(path, "video");
  EXPECT_EQ(CountIn(path + "\n/tmp/a.mp4\n"), 1);
  EXPECT_THAT(TakeErrorLines(),
              ElementsAre("velamk_thumb_status:295 [Error] path is too long and can't create "
                          "thumbnail: " +
                          path));
}

TEST_F(VideoQueue, EntriesInProgressAreLeftOutOfTheMainQueue) {
  WriteFile(kQueueInProgress, "/tmp/a.mp4\nR:/tmp/tree");
  WriteFile(kQueue, "/tmp/a.mp4\n/tmp/b.mp4\nR:/tmp/tree\nR:/tmp/tree/below\n");
  EXPECT_EQ(Count(kQueue), 2);
}

TEST_F(VideoQueue, OnlyWholeLinesInProgressAreLeftOut) {
  WriteFile(kQueueInProgress, "/tmp/a.mp4x\n/tmp/b.mp\nR:/tmp/tree/below\nR:/tmp/b.mp4\n");
  WriteFile(kQueue, "/tmp/a.mp4\n/tmp/b.mp4\nR:/tmp/tree\n");
  EXPECT_EQ(Count(kQueue), 4);
}

TEST_F(VideoQueue, EntriesInProgressCountInEveryOtherFile) {
  WriteFile(kQueueInProgress, "/tmp/a.mp4\n");
  WriteFile(kQueue, "/tmp/a.mp4\n");
  EXPECT_EQ(Count(kQueue), 0);
  EXPECT_EQ(Count(kQueueInProgress), 1);
  EXPECT_EQ(Count("/var/spool//flv_create.queue"), 1);
  EXPECT_EQ(CountIn("/tmp/a.mp4\n"), 1);
}

TEST_F(VideoQueue, AVideoOfATreeThatIsQueuedItselfCountsOnce) {
  WriteFile(kQueue, "/tmp/tree/1.mp4\nR:/tmp/tree\n");
  EXPECT_EQ(Count(kQueue), 2);
}

TEST_F(VideoQueue, IsNotChanged) {
  const std::string content = "/tmp/a.mp4\nR:/tmp/tree\n/tmp/none.mp4";
  WriteFile(kQueue, content);
  WriteFile(kQueueInProgress, content);
  Count(kQueue);
  EXPECT_EQ(ReadFile(kQueue), content);
  EXPECT_EQ(ReadFile(kQueueInProgress), content);
}

}  // namespace
}  // namespace vela_test
