// The status scans with size maps of an index library that is played here.
#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "platform/velaindex.h"
#include "storage/velamk_thumb_status.h"
#include "support/files.h"
#include "support/sandbox.h"
#include "support/system_log.h"

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

class StatusSizeMaps : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    g_sizeMaps = FakeSizeMaps();
    for (const char* name : {"a.jpg", "b.jpg", "note.txt", "below/c.jpg"}) {
      WriteFile(std::string("/tmp/dir/") + name, "photo");
    }
  }

  void CountDirectory() { GetDirThumbStatus("/tmp/dir", &photos_, &thumbs_); }

  int photos_ = -77;
  int thumbs_ = -77;
};

TEST_F(StatusSizeMaps, ADirectoryIsAskedForOnceAndItsPhotosNot) {
  g_sizeMaps.ofDirectories.sizeMap = 3;
  g_sizeMaps.ofFiles.sizeMap = 63;
  CountDirectory();
  EXPECT_THAT(g_sizeMaps.questions, ElementsAre("directory /tmp/dir as kind 1"));
  EXPECT_EQ(photos_, 2);
  EXPECT_EQ(thumbs_, 4);
}

TEST_F(StatusSizeMaps, AnEmptyMapOfADirectoryWantsNoThumbs) {
  g_sizeMaps.ofFiles.sizeMap = 63;
  CountDirectory();
  EXPECT_THAT(g_sizeMaps.questions, ElementsAre("directory /tmp/dir as kind 1"));
  EXPECT_EQ(photos_, 0);
  EXPECT_EQ(thumbs_, 0);
}

TEST_F(StatusSizeMaps, EachPhotoIsAskedForWhenTheDirectoryHasNone) {
  g_sizeMaps.ofDirectories = {-1, 63};
  g_sizeMaps.ofFiles.sizeMap = 7;
  CountDirectory();
  EXPECT_THAT(g_sizeMaps.questions,
              UnorderedElementsAre("directory /tmp/dir as kind 1", "file /tmp/dir/a.jpg as kind 1",
                                   "file /tmp/dir/b.jpg as kind 1"));
  EXPECT_EQ(photos_, 2);
  EXPECT_EQ(thumbs_, 6);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(StatusSizeMaps, APhotoWithoutOneIsLoggedAndNotCounted) {
  g_sizeMaps.ofDirectories.result = -1;
  g_sizeMaps.ofFiles = {-1, 63};
  CountDirectory();
  EXPECT_EQ(photos_, 0);
  EXPECT_EQ(thumbs_, 0);
  EXPECT_THAT(
      ErrorLines(),
      UnorderedElementsAre("velamk_thumb_status:96 [Error] get thumb size map: /tmp/dir/a.jpg",
                           "velamk_thumb_status:96 [Error] get thumb size map: /tmp/dir/b.jpg"));
}

TEST_F(StatusSizeMaps, ATreeAsksOnceForEveryDirectory) {
  g_sizeMaps.ofDirectories.sizeMap = 1;
  EXPECT_EQ(GetDirThumbStatusRecursive("/tmp/dir", &photos_, &thumbs_), 0);
  EXPECT_THAT(g_sizeMaps.questions,
              ElementsAre("directory /tmp/dir as kind 1", "directory /tmp/dir/below as kind 1"));
  EXPECT_EQ(photos_, 3);
  EXPECT_EQ(thumbs_, 3);
}

TEST_F(StatusSizeMaps, AQueuedDirectoryIsNotAskedFor) {
  WriteFile("/var/spool/thumb_create.queue", "/tmp/dir\n");
  EXPECT_EQ(GetDirThumbStatusRecursive("/tmp/dir", &photos_, &thumbs_), 0);
  EXPECT_THAT(g_sizeMaps.questions, ElementsAre("directory /tmp/dir/below as kind 1"));
}

TEST_F(StatusSizeMaps, WhatIsNoDirectoryIsNotAskedFor) {
  GetDirThumbStatus("/tmp/nowhere", &photos_, &thumbs_);
  EXPECT_THAT(g_sizeMaps.questions, IsEmpty());
}

class VideoSizeMap : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    g_sizeMaps = FakeSizeMaps();
    WriteFile("/tmp/a.mp4", "video");
  }
};

TEST_F(VideoSizeMap, IsAskedForOnceAsAVideos) {
  g_sizeMaps.ofFiles.sizeMap = 1;
  EXPECT_EQ(IsVideoWorkNeeded("/tmp/a.mp4"), 1);
  EXPECT_THAT(g_sizeMaps.questions, ElementsAre("file /tmp/a.mp4 as kind 2"));
}

TEST_F(VideoSizeMap, EndsInALineWhenThereIsNone) {
  g_sizeMaps.ofFiles = {-1, 63};
  EXPECT_EQ(IsVideoWorkNeeded("/tmp/a.mp4"), 0);
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velamk_thumb_status:301 [Error] get thumb size map: /tmp/a.mp4"));
}

TEST_F(VideoSizeMap, IsKnownWhateverPositiveResultTheIndexGives) {
  g_sizeMaps.ofFiles = {5, 1};
  EXPECT_EQ(IsVideoWorkNeeded("/tmp/a.mp4"), 1);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(VideoSizeMap, WantsNoThumbsUnlessItIsPositive) {
  for (const int32_t sizeMap : {0, -1, -64}) {
    g_sizeMaps.ofFiles.sizeMap = sizeMap;
    EXPECT_EQ(IsVideoWorkNeeded("/tmp/a.mp4"), 0) << sizeMap;
  }
}

TEST_F(VideoSizeMap, IsNotAskedForWhenTheFileIsNoVideo) {
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
      ErrorLines(),
      UnorderedElementsAre("velamk_thumb_status:301 [Error] get thumb size map: /tmp/films/a.mp4",
                           "velamk_thumb_status:301 [Error] get thumb size map: /tmp/films/b.mp4"));
}

}  // namespace
}  // namespace vela_test
