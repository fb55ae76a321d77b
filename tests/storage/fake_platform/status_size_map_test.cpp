// Thumbnail status and scans with size maps from a faked index library.
#include "platform/velaindex.h"
#include "storage/velamk_thumb_status.h"
#include "support/files.h"
#include "support/quiet_test.h"

namespace {

/// An answer of the index library.
struct Answer {
  int result = 0;
  int32_t sizeMap = 0;
};

struct FakeSizeMaps {
  Answer ofFiles;
  Answer ofDirectories;
  std::vector<std::string> questions;

  int Give(const Answer& answer, const std::string& about, int kind, int32_t* sizeMap) {
    questions.push_back(about + " as kind " + std::to_string(kind));
    *sizeMap = answer.sizeMap;
    return answer.result;
  }
};

FakeSizeMaps g_sizeMaps;

}  // namespace

int VELAIDX_GetThumbSizeMap(const char* path, int kind, int32_t* sizeMap) {
  return g_sizeMaps.Give(g_sizeMaps.ofFiles, std::string("file ") + path, kind, sizeMap);
}

int VELAIDX_GetDirThumbSizeMap(const char* dir, int kind, int32_t* sizeMap) {
  return g_sizeMaps.Give(g_sizeMaps.ofDirectories, std::string("directory ") + dir, kind, sizeMap);
}

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::UnorderedElementsAre;

class StatusSizeMaps : public QuietTest {
 protected:
  void SetUp() override {
    QuietTest::SetUp();
    g_sizeMaps = FakeSizeMaps();
    for (const char* name : {"a.jpg", "b.jpg", "note.txt", "below/c.jpg"}) {
      WriteFile(std::string("/tmp/dir/") + name, "photo");
    }
  }

  void ExpectWork(int photos, int thumbs) const {
    EXPECT_EQ(photos_, photos);
    EXPECT_EQ(thumbs_, thumbs);
  }

  void CountDirectory() { GetDirThumbStatus("/tmp/dir", &photos_, &thumbs_); }

  int photos_ = -77;
  int thumbs_ = -77;
};

TEST_F(StatusSizeMaps, ADirectoryIsRequestedOnceAndItsPhotosAreNot) {
  g_sizeMaps.ofDirectories.sizeMap = 3;
  g_sizeMaps.ofFiles.sizeMap = 63;
  CountDirectory();
  EXPECT_THAT(g_sizeMaps.questions, ElementsAre("directory /tmp/dir as kind 1"));
  ExpectWork(2, 4);
}

TEST_F(StatusSizeMaps, AnEmptyMapOfADirectoryWantsNoThumbs) {
  g_sizeMaps.ofFiles.sizeMap = 63;
  CountDirectory();
  EXPECT_THAT(g_sizeMaps.questions, ElementsAre("directory /tmp/dir as kind 1"));
  ExpectWork(0, 0);
}

TEST_F(StatusSizeMaps, EachPhotoIsRequestedWhenTheDirectoryHasNone) {
  g_sizeMaps.ofDirectories = {-1, 63};
  g_sizeMaps.ofFiles.sizeMap = 7;
  CountDirectory();
  EXPECT_THAT(g_sizeMaps.questions,
              UnorderedElementsAre("directory /tmp/dir as kind 1", "file /tmp/dir/a.jpg as kind 1",
                                   "file /tmp/dir/b.jpg as kind 1"));
  ExpectWork(2, 6);
}

TEST_F(StatusSizeMaps, APhotoWithoutOneIsLoggedAndNotCounted) {
  g_sizeMaps.ofDirectories.result = -1;
  g_sizeMaps.ofFiles = {-1, 63};
  CountDirectory();
  ExpectWork(0, 0);
  EXPECT_THAT(
      TakeErrorLines(),
      UnorderedElementsAre("velamk_thumb_status:96 [Error] get thumb size map: /tmp/dir/a.jpg",
                           "velamk_thumb_status:96 [Error] get thumb size map: /tmp/dir/b.jpg"));
}

TEST_F(StatusSizeMaps, ATreeRequestsEveryDirectoryOnce) {
  g_sizeMaps.ofDirectories.sizeMap = 1;
  EXPECT_EQ(GetDirThumbStatusRecursive("/tmp/dir", &photos_, &thumbs_), 0);
  EXPECT_THAT(g_sizeMaps.questions,
              ElementsAre("directory /tmp/dir as kind 1", "directory /tmp/dir/below as kind 1"));
  ExpectWork(3, 3);
}

TEST_F(StatusSizeMaps, AQueuedDirectoryIsNotRequested) {
  WriteFile("/var/spool/thumb_create.queue", "/tmp/dir\n");
  EXPECT_EQ(GetDirThumbStatusRecursive("/tmp/dir", &photos_, &thumbs_), 0);
  EXPECT_THAT(g_sizeMaps.questions, ElementsAre("directory /tmp/dir/below as kind 1"));
}

