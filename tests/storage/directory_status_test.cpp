// The thumbnail status of the photos of one directory.
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <string>
#include <vector>

#include "storage/deep_files.h"
#include "storage/photo_tree.h"
#include "support/files.h"
#include "support/privileges.h"
#include "support/sandbox.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr const char* kDir = "/tmp/photos";
constexpr PhotoWork kNothing = {0, 0};

std::string In(const std::string& name) {
  return std::string(kDir) + "/" + name;
}

class DirectoryStatus : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    MakeDirectories(kDir);
  }
};

TEST_F(DirectoryStatus, CountsPhotosThatLackThumbsAndTheThumbsTheyLack) {
  for (const char* name : {"complete.jpg", "bare.jpg", "half.jpg"}) {
    MakePhoto(In(name));
  }
  MakeThumbs(kDir, "complete.jpg", 63);
  MakeThumbs(kDir, "half.jpg", kBitS | kBitM | kBitB);
  EXPECT_EQ(WorkInDirectory(kDir), (PhotoWork{2, 9}));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(DirectoryStatus, OutdatedThumbsAreLacking) {
  MakePhoto(In("a.jpg"));
  MakeThumbs(kDir, "a.jpg", 63 & ~kBitL);
  MakeThumbs(kDir, "a.jpg", kBitL, -1);
  EXPECT_EQ(WorkInDirectory(kDir), (PhotoWork{1, 1}));
}

TEST_F(DirectoryStatus, AnEmptyDirectoryLacksNothing) {
  EXPECT_EQ(WorkInDirectory(kDir), kNothing);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(DirectoryStatus, OnlyTheSizesThatTheSettingsAskForCount) {
  MakePhoto(In("a.jpg"));
  MakePhoto(In("b.jpg"));
  MakeThumbs(kDir, "a.jpg", kBitM);
  WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"3\"\nvideo_thumb_size_map=\"60\"\n");
  EXPECT_EQ(WorkInDirectory(kDir), (PhotoWork{2, 3}));
  WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"2\"\n");
  EXPECT_EQ(WorkInDirectory(kDir), (PhotoWork{1, 1}));
  WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"0\"\n");
  EXPECT_EQ(WorkInDirectory(kDir), kNothing);
}

TEST_F(DirectoryStatus, OnlyPhotosCount) {
  for (const char* name : {"film.mp4", "note.txt", "jpg", "a.jpg.part", "a"}) {
    WriteFile(In(name), "no photo");
  }
  EXPECT_EQ(WorkInDirectory(kDir), kNothing);
  for (const char* name : {"a.jpg", "B.NEF", "c.heic"}) {
    MakePhoto(In(name));
  }
  EXPECT_EQ(WorkInDirectory(kDir), (PhotoWork{3, 18}));
}

TEST_F(DirectoryStatus, NamesThatAreNotIndexedDoNotCount) {
  for (const char* name : {".a.jpg", "@a.jpg", "#a.jpg", "..jpg"}) {
    MakePhoto(In(name));
  }
  EXPECT_EQ(WorkInDirectory(kDir), kNothing);
  for (const char* name : {"a.b.jpg", "a@.jpg", "a#.jpg"}) {
    MakePhoto(In(name));
  }
  EXPECT_EQ(WorkInDirectory(kDir), (PhotoWork{3, 18}));
}

