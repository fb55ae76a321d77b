// Whether a media file is portrait or landscape, whether a video is rotated, and whether its
// converted videos have its orientation.
#include "storage/velamk_util.h"
#include "storage/video_fixture.h"
#include "support/images.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::ElementsAre;

class Orientation : public VideoTest {
 protected:
  static std::string Photo(int width, int height, int orientation = 0) {
    JpegRecipe recipe;
    recipe.width = width;
    recipe.height = height;
    recipe.orientation = orientation;
    return MakeJpeg("/tmp/photo.jpg", recipe);
  }

  std::string Video(int width, int height) const {
    MakeSized("video.mp4", width, height);
    return Derived("video.mp4");
  }
};

TEST_F(Orientation, OfARecord) {
  const struct {
    const char* media;
    int isPortrait;
  } cases[] = {
      {R"({"width":480,"height":640})", 1},
      {R"({"width":639,"height":640})", 1},
      {R"({"width":640,"height":640})", 0},
      {R"({"width":640,"height":480})", 0},
      {R"({"height":1})", 1},
      {R"({"width":1})", 0},
      {R"({})", 0},
      {R"({"width":1,"height":4294967295})", 1},
      {R"({"width":4294967295,"height":1})", 0},
  };
  for (const auto& c : cases) {
    SetRecord("{\"success\":true,\"media\":" + std::string(c.media) + "}");
    EXPECT_EQ(IsMediaPortraitInDB("/tmp/a.mp4"), c.isPortrait) << c.media;
  }
}

TEST_F(Orientation, TheRecordIsRequestedAsThatOfAPhoto) {
  IsMediaPortraitInDB("/tmp/media/film.mp4");
  EXPECT_THAT(Requests(), ElementsAre(kMediaRequest));
}

TEST_F(Orientation, WithoutARecordIsLandscape) {
  SetRecord(R"({"success":false,"media":{"width":480,"height":640}})");
  EXPECT_EQ(IsMediaPortraitInDB("/tmp/media/film.mp4"), 0);
  EXPECT_THAT(TakeErrorLines(), ElementsAre(kDaemonFailed, kUnknownOrientation));
  StopDaemon();
  EXPECT_EQ(IsMediaPortraitInDB("/tmp/media/film.mp4"), 0);
  EXPECT_THAT(TakeErrorLines(), ElementsAre(kDaemonFailed, kUnknownOrientation));
}

TEST_F(Orientation, OfAPhotoIsThatOfItsPixels) {
  EXPECT_EQ(IsFilePortrait(Photo(48, 64).c_str()), 1);
  EXPECT_EQ(IsFilePortrait(Photo(63, 64).c_str()), 1);
  EXPECT_EQ(IsFilePortrait(Photo(64, 64).c_str()), 0);
  EXPECT_EQ(IsFilePortrait(Photo(64, 48).c_str()), 0);
  EXPECT_EQ(IsFilePortrait(Photo(64, 48, 6).c_str()), 0);
  EXPECT_EQ(IsFilePortrait(Photo(48, 64, 6).c_str()), 1);
  EXPECT_EQ(IsFilePortrait(MakeTransparentPng("/tmp/high.png", 48, 64).c_str()), 1);
  EXPECT_EQ(IsFilePortrait(MakeTransparentPng("/tmp/wide.png", 64, 48).c_str()), 0);
}

TEST_F(Orientation, OfAVideo) {
  EXPECT_EQ(IsFilePortrait(Video(48, 64).c_str()), 1);
  EXPECT_EQ(IsFilePortrait(Video(64, 48).c_str()), 0);
  EXPECT_EQ(IsFilePortrait(Video(64, 64).c_str()), 0);
}

TEST_F(Orientation, TheExtensionDistinguishesPhotosFromVideos) {
  // No photo size can be read from a video with the name of a photo.
  CopyFile(Video(48, 64), "/tmp/video.jpg");
  EXPECT_EQ(IsFilePortrait("/tmp/video.jpg"), 0);
}

TEST_F(Orientation, OfAnUnreadableFileIsLandscape) {
  WriteFile("/tmp/broken.jpg", "no photo");
  WriteFile("/tmp/broken.mp4", "no video");
  WriteFile("/tmp/empty.mp4", "");
  for (const char* path : {"/tmp/missing.jpg", "/tmp/missing.mp4", "/tmp/broken.jpg",
                           "/tmp/broken.mp4", "/tmp/empty.mp4", "/tmp"}) {
    EXPECT_EQ(IsFilePortrait(path), 0) << path;
  }
}

