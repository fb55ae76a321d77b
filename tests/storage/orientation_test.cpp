// Portrait or landscape, by the index and by the file.
#include <gmock/gmock.h>

#include <string>

#include "storage/velamk_util.h"
#include "support/daemon_peer.h"
#include "support/files.h"
#include "support/images.h"
#include "support/program.h"
#include "support/sandbox.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;

class Orientation : public SandboxTest {
 protected:
  /// The answer for a media record of this content.
  static int PortraitInDb(const std::string& media) {
    DaemonPeer daemon;
    daemon.AnswerNext(DaemonReply::Line("{\"success\":true,\"media\":" + media + "}"));
    return IsMediaPortraitInDB("/tmp/a.mp4");
  }

  static std::string Photo(int width, int height, int orientation = 0) {
    JpegRecipe recipe;
    recipe.width = width;
    recipe.height = height;
    recipe.orientation = orientation;
    return MakeJpeg("/tmp/photo.jpg", recipe);
  }

  /// A film of one second; returns its path.
  static std::string Film(const std::string& size) {
    const std::string path = "/tmp/film.mp4";
    const ProgramResult result = RunProgram(
        "/usr/bin/ffmpeg", {"-v", "error", "-y", "-f", "lavfi", "-i",
                            "testsrc=duration=1:rate=2:size=" + size, "-c:v", "mpeg4", path});
    EXPECT_EQ(result.exitCode, 0) << result.err;
    return path;
  }
};

TEST_F(Orientation, OfARecord) {
  EXPECT_EQ(PortraitInDb(R"({"width":480,"height":640})"), 1);
  EXPECT_EQ(PortraitInDb(R"({"width":639,"height":640})"), 1);
  EXPECT_EQ(PortraitInDb(R"({"width":640,"height":640})"), 0);
  EXPECT_EQ(PortraitInDb(R"({"width":640,"height":480})"), 0);
  EXPECT_EQ(PortraitInDb(R"({"height":1})"), 1);
  EXPECT_EQ(PortraitInDb(R"({"width":1})"), 0);
  EXPECT_EQ(PortraitInDb(R"({})"), 0);
  EXPECT_EQ(PortraitInDb(R"({"width":1,"height":4294967295})"), 1);
  EXPECT_EQ(PortraitInDb(R"({"width":4294967295,"height":1})"), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Orientation, TheRecordIsAskedForAsAPhotos) {
  DaemonPeer daemon;
  IsMediaPortraitInDB("/tmp/a.mp4");
  ASSERT_THAT(daemon.Requests(), SizeIs(1));
  EXPECT_EQ(daemon.Requests().front().bytes,
            "{\"command\":\"GET_MEDIA_FROM_PLUGIN_DB\",\"path\":\"/tmp/a.mp4\",\"type\":1}\n");
}

TEST_F(Orientation, AnUnknownRecordIsLandscape) {
  {
    DaemonPeer daemon;
    daemon.AnswerNext(DaemonReply::Line(R"({"success":false,"media":{"width":480,"height":640}})"));
    EXPECT_EQ(IsMediaPortraitInDB("/tmp/a.mp4"), 0);
  }
  EXPECT_THAT(ErrorLines(), ElementsAre("velamk_ipc:30 fail",
                                        "velamk_util:128 fail to get media from plugin db: "
                                        "/tmp/a.mp4"));
}

TEST_F(Orientation, WithoutADaemonEverythingIsLandscape) {
  EXPECT_EQ(IsMediaPortraitInDB("/tmp/b.mp4"), 0);
  EXPECT_THAT(ErrorLines(), ElementsAre("velamk_ipc:30 fail",
                                        "velamk_util:128 fail to get media from plugin db: "
                                        "/tmp/b.mp4"));
}

TEST_F(Orientation, OfAPhoto) {
  EXPECT_EQ(IsFilePortrait(Photo(48, 64).c_str()), 1);
  EXPECT_EQ(IsFilePortrait(Photo(63, 64).c_str()), 1);
  EXPECT_EQ(IsFilePortrait(Photo(64, 64).c_str()), 0);
  EXPECT_EQ(IsFilePortrait(Photo(64, 48).c_str()), 0);
}

TEST_F(Orientation, OfAPhotoIsThatOfItsPixels) {
  EXPECT_EQ(IsFilePortrait(Photo(64, 48, 6).c_str()), 0);
  EXPECT_EQ(IsFilePortrait(Photo(48, 64, 6).c_str()), 1);
}

TEST_F(Orientation, OfOtherPhotoFormats) {
  EXPECT_EQ(IsFilePortrait(MakeTransparentPng("/tmp/high.png", 48, 64).c_str()), 1);
  EXPECT_EQ(IsFilePortrait(MakeTransparentPng("/tmp/wide.png", 64, 48).c_str()), 0);
}

TEST_F(Orientation, OfAFilm) {
  EXPECT_EQ(IsFilePortrait(Film("48x64").c_str()), 1);
  EXPECT_EQ(IsFilePortrait(Film("64x48").c_str()), 0);
  EXPECT_EQ(IsFilePortrait(Film("64x64").c_str()), 0);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Orientation, TheNameTellsPhotosFromFilms) {
  // A film that is called a photo has no size that a reader of photos finds.
  const std::string film = Film("48x64");
  CopyFile(film, "/tmp/film.jpg");
  EXPECT_EQ(IsFilePortrait("/tmp/film.jpg"), 0);
}

TEST_F(Orientation, OfWhatCannotBeRead) {
  EXPECT_EQ(IsFilePortrait("/tmp/missing.jpg"), 0);
  EXPECT_EQ(IsFilePortrait("/tmp/missing.mp4"), 0);
  WriteFile("/tmp/broken.jpg", "no photo");
  EXPECT_EQ(IsFilePortrait("/tmp/broken.jpg"), 0);
  WriteFile("/tmp/broken.mp4", "no film");
  EXPECT_EQ(IsFilePortrait("/tmp/broken.mp4"), 0);
  WriteFile("/tmp/empty.mp4", "");
  EXPECT_EQ(IsFilePortrait("/tmp/empty.mp4"), 0);
  EXPECT_EQ(IsFilePortrait("/tmp"), 0);
}

}  // namespace
}  // namespace vela_test
