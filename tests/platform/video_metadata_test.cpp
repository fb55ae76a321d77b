// Rotation, duration and bit rate of videos.
#include <optional>

#include "platform/video_fixture.h"

namespace vela_test {
namespace {

/// Empty when the call fails, which must leave the record unchanged.
std::optional<_VIDEO_METADATA_> MetadataOf(const std::string& path) {
  _VIDEO_METADATA_ metadata = {7, 8, 9};
  const int result = VELAIDX_GetVideoMetadata(path.c_str(), &metadata);
  if (result == 0) return metadata;
  EXPECT_EQ(result, -1);
  EXPECT_EQ(metadata.rotation, 7);
  EXPECT_EQ(metadata.duration, 8);
  EXPECT_EQ(metadata.bitrate, 9);
  return std::nullopt;
}

/// The metadata of a video; all -1 when the call fails.
_VIDEO_METADATA_ Known(const std::string& path) {
  return MetadataOf(path).value_or(_VIDEO_METADATA_{-1, -1, -1});
}

int RotationOf(const std::string& path) {
  return Known(path).rotation;
}

int DurationOf(const std::string& path) {
  return Known(path).duration;
}

FilmRecipe Turned(int rotation) {
  FilmRecipe recipe;
  recipe.rotation = rotation;
  return recipe;
}

FilmRecipe Lasting(double seconds, const std::string& videoCodec = "libx264") {
  FilmRecipe recipe;
  recipe.seconds = seconds;
  recipe.videoCodec = videoCodec;
  return recipe;
}

/// Expects the bit rate of the file, within 10 %.
void ExpectAverageBitRate(const std::string& path, int seconds) {
  const double average = static_cast<double>(FileSize(path)) * 8 / seconds;
  EXPECT_NEAR(Known(path).bitrate, average, average / 10) << path;
}

class VideoMetadata : public SandboxTest {};

TEST_F(VideoMetadata, OfALandscapeFilm) {
  MakeFilm("/tmp/a.mp4");
  EXPECT_EQ(RotationOf("/tmp/a.mp4"), 0);
  EXPECT_EQ(DurationOf("/tmp/a.mp4"), 1);
  EXPECT_EQ(Known("/tmp/a.mp4").bitrate, FileSize("/tmp/a.mp4") * 8);
}

TEST_F(VideoMetadata, HasNoRotationForAPortraitFilmStoredUpright) {
  FilmRecipe recipe;
  recipe.width = 48;
  recipe.height = 64;
  EXPECT_EQ(RotationOf(MakeFilm("/tmp/a.mp4", recipe)), 0);
}

TEST_F(VideoMetadata, HasTheRotationClockwise) {
  for (const int rotation : {0, 90, 180, 270}) {
    for (const char* path : {"/tmp/a.mp4", "/tmp/a.mov"}) {
      EXPECT_EQ(RotationOf(MakeFilm(path, Turned(rotation))), rotation) << path;
    }
  }
}

TEST_F(VideoMetadata, HasTheNearestQuarterTurn) {
  MakeFilm("/tmp/a.mp4");
  const struct {
    double stored;
    int expected;
  } cases[] = {{1, 0},     {44, 0},    {46, 90},   {134, 90},  {136, 180}, {179, 180},
               {181, 180}, {224, 180}, {226, 270}, {314, 270}, {316, 0},   {359, 0}};
  for (const auto& turn : cases) {
    SetFilmMatrix("/tmp/a.mp4", turn.stored);
    EXPECT_EQ(RotationOf("/tmp/a.mp4"), turn.expected) << turn.stored;
  }
}

TEST_F(VideoMetadata, HasTheRotationOfAScaledPicture) {
  MakeFilm("/tmp/a.mp4");
  SetFilmMatrix("/tmp/a.mp4", 90, 2);
  EXPECT_EQ(RotationOf("/tmp/a.mp4"), 90);
}

TEST_F(VideoMetadata, HasNoRotationForAMatrixOfZeros) {
  MakeFilm("/tmp/a.mp4");
  SetFilmMatrix("/tmp/a.mp4", 90, 0);
  EXPECT_EQ(RotationOf("/tmp/a.mp4"), 0);
}

TEST_F(VideoMetadata, HasTheDurationRoundedToTheNearestSecond) {
  EXPECT_EQ(DurationOf(MakeFilm("/tmp/a.mp4", Lasting(2.4))), 2);
  EXPECT_EQ(DurationOf(MakeFilm("/tmp/a.mp4", Lasting(2.6))), 3);
  EXPECT_EQ(DurationOf(MakeFilm("/tmp/a.mp4", Lasting(75))), 75);
}

TEST_F(VideoMetadata, IsReadFromAllContainers) {
  const struct {
    const char* name;
    const char* codec;
  } cases[] = {{"a.mov", "libx264"}, {"a.mkv", "libx264"},   {"a.webm", "libvpx"},
               {"a.avi", "mpeg4"},   {"a.ts", "mpeg2video"}, {"a.m2ts", "libx264"},
               {"a.wmv", "wmv2"},    {"a.flv", "flv"},       {"a.ogv", "libtheora"}};
  for (const auto& film : cases) {
    const std::string path = std::string("/tmp/") + film.name;
    MakeFilm(path, Lasting(4, film.codec));
    EXPECT_EQ(RotationOf(path), 0) << path;
    EXPECT_EQ(DurationOf(path), 4) << path;
    ExpectAverageBitRate(path, 4);
  }
}

TEST_F(VideoMetadata, IsEstimatedWhenNoHeaderHasTheDuration) {
  MakeFilm("/tmp/a.mpg", Lasting(20, "mpeg2video"));
  EXPECT_NEAR(DurationOf("/tmp/a.mpg"), 20, 1);
  ExpectAverageBitRate("/tmp/a.mpg", 20);
}

TEST_F(VideoMetadata, HasTheBitRateOfTheContainer) {
  FilmRecipe recipe = Lasting(0.4, "dvvideo");
  recipe.width = 720;
  recipe.height = 576;
  MakeFilm("/tmp/a.dv", recipe);
  constexpr int kFrameBytes = 144000;
  EXPECT_EQ(Known("/tmp/a.dv").bitrate, kFrameBytes * 8 * 25);
}

TEST_F(VideoMetadata, HasNoMoreThanTheHighestBitRate) {
  MakeFilm("/tmp/a.mp4");
  ASSERT_EQ(truncate("/tmp/a.mp4", 1LL << 30), 0);
  EXPECT_EQ(Known("/tmp/a.mp4").bitrate, INT32_MAX);
}

TEST_F(VideoMetadata, OfAFilmWrittenInPieces) {
  MakeFilm("/tmp/whole.mp4", Lasting(3));
  Ffmpeg({"-v", "error", "-i", "/tmp/whole.mp4", "-c", "copy", "-movflags",
          "frag_keyframe+empty_moov", "/tmp/pieces.mp4"});
  EXPECT_EQ(DurationOf("/tmp/pieces.mp4"), 3);
}

TEST_F(VideoMetadata, OfACutFilmWithItsHeaderFirst) {
  FilmRecipe recipe = Lasting(2);
  recipe.headerFirst = true;
  recipe.rotation = 90;
  MakeFilm("/tmp/a.mp4", recipe);
  const int64_t size = FileSize("/tmp/a.mp4");
  MakeCutFilm("/tmp/a.mp4", static_cast<size_t>(size - 100), recipe);
  ASSERT_EQ(FileSize("/tmp/a.mp4"), size - 100);
  EXPECT_EQ(RotationOf("/tmp/a.mp4"), 90);
  EXPECT_EQ(DurationOf("/tmp/a.mp4"), 2);
}

TEST_F(VideoMetadata, FailsForACutFilmWithItsHeaderLast) {
  MakeFilm("/tmp/a.mp4");
  const auto size = static_cast<size_t>(FileSize("/tmp/a.mp4"));
  MakeCutFilm("/tmp/a.mp4", size / 4);
  EXPECT_FALSE(MetadataOf("/tmp/a.mp4").has_value());
}

TEST_F(VideoMetadata, FailsWithoutPicture) {
  FilmRecipe recipe;
  recipe.videoCodec.clear();
  recipe.audioCodec = "aac";
  MakeFilm("/tmp/a.mp4", recipe);
  EXPECT_FALSE(MetadataOf("/tmp/a.mp4").has_value());
}

TEST_F(VideoMetadata, FailsForMusicWithACover) {
  MakeImage("/tmp/cover.png", 64, 48);
  Ffmpeg({"-v", "error", "-f", "lavfi", "-i", "sine=duration=1", "-i", "/tmp/cover.png", "-map",
          "0", "-map", "1", "-c:a", "aac", "-c:v", "copy", "-disposition:v:0", "attached_pic",
          "/tmp/a.mp4"});
  EXPECT_FALSE(MetadataOf("/tmp/a.mp4").has_value());
}

TEST_F(VideoMetadata, FailsForAnythingButVideos) {
  for (const std::string& path : MakeFilesThatAreNoVideos()) {
    EXPECT_FALSE(MetadataOf(path).has_value()) << path;
  }
}

TEST_F(VideoMetadata, ReportsWhyItFails) {
  EXPECT_FALSE(MetadataOf("/tmp/absent.mp4").has_value());
  EXPECT_EQ(VLIBCErrGet(), ENOENT);
  EXPECT_FALSE(MetadataOf("/tmp").has_value());
  EXPECT_EQ(VLIBCErrGet(), EINVAL);
  MakeFilm("/tmp/a.mp4");
  EXPECT_FALSE(MetadataOf("/tmp/a.mp4/b.mp4").has_value());
  EXPECT_EQ(VLIBCErrGet(), ENOTDIR);
  _VIDEO_METADATA_ metadata;
  EXPECT_EQ(VELAIDX_GetVideoMetadata(nullptr, &metadata), -1);
  EXPECT_EQ(VLIBCErrGet(), EINVAL);
  EXPECT_EQ(VELAIDX_GetVideoMetadata("/tmp/a.mp4", nullptr), -1);
  EXPECT_EQ(VLIBCErrGet(), EINVAL);
}

TEST_F(VideoMetadata, OfFilmsWithOddNames) {
  ASSERT_EQ(chdir("/tmp"), 0);
  for (const std::string& name : kOddNames) {
    MakeFilm(name, Turned(270));
    EXPECT_EQ(RotationOf(name), 270) << name;
    EXPECT_EQ(RotationOf("/tmp/" + name), 270) << name;
  }
}

TEST_F(VideoMetadata, FailsOrIsTheSameForFilmsCutAnywhere) {
  FilmRecipe recipe = Turned(90);
  recipe.headerFirst = true;
  MakeFilm("/tmp/a.mp4", recipe);
  const std::string whole = ReadFile("/tmp/a.mp4");
  for (size_t length = 0; length < whole.size(); length += 37) {
    WriteFile("/tmp/cut.mp4", whole.substr(0, length));
    const auto metadata = MetadataOf("/tmp/cut.mp4");
    if (metadata.has_value()) {
      EXPECT_EQ(metadata->rotation, 90) << length;
      EXPECT_GE(metadata->bitrate, 0) << length;
    }
  }
}

TEST_F(VideoMetadata, PrintsNothingAndLeavesNoDescriptorOpen) {
  MakeFilm("/tmp/a.mp4");
  MakeCutFilm("/tmp/broken.mp4", 500);
  const auto examine = [] {
    for (int i = 0; i < 5; ++i) {
      EXPECT_TRUE(MetadataOf("/tmp/a.mp4").has_value());
      EXPECT_FALSE(MetadataOf("/tmp/broken.mp4").has_value());
    }
  };
  EXPECT_EQ(PrintedBy([&] {
              MetadataOf("/tmp/a.mp4");  // loads the video library
              ExpectNoDescriptorLeak(examine);
            }),
            "");
}

}  // namespace
}  // namespace vela_test