class VideoOrientation : public VideoTest {
 protected:
  int IsRotated() const { return IsVideoRotated(Media().c_str()); }
  int HasConverted() const { return HasConvertedFilm(Media().c_str()); }
  int HasMatched() const { return HasMatchedConvertedFilm(Media().c_str()); }
  int Matches(const ConvertedVideo& video) const {
    return IsEAFileOrientationMatched(Media().c_str(), video.name, video.oldName);
  }

  /// Whether the converted video matches a landscape video, and a portrait one.
  void ExpectMatches(const ConvertedVideo& video, int landscape, int portrait) {
    SetRecord(kLandscapeRecord);
    EXPECT_EQ(Matches(video), landscape) << video.name;
    SetRecord(kPortraitRecord);
    EXPECT_EQ(Matches(video), portrait) << video.name;
  }
};

TEST_F(VideoOrientation, AVideoIsRotatedByQuarterTurns) {
  for (const int rotation : {90, 180, 270}) {
    SCOPED_TRACE(rotation);
    MakeVideo(rotation);
    EXPECT_EQ(IsRotated(), 1);
  }
  MakeVideo(0);
  EXPECT_EQ(IsRotated(), 0);
  EXPECT_EQ(RequestCount(), 0U);
}

TEST_F(VideoOrientation, APortraitVideoNeedNotBeRotated) {
  FilmRecipe portrait;
  portrait.width = 48;
  portrait.height = 64;
  MakeFilm(Media(), portrait);
  EXPECT_EQ(IsRotated(), 0);
}

TEST_F(VideoOrientation, AnUnreadableOrMissingVideoIsNotRotated) {
  WriteFile(Media(), "no film");
  EXPECT_EQ(IsRotated(), 0);
  EXPECT_THAT(TakeErrorLines(), ElementsAre(kUnreadableVideo));
  RemoveTree(Media());
  EXPECT_EQ(IsRotated(), 0);
  EXPECT_THAT(TakeErrorLines(), ElementsAre(kUnreadableVideo));
}

TEST_F(VideoOrientation, OnlyOrientedOnesAreConvertedVideos) {
  EXPECT_EQ(HasConverted(), 0);
  for (const char* name : NamesOf(kOriented)) {
    for (const size_t size : {size_t{0}, size_t{2}}) {
      SCOPED_TRACE(name);
      MakeDerived(name, size);
      EXPECT_EQ(HasConverted(), 1);
      Remove(name);
      EXPECT_EQ(HasConverted(), 0);
    }
  }
  for (const char* name : NamesOf({kIphone, kFlash, kH264, kMpeg4, kConversion})) {
    MakeDerived(name);
  }
  EXPECT_EQ(HasConverted(), 0);
  EXPECT_EQ(HasMatched(), 0);
  EXPECT_EQ(RequestCount(), 0U);
}

TEST_F(VideoOrientation, AConvertedVideoMatchesARecordOfItsOrientation) {
  MakeLandscape(kFlash.name);
  ExpectMatches(kFlash, 1, 0);
  MakePortrait(kHigh.name);
  ExpectMatches(kHigh, 0, 1);
  MakePortrait(kLow.oldName);
  ExpectMatches(kLow, 0, 1);
  // A square one is not portrait, nor is one that cannot be read.
  MakeSized(kMedium.name, 64, 64);
  ExpectMatches(kMedium, 1, 0);
  MakeDerived(kMobile.name);
  ExpectMatches(kMobile, 1, 0);
}

TEST_F(VideoOrientation, TheCurrentNamePrecedesTheOlderOne) {
  MakePortrait(kFlash.name);
  MakeLandscape(kFlash.oldName);
  ExpectMatches(kFlash, 0, 1);
}

TEST_F(VideoOrientation, TheRecordIsThatOfTheVideo) {
  MakeLandscape(kFlash.name);
  Matches(kFlash);
  EXPECT_THAT(Requests(), ElementsAre(kMediaRequest));
}

