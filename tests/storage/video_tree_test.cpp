// The videos of a tree that need work and are not in the video queue.
#include <dirent.h>
#include <sys/stat.h>
#include <unistd.h>

#include "storage/deep_files.h"
#include "storage/photo_tree.h"
#include "support/descriptor.h"
#include "support/mounts.h"
#include "support/privileges.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;

constexpr const char* kQueue = "/var/spool/flv_create.queue";
constexpr const char* kQueueInProgress = "/var/spool/flv_create.queue.tmp";

/// The names in a directory in the order in which the system lists them.
std::vector<std::string> Listing(const std::string& dir) {
  std::vector<std::string> names;
  const DirectoryStream stream(opendir(dir.c_str()));
  while (const dirent* entry = readdir(stream.get())) {
    if (entry->d_name[0] != '.') {
      names.emplace_back(entry->d_name);
    }
  }
  return names;
}

/// The path of the regular file that the system lists first in a directory.
std::string FirstVideoIn(const std::string& dir) {
  for (const std::string& name : Listing(dir)) {
    if (IsRegularFile(dir + "/" + name)) {
      return dir + "/" + name;
    }
  }
  ADD_FAILURE() << "no file in " << dir;
  return "";
}

class VideoTree : public TreeTest {
 protected:
  /// Makes a video that needs work: it has no thumbnails.
  static void MakeVideo(const std::string& path) { WriteFile(path, "video"); }

  static void MakeVideos(const std::vector<std::string>& names) {
    for (const std::string& name : names) {
      MakeVideo(In(name));
    }
  }

  static int Count(const std::string& dir = kTop) { return CountVideoWork(dir.c_str()); }

  /// Checks the log of a daemon that is asked for the orientation of these videos and is not
  /// running.
  static void ExpectUnknown(const std::vector<std::string>& paths) {
    std::vector<std::string> lines;
    for (const std::string& path : paths) {
      lines.emplace_back("velamk_ipc:30 fail");
      lines.push_back("velamk_util:128 fail to get media from plugin db: " + path);
    }
    EXPECT_EQ(TakeErrorLines(), lines);
  }
};

TEST_F(VideoTree, CountsAllDirectories) {
  MakeVideos({"a.mp4", "B.AVI", "x/a.mp4", "x/y/a.mkv", "z/a.mp4"});
  EXPECT_EQ(Count(), 5);
}

TEST_F(VideoTree, OnlyVideosThatNeedWorkCount) {
  WriteFile(kSettings, "video_thumb_size_map=\"1\"\n");
  MakeVideos({"ready.mp4", "bare.mp4", "a.jpg", "a.txt", "mp4"});
  // A text file needs no conversion. Without a daemon every video counts as landscape, and so does
  // a thumbnail that cannot be read.
  SetFileTime(In("ready.mp4"), kMediaTime);
  MakeThumbs(kTop, "ready.mp4", kBitS);
  EXPECT_EQ(Count(), 1);
  RemoveTree(In("bare.mp4"));
  EXPECT_EQ(Count(), 0);
  ExpectUnknown({In("ready.mp4"), In("ready.mp4")});
}

TEST_F(VideoTree, NamesThatAreNotIndexedDoNotCount) {
  MakeVideos({".a.mp4", "@a.mp4", "#a.mp4", ".x/a.mp4", "@eaDir/a.mp4", "#recycle/a.mp4",
              "lost+found/a.mp4"});
  EXPECT_EQ(Count(), 0);
  MakeVideo(In("lost/a#.mp4"));
  EXPECT_EQ(Count(), 1);
}

TEST_F(VideoTree, TheTopIsReadRegardlessOfItsName) {
  MakeVideo("/tmp/@tree/a.mp4");
  EXPECT_EQ(Count("/tmp/@tree"), 1);
}

TEST_F(VideoTree, ADirectoryNamedLikeAVideoIsEntered) {
  MakeVideo(In("film.mp4/a.mp4"));
  EXPECT_EQ(Count(), 1);
}