TEST_F(DirectoryStatus, SubdirectoriesAreNotEntered) {
  MakePhoto(In("below/a.jpg"));
  MakePhoto(In("called.jpg/a.jpg"));
  EXPECT_EQ(WorkInDirectory(kDir), kNothing);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(DirectoryStatus, LinksToPhotosCountAsPhotos) {
  MakePhoto("/tmp/elsewhere/a.jpg");
  ASSERT_EQ(symlink("/tmp/elsewhere/a.jpg", In("link.jpg").c_str()), 0);
  ASSERT_EQ(symlink("/tmp/nowhere.jpg", In("dangling.jpg").c_str()), 0);
  EXPECT_EQ(WorkInDirectory(kDir), (PhotoWork{1, 6}));
}

TEST_F(DirectoryStatus, ADirectoryBehindALinkIsRead) {
  MakePhoto(In("a.jpg"));
  ASSERT_EQ(symlink(kDir, "/tmp/link"), 0);
  EXPECT_EQ(WorkInDirectory("/tmp/link"), (PhotoWork{1, 6}));
}

TEST_F(DirectoryStatus, WhatIsNoDirectoryLacksNothingSilently) {
  MakePhoto("/tmp/a.jpg");
  EXPECT_EQ(WorkInDirectory("/tmp/nowhere"), kNothing);
  EXPECT_EQ(WorkInDirectory("/tmp/a.jpg"), kNothing);
  EXPECT_EQ(WorkInDirectory(""), kNothing);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(DirectoryStatus, ADirectoryThatCannotBeOpenedIsLogged) {
  MakePhoto(In("a.jpg"));
  ASSERT_EQ(chmod(kDir, 0333), 0);
  const WithoutCapabilities ordinary;
  EXPECT_EQ(WorkInDirectory(kDir), kNothing);
  EXPECT_THAT(ErrorLines(), ElementsAre("velamk_thumb_status:153 [Error] opendir: /tmp/photos"));
}

TEST_F(DirectoryStatus, PhotosThatCannotBeReachedDoNotCount) {
  MakePhoto(In("a.jpg"));
  ASSERT_EQ(chmod(kDir, 0444), 0);
  const WithoutCapabilities ordinary;
  EXPECT_EQ(WorkInDirectory(kDir), kNothing);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(DirectoryStatus, OnePhotoWithoutMetadataDirectoryDoesNotStopTheOthers) {
  // Below a metadata directory no photo has one of its own.
  const std::string inside = std::string(kDir) + "/@eaDir/sub";
  MakePhoto(inside + "/a.jpg");
  EXPECT_EQ(WorkInDirectory(inside), kNothing);
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velamk_thumb_status:89 [Error] get eadir: " + inside + "/a.jpg"));
}

TEST_F(DirectoryStatus, ChangesNothing) {
  for (const char* name : {"bare.jpg", "outdated.jpg", "empty.jpg"}) {
    MakePhoto(In(name));
  }
  MakeThumbs(kDir, "outdated.jpg", 63, -1);
  WriteFile(In("@eaDir/empty.jpg/VELAPHOTO_THUMB_M.jpg"), "");
  WriteFile(In("@eaDir/empty.jpg/VELAPHOTO_THUMB_S.fail"), "");
  WriteFile(In("@eaDir/gone.jpg/VELAPHOTO_THUMB_S.jpg"), "thumb");
  const std::vector<std::string> before = ListTree("/tmp");
  EXPECT_EQ(WorkInDirectory(kDir), (PhotoWork{3, 18}));
  EXPECT_EQ(ListTree("/tmp"), before);
}

TEST_F(DirectoryStatus, NamesOfTheLongestKindAndOfAnyBytesCount) {
  const std::string longest = std::string(251, 'n') + ".jpg";
  const std::string bytes = "\xff\xfe %s\n:\\\"\x01.jpg";
  for (const std::string& name : {longest, bytes}) {
    MakePhoto(In(name));
    MakeThumbs(kDir, name, kBitS | kBitXL);
  }
  EXPECT_EQ(WorkInDirectory(kDir), (PhotoWork{2, 8}));
}

TEST_F(DirectoryStatus, APhotoWhoseMetadataDirectoryJustFitsLacksAllThumbs) {
  constexpr size_t kLongestWithMetadata = 4095 - 7;  // "@eaDir/" goes between
  const std::string fits = PathOfLength(kLongestWithMetadata, "a.jpg");
  MakePhoto(fits);
  EXPECT_EQ(WorkInDirectory(fits.substr(0, fits.rfind('/'))), (PhotoWork{1, 6}));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(DirectoryStatus, AThumbWithoutRoomForItsNameIsMissing) {
  // The thumbnails' names of 21 bytes would be cut by one.
  const std::string photo = PathOfLength(4095 - 7 - 21, "a.jpg");
  const std::string dir = photo.substr(0, photo.rfind('/'));
  MakePhoto(photo);
  WriteFile(dir + "/@eaDir/a.jpg/VELAPHOTO_THUMB_S.jp", "no thumb");
  EXPECT_EQ(WorkInDirectory(dir), (PhotoWork{1, 6}));
}

TEST_F(DirectoryStatus, AThumbThatJustFitsIsPresent) {
  const std::string photo = PathOfLength(4095 - 7 - 22, "a.jpg");
  const std::string dir = photo.substr(0, photo.rfind('/'));
  MakePhoto(photo);
  MakeThumbs(dir, "a.jpg", kBitS);
  EXPECT_EQ(WorkInDirectory(dir), (PhotoWork{1, 5}));
}

TEST_F(DirectoryStatus, APhotoWithoutRoomForItsMetadataDirectoryIsLogged) {
  for (const size_t length : {size_t{4089}, size_t{4095}}) {
    ClearLog();
    const std::string path = PathOfLength(length, "a.jpg");
    MakePhoto(path);
    EXPECT_EQ(WorkInDirectory(path.substr(0, path.rfind('/'))), kNothing);
    EXPECT_THAT(ErrorLines(), ElementsAre("velamk_thumb_status:89 [Error] get eadir: " + path));
  }
}

TEST_F(DirectoryStatus, APathThatIsTooLongIsCut) {
  // Only "/a.jpg" of the name fits behind the directory.
  const std::string dir = DirectoryOfLength(4089);
  const FileInDirectory tooLong(dir, "a.jpg.copy.jpg");
  EXPECT_EQ(WorkInDirectory(dir), kNothing);
  EXPECT_THAT(ErrorLines(), IsEmpty());
  const FileInDirectory cut(dir, "a.jpg");
  EXPECT_EQ(WorkInDirectory(dir), kNothing);
  const std::string line = "velamk_thumb_status:89 [Error] get eadir: " + dir + "/a.jpg";
  EXPECT_THAT(ErrorLines(), ElementsAre(line, line));
}

}  // namespace
}  // namespace vela_test
