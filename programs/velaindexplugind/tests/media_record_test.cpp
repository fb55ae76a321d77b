// The media records that clients get.
#include <sys/stat.h>

#include "index_daemon.h"
#include "support/films.h"
#include "support/images.h"

namespace vela_test {
namespace {

using namespace ::testing;

class MediaRecordTest : public IndexDaemonTest {
 protected:
  /// A photo of a fixed size in bytes, whatever its pixels, changed long ago.
  static void MakePaddedPhoto(const std::string& path, int width, int height) {
    JpegRecipe recipe;
    recipe.width = width;
    recipe.height = height;
    MakeJpeg(path, recipe);
    std::string bytes = ReadFile(path);
    ASSERT_LT(bytes.size(), kPhotoBytes);
    bytes.resize(kPhotoBytes);
    WriteFile(path, bytes);
    SetFileTime(path, kLongAgo, 5);
  }

  /// Has a photo 80 pixels wide indexed, then replaces it by one 30 wide of the same size in bytes
  /// and time.
  static void ReplaceIndexedPhoto() {
    MakePaddedPhoto(kPhoto, 80, 20);
    ASSERT_EQ(AskForMedia(kPhoto)["width"], 80);
    MakePaddedPhoto(kPhoto, 30, 60);
  }

  static constexpr const char* kPhoto = "/tmp/a.jpg";
  static constexpr size_t kPhotoBytes = 20000;
  static constexpr int64_t kLongAgo = 1500000000;
};

TEST_F(MediaRecordTest, PhotoHasItsStoredSizeAndTheFilesState) {
  const IndexDaemon daemon;
  JpegRecipe recipe;
  recipe.width = 96;
  recipe.height = 40;
  recipe.orientation = 6;
  MakeJpeg(kPhoto, recipe);
  SetFileTime(kPhoto, 1600000000, 250);
  VELA_MEDIA_INFO media = {};
  ASSERT_EQ(GetMediaFromPluginDB(THUMB_TYPE_PHOTO, kPhoto, media), 0);
  EXPECT_STREQ(media.path, kPhoto);
  EXPECT_EQ(media.type, THUMB_TYPE_PHOTO);
  EXPECT_EQ(media.width, 96U);
  EXPECT_EQ(media.height, 40U);
  EXPECT_EQ(media.rotation, 0);
  EXPECT_EQ(media.duration, 0);
  EXPECT_EQ(media.bitrate, 0U);
  EXPECT_EQ(media.size, FileSize(kPhoto));
  EXPECT_EQ(media.mtime, 1600000000);
}

TEST_F(MediaRecordTest, VideoIsRecognizedWhateverTypeIsRequested) {
  const IndexDaemon daemon;
  FilmRecipe recipe;
  recipe.seconds = 2;
  MakeFilm("/tmp/a.mp4", recipe);
  VELA_MEDIA_INFO media = {};
  ASSERT_EQ(GetMediaFromPluginDB(THUMB_TYPE_PHOTO, "/tmp/a.mp4", media), 0);
  EXPECT_EQ(media.type, THUMB_TYPE_VIDEO);
  EXPECT_EQ(media.width, 64U);
  EXPECT_EQ(media.height, 48U);
  EXPECT_EQ(media.rotation, 0);
  EXPECT_EQ(media.duration, 2);
  const double bits = static_cast<double>(FileSize("/tmp/a.mp4")) * 8;
  EXPECT_NEAR(media.bitrate, bits / 2, bits / 2 * 0.1);
}

TEST_F(MediaRecordTest, RotatedVideoHasItsDisplaySize) {
  const IndexDaemon daemon;
  for (const int rotation : {90, 180, 270}) {
    FilmRecipe recipe;
    recipe.rotation = rotation;
    const std::string path = MakeFilm("/tmp/" + std::to_string(rotation) + ".mp4", recipe);
    const Json::Value media = AskForMedia(path);
    EXPECT_EQ(media["rotation"], rotation);
    EXPECT_EQ(media["width"], rotation == 180 ? 64 : 48);
    EXPECT_EQ(media["height"], rotation == 180 ? 48 : 64);
  }
}

TEST_F(MediaRecordTest, ComesFromTheIndexWhileSizeAndTimeMatch) {
  const IndexDaemon daemon;
  ReplaceIndexedPhoto();
  EXPECT_EQ(AskForMedia(kPhoto)["width"], 80);
}

TEST_F(MediaRecordTest, IsReadAgainWhenTheTimeChanges) {
  const IndexDaemon daemon;
  ReplaceIndexedPhoto();
  SetFileTime(kPhoto, kLongAgo, 6);
  EXPECT_EQ(AskForMedia(kPhoto)["width"], 30);
  EXPECT_EQ(Query("SELECT count(*), max(width) FROM media"), Rows{"1|30"});
}

TEST_F(MediaRecordTest, IsReadAgainWhenTheSizeChanges) {
  const IndexDaemon daemon;
  ReplaceIndexedPhoto();
  AppendToFile(kPhoto, "x");
  SetFileTime(kPhoto, kLongAgo, 5);
  const Json::Value media = AskForMedia(kPhoto);
  EXPECT_EQ(media["width"], 30);
  EXPECT_EQ(media["size"], Json::Int64(kPhotoBytes + 1));
}

TEST_F(MediaRecordTest, OfARecentlyChangedFileIsNotTrusted) {
  const IndexDaemon daemon;
  MakePaddedPhoto(kPhoto, 80, 20);
  SetFileTimeFromNow(kPhoto, 0);
  const FileTime time = ModificationTime(kPhoto);
  ASSERT_EQ(AskForMedia(kPhoto)["width"], 80);
  MakePaddedPhoto(kPhoto, 30, 60);
  SetFileTime(kPhoto, time.seconds, time.nanoseconds);
  EXPECT_EQ(AskForMedia(kPhoto)["width"], 30);
}

TEST_F(MediaRecordTest, SurvivesARestart) {
  {
    IndexDaemon daemon;
    ReplaceIndexedPhoto();
    EXPECT_EQ(daemon.End(SIGTERM).exitCode, 0);
  }
  const IndexDaemon daemon;
  EXPECT_EQ(AskForMedia(kPhoto)["width"], 80);
}

TEST_F(MediaRecordTest, OfAMissingFileIsRemoved) {
  const IndexDaemon daemon;
  MakePaddedPhoto(kPhoto, 80, 20);
  ASSERT_EQ(AskForMedia(kPhoto)["width"], 80);
  RemoveTree(kPhoto);
  Json::Value request = PathRequest("GET_MEDIA_FROM_PLUGIN_DB", kPhoto);
  request["type"] = 1;
  const Json::Value reply = Ask(request);
  EXPECT_EQ(reply["success"], Json::Value(false));
  EXPECT_EQ(reply["error"], "there is no such file");
  EXPECT_EQ(Query("SELECT count(*) FROM media"), Rows{"0"});
}

TEST_F(MediaRecordTest, DoesNotExistForAnUnreadableFile) {
  const IndexDaemon daemon;
  WriteFile("/tmp/damaged.jpg", "no photo");
  WriteFile("/tmp/damaged.mp4", "no film");
  WriteFile("/tmp/note.txt", "no media at all");
  MakeDirectories("/tmp/folder.jpg");
  ASSERT_EQ(mkfifo("/tmp/pipe.jpg", 0600), 0);
  for (const char* path : {"/tmp/damaged.jpg", "/tmp/damaged.mp4", "/tmp/note.txt",
                           "/tmp/folder.jpg", "/tmp/pipe.jpg"}) {
    EXPECT_TRUE(AskForMedia(path).isNull()) << path;
  }
  VELA_MEDIA_INFO media = {};
  media.width = 7;
  EXPECT_EQ(GetMediaFromPluginDB(1, "/tmp/damaged.jpg", media), -1);
  EXPECT_EQ(media.width, 7U);
}

TEST_F(MediaRecordTest, NamesMayHaveAnyBytes) {
  const IndexDaemon daemon;
  for (const std::string name : {"quote \" and \\.jpg", "line\nbreak.jpg", "caf\xe9 \xff\xfe.jpg",
                                 "\xe2\x82\xac 100%.jpg", "tab\t\x01\x7f.jpg"}) {
    const std::string path = "/tmp/" + name;
    MakePaddedPhoto(path, 80, 20);
    VELA_MEDIA_INFO media = {};
    ASSERT_EQ(GetMediaFromPluginDB(1, path.c_str(), media), 0) << name;
    EXPECT_EQ(media.path, path);
    // The second time from the index.
    MakePaddedPhoto(path, 30, 60);
    ASSERT_EQ(GetMediaFromPluginDB(1, path.c_str(), media), 0) << name;
    EXPECT_EQ(media.path, path);
    EXPECT_EQ(media.width, 80U);
  }
  EXPECT_EQ(Query("SELECT DISTINCT typeof(path) FROM media"), Rows{"blob"});
}

TEST_F(MediaRecordTest, IsReturnedEvenWhenTheIndexIsLocked) {
  const IndexDaemon daemon;
  MakePaddedPhoto(kPhoto, 80, 20);
  IndexHolder holder;
  EXPECT_EQ(AskForMedia(kPhoto)["width"], 80);
  holder.Release();
  EXPECT_TRUE(daemon.WaitForLog("index database"));
}

}  // namespace
}  // namespace vela_test