TEST_F(VideoTree, AnythingButADirectoryIsLogged) {
  MakeVideo("/tmp/a.mp4");
  EXPECT_EQ(Count("/tmp/nowhere"), 0);
  EXPECT_EQ(Count("/tmp/a.mp4"), 0);
  EXPECT_THAT(TakeErrorLines(),
              ElementsAre("velamk_thumb_status:332 [Error] dir doesn't exist: /tmp/nowhere",
                          "velamk_thumb_status:332 [Error] dir doesn't exist: /tmp/a.mp4"));
}

TEST_F(VideoTree, ADirectoryThatCannotBeOpenedIsLoggedAndStopsNoOther) {
  MakeVideos({"a/1.mp4", "closed/1.mp4", "z/1.mp4"});
  ASSERT_EQ(chmod(In("closed").c_str(), 0), 0);
  const WithoutCapabilities ordinary;
  EXPECT_EQ(Count(), 2);
  EXPECT_EQ(Count(In("closed")), 0);
  const std::string line = "velamk_thumb_status:338 [Error] opendir: /tmp/tree/closed";
  EXPECT_THAT(TakeErrorLines(), ElementsAre(line, line));
}

TEST_F(VideoTree, RemovesOutdatedThumbs) {
  MakeVideo(In("a.mp4"));
  SetFileTime(In("a.mp4"), kMediaTime);
  MakeThumbs(kTop, "a.mp4", 63, -1);
  EXPECT_EQ(Count(), 1);
  EXPECT_THAT(ListDirectory(In("@eaDir/a.mp4")), IsEmpty());
}

TEST_F(VideoTree, LinksAreFollowed) {
  MakeVideo("/tmp/elsewhere/a.mp4");
  ASSERT_EQ(symlink("/tmp/elsewhere", In("link").c_str()), 0);
  ASSERT_EQ(symlink("/tmp/elsewhere/a.mp4", In("link.mp4").c_str()), 0);
  ASSERT_EQ(symlink("/tmp/nowhere", In("dangling.mp4").c_str()), 0);
  EXPECT_EQ(Count(), 2);
}

TEST_F(VideoTree, ADirectoryBesideALinkToItCountsUnderBothNames) {
  MakeVideo(In("a/1.mp4"));
  ASSERT_EQ(symlink("a", In("b").c_str()), 0);
  EXPECT_EQ(Count(), 2);
}

TEST_F(VideoTree, OtherFileSystemsAreEntered) {
  const SmallVolume volume(In("volume"), 1 << 20);
  MakeVideo(In("volume/a.mp4"));
  EXPECT_EQ(Count(), 1);
}

TEST_F(VideoTree, ALoopOfLinksEnds) {
  MakeVideos({"a/1.mp4", "a/b/1.mp4"});
  ASSERT_EQ(symlink("/tmp/tree", In("a/b/top").c_str()), 0);
  ASSERT_EQ(symlink(".", In("a/here").c_str()), 0);
  ASSERT_EQ(symlink("itself", In("a/itself").c_str()), 0);
  EXPECT_EQ(Count(), 2);
}

TEST_F(VideoTree, ADeepTreeIsCountedToItsEnd) {
  const DeepTree tree(kTop, "d", 500, "a.mp4");
  EXPECT_EQ(Count(), 500);
}

TEST_F(VideoTree, NamesOfTheLongestKindAndOfAnyBytesCount) {
  const std::string longest(255, 'n');
  MakeVideo(In(longest) + "/" + std::string(251, 'n') + ".mp4");
  MakeVideo(In("\xff\xfe %s\n:\"/\x01.mp4"));
  EXPECT_EQ(Count(), 2);
}

TEST_F(VideoTree, AVideoWhosePathIsTooLongIsLoggedAndStopsNoOther) {
  const std::string dir = DirectoryOfLength(4060);
  MakeVideo(dir + "/b.mp4");   // 4066 bytes
  MakeVideo(dir + "/ab.mp4");  // one more
  EXPECT_EQ(Count(dir), 1);
  EXPECT_THAT(TakeErrorLines(),
              ElementsAre("velamk_thumb_status:295 [Error] path is too long and can't create "
                          "thumbnail: " +
                          dir + "/ab.mp4"));
}