TEST_F(VideoOrientation, AnUnknownVideoIsLandscape) {
  SetRecord(kNoRecord);
  MakeLandscape(kHigh.name);
  MakePortrait(kLow.name);
  EXPECT_EQ(Matches(kHigh), 1);
  EXPECT_EQ(Matches(kLow), 0);
  EXPECT_THAT(TakeErrorLines(),
              ElementsAre(kDaemonFailed, kUnknownOrientation, kDaemonFailed, kUnknownOrientation));
  StopDaemon();
  EXPECT_EQ(Matches(kLow), 0);
  EXPECT_THAT(TakeErrorLines(), ElementsAre(kDaemonFailed, kUnknownOrientation));
}

TEST_F(VideoOrientation, AMissingConvertedVideoIsNotCompared) {
  MakeLandscape(kHigh.name);
  EXPECT_EQ(Matches(kMedium), -1);
  EXPECT_EQ(RequestCount(), 0U);
}

TEST_F(VideoOrientation, NothingIsComparedWithoutMetadataDirectory) {
  for (const std::string& path : PathsWithoutDirectory()) {
    SCOPED_TRACE(path);
    EXPECT_EQ(IsEAFileOrientationMatched(path.c_str(), kHigh.name, kHigh.oldName), -1);
    EXPECT_EQ(HasConvertedFilm(path.c_str()), 0);
    EXPECT_EQ(HasMatchedConvertedFilm(path.c_str()), 0);
  }
  EXPECT_EQ(RequestCount(), 0U);
}

TEST_F(VideoOrientation, TheLongestPathIsCompared) {
  // The path of the converted video is the longest that the system accepts.
  const std::string media = PathOfLength(4067, "long.mp4");
  const std::string eaDir = DirectoryOf(media) + "/@eaDir/long.mp4";
  const std::string converted = eaDir + "/" + kHigh.name;
  ASSERT_EQ(converted.size(), 4095U);
  MakePortrait("made.mp4");
  MakeDirectories(eaDir);
  CopyFile(Derived("made.mp4"), converted);
  EXPECT_EQ(IsEAFileOrientationMatched(media.c_str(), kHigh.name, kHigh.oldName), 0);
  SetRecord(kPortraitRecord);
  EXPECT_EQ(IsEAFileOrientationMatched(media.c_str(), kHigh.name, kHigh.oldName), 1);
}

TEST_F(VideoOrientation, ANullPathIsRefused) {
  EXPECT_EQ(IsEAFileOrientationMatched(nullptr, kHigh.name, kHigh.oldName), -1);
  EXPECT_THAT(TakeErrorLines(), ElementsAre("velamk_util:166 Bad parameters."));
}

TEST_F(VideoOrientation, EveryOrientedVideoMayMatch) {
  for (const char* name : NamesOf(kOriented)) {
    SCOPED_TRACE(name);
    MakePortrait(name);
    SetRecord(kPortraitRecord);
    EXPECT_EQ(HasMatched(), 1);
    SetRecord(kLandscapeRecord);
    EXPECT_EQ(HasMatched(), 0);
    Remove(name);
  }
  EXPECT_EQ(HasMatched(), 0);
}

TEST_F(VideoOrientation, TheFirstMatchEndsTheSearch) {
  for (const ConvertedVideo& video : kOriented) {
    MakePortrait(video.name);
  }
  EXPECT_EQ(HasMatched(), 0);
  EXPECT_EQ(RequestCount(), 4U);
  size_t place = 0;
  for (const ConvertedVideo& video : kOriented) {
    SCOPED_TRACE(video.name);
    MakeLandscape(video.name);
    const size_t before = RequestCount();
    EXPECT_EQ(HasMatched(), 1);
    // One request for each converted video up to the one that matches.
    EXPECT_EQ(RequestCount() - before, ++place);
    MakePortrait(video.name);
  }
}

TEST_F(VideoOrientation, AFailureOfTheDaemonAffectsOneConvertedVideoOnly) {
  SetRecord(kPortraitRecord);
  SetNextRecord(kNoRecord);
  MakePortrait(kHigh.name);
  MakePortrait(kMedium.name);
  EXPECT_EQ(HasMatched(), 1);
  EXPECT_EQ(RequestCount(), 2U);
  EXPECT_THAT(TakeErrorLines(), ElementsAre(kDaemonFailed, kUnknownOrientation));
}

}  // namespace
}  // namespace vela_test