TEST_F(StatusSizeMaps, AnythingButADirectoryIsNotRequested) {
  GetDirThumbStatus("/tmp/nowhere", &photos_, &thumbs_);
  EXPECT_THAT(g_sizeMaps.questions, IsEmpty());
}

class UnknownSizeMap : public QuietTest {
 protected:
  void SetUp() override {
    QuietTest::SetUp();
    g_sizeMaps = FakeSizeMaps();
    WriteFile("/tmp/a.jpg", "photo");
  }

  void Ask(int sizeMap) { GetThumbStatus("/tmp/a.jpg", &missing_, &present_, sizeMap); }

  int missing_ = -77;
  int present_ = -77;
};

TEST_F(UnknownSizeMap, IsRequestedOnceAsThatOfAPhoto) {
  g_sizeMaps.ofFiles.sizeMap = 3;
  Ask(-1);
  EXPECT_THAT(g_sizeMaps.questions, ElementsAre("file /tmp/a.jpg as kind 1"));
  EXPECT_EQ(missing_, 2);
}

TEST_F(UnknownSizeMap, IsNotRequestedWhenTheCallerHasOne) {
  Ask(63);
  EXPECT_THAT(g_sizeMaps.questions, IsEmpty());
  EXPECT_EQ(missing_, 6);
}

TEST_F(UnknownSizeMap, IsLoggedWhenTheIndexHasNoneEither) {
  g_sizeMaps.ofFiles.sizeMap = 63;
  g_sizeMaps.ofFiles.result = -1;
  Ask(-1);
  EXPECT_THAT(TakeErrorLines(),
              ElementsAre("velamk_thumb_status:96 [Error] get thumb size map: /tmp/a.jpg"));
  EXPECT_EQ(missing_, 0);
  EXPECT_EQ(present_, 0);
}

TEST_F(UnknownSizeMap, IsUsedForEveryPositiveResultOfTheIndex) {
  g_sizeMaps.ofFiles.sizeMap = 1;
  g_sizeMaps.ofFiles.result = 5;
  Ask(-1);
  EXPECT_EQ(missing_, 1);
}

class VideoSizeMap : public QuietTest {
 protected:
  void SetUp() override {
    QuietTest::SetUp();
    g_sizeMaps = FakeSizeMaps();
    WriteFile("/tmp/a.mp4", "video");
  }
};

TEST_F(VideoSizeMap, IsRequestedOnceAsThatOfAVideo) {
  g_sizeMaps.ofFiles.sizeMap = 1;
  EXPECT_EQ(IsVideoWorkNeeded("/tmp/a.mp4"), 1);
  EXPECT_THAT(g_sizeMaps.questions, ElementsAre("file /tmp/a.mp4 as kind 2"));
}

TEST_F(VideoSizeMap, IsLoggedWhenThereIsNone) {
  g_sizeMaps.ofFiles = {-1, 63};
  EXPECT_EQ(IsVideoWorkNeeded("/tmp/a.mp4"), 0);
  EXPECT_THAT(TakeErrorLines(),
              ElementsAre("velamk_thumb_status:301 [Error] get thumb size map: /tmp/a.mp4"));
}

TEST_F(VideoSizeMap, IsUsedForEveryPositiveResultOfTheIndex) {
  g_sizeMaps.ofFiles = {5, 1};
  EXPECT_EQ(IsVideoWorkNeeded("/tmp/a.mp4"), 1);
}

TEST_F(VideoSizeMap, WantsNoThumbsUnlessItIsPositive) {
  for (const int32_t sizeMap : {0, -1, -64}) {
    g_sizeMaps.ofFiles.sizeMap = sizeMap;
    EXPECT_EQ(IsVideoWorkNeeded("/tmp/a.mp4"), 0) << sizeMap;
  }
}

TEST_F(VideoSizeMap, IsNotRequestedForOtherFiles) {
  WriteFile("/tmp/a.jpg", "photo");
  EXPECT_EQ(IsVideoWorkNeeded("/tmp/a.jpg"), 0);
  EXPECT_EQ(IsVideoWorkNeeded("/tmp/none.mp4"), 0);
  EXPECT_THAT(g_sizeMaps.questions, IsEmpty());
}

TEST_F(VideoSizeMap, OneVideoWithoutItStopsNoOther) {
  g_sizeMaps.ofFiles = {-1, 63};
  WriteFile("/tmp/films/a.mp4", "video");
  WriteFile("/tmp/films/b.mp4", "video");
  EXPECT_EQ(CountVideoWork("/tmp/films"), 0);
  EXPECT_THAT(
      TakeErrorLines(),
      UnorderedElementsAre("velamk_thumb_status:301 [Error] get thumb size map: /tmp/films/a.mp4",
                           "velamk_thumb_status:301 [Error] get thumb size map: /tmp/films/b.mp4"));
}

}  // namespace
}  // namespace vela_test