TEST_F(VideoTree, ADirectoryWithoutRoomForNamesIsNotWalked) {
  // 4094 bytes long, so that every name after it is truncated and the path is that of the directory
  // again.
  const std::string dir = DirectoryOfLength(4094);
  const FileInDirectory a(dir, "a.mp4");
  const FileInDirectory b(dir, "b.mp4");
  EXPECT_EQ(Count(dir), 0);
}

class QueuedVideo : public VideoTree, public ::testing::WithParamInterface<const char*> {
 protected:
  void SetUp() override {
    VideoTree::SetUp();
    MakeVideos({"a.mp4", "b.mp4", "c.mp4"});
  }

  static void Queue(const std::string& content) { WriteFile(GetParam(), content); }
};

TEST_P(QueuedVideo, VideosListedAfterAQueuedOneDoNotCount) {
  const std::vector<std::string> names = Listing(kTop);
  ASSERT_THAT(names, SizeIs(3));
  for (int place = 0; place < 3; ++place) {
    Queue("/other\n" + In(names[place]) + "\n/more\n");
    EXPECT_EQ(Count(), place) << names[place];
  }
}

TEST_P(QueuedVideo, AQueuedVideoDoesNotHideThoseOfOtherDirectories) {
  MakeVideos({"x/1.mp4", "x/2.mp4", "x/y/1.mp4", "z/1.mp4"});
  Queue(FirstVideoIn(kTop) + "\n");
  EXPECT_EQ(Count(), 4) << "those below";
  Queue(FirstVideoIn(In("x")) + "\n");
  EXPECT_EQ(Count(), 5) << "three at the top, one each in x/y and z";
}

TEST_P(QueuedVideo, OnlyTheWholePathCounts) {
  Queue(
      "/tmp/tree/a.mp4x\n/tmp/tree/b.mp\n /tmp/tree/c.mp4\n/tmp/tree/c.mp4 \nR:/tmp/tree\n"
      "R:/tmp/tree/a.mp4\n/tmp/tree\na.mp4\n");
  EXPECT_EQ(Count(), 3);
}

TEST_P(QueuedVideo, TheLastLineNeedsNoNewline) {
  Queue("/other\n" + FirstVideoIn(kTop));
  EXPECT_EQ(Count(), 0);
}

TEST_P(QueuedVideo, AQueuedVideoThatNeedsNoWorkChangesNothing) {
  WriteFile(kSettings, "video_thumb_size_map=\"1\"\n");
  const std::string first = FirstVideoIn(kTop);
  SetFileTime(first, kMediaTime);
  MakeThumbs(kTop, first.substr(first.rfind('/') + 1), kBitS);
  Queue(first + "\n");
  EXPECT_EQ(Count(), 2);
  ExpectUnknown({first});
}

TEST_P(QueuedVideo, AnUnreadableQueueCountsAsEmpty) {
  Queue(FirstVideoIn(kTop) + "\n");
  ASSERT_EQ(chmod(GetParam(), 0), 0);
  EXPECT_EQ(Count(), 0) << "user 0 ignores permission bits";
  const WithoutCapabilities ordinary;
  EXPECT_EQ(Count(), 3);
}

TEST_P(QueuedVideo, ThePhotoQueueDoesNotMatter) {
  WriteFile("/var/spool/thumb_create.queue", FirstVideoIn(kTop) + "\n/tmp/tree\n");
  WriteFile("/var/spool/thumb_create.queue.tmp", FirstVideoIn(kTop) + "\n");
  EXPECT_EQ(Count(), 3);
}

INSTANTIATE_TEST_SUITE_P(Files, QueuedVideo, ::testing::Values(kQueue, kQueueInProgress),
                         [](const ::testing::TestParamInfo<const char*>& file) {
                           return file.param == std::string(kQueue) ? "Main" : "InProgress";
                         });

}  // namespace
}  // namespace vela_test
