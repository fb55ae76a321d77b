// Rotation, duration and bit rate of videos.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cmath>
#include <cstdint>
#include <optional>
#include <ostream>
#include <string>
#include <vector>

#include "platform/forked_call.h"
#include "platform/velaindex.h"
#include "platform/vlibc.h"
#include "support/files.h"
#include "support/films.h"
#include "support/images.h"
#include "support/program.h"
#include "support/sandbox.h"

namespace {

using vela_test::FilmRecipe;
using vela_test::MakeFilm;

constexpr double kPi = 3.14159265358979323846;

/// Empty when the call fails; the record must be as it was then.
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

int RotationOf(const std::string& path) {
  const auto metadata = MetadataOf(path);
  return metadata.has_value() ? metadata->rotation : -1;
}

int DurationOf(const std::string& path) {
  const auto metadata = MetadataOf(path);
  return metadata.has_value() ? metadata->duration : -1;
}

int BitRateOf(const std::string& path) {
  const auto metadata = MetadataOf(path);
  return metadata.has_value() ? metadata->bitrate : -1;
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

std::string BigEndian(int32_t value) {
  const auto bits = static_cast<uint32_t>(value);
  std::string bytes;
  for (const int shift : {24, 16, 8, 0}) bytes += static_cast<char>(bits >> shift & 0xff);
  return bytes;
}

std::string FixedPoint(double value) {
  return BigEndian(static_cast<int32_t>(std::lround(value * 65536)));
}

/// Replaces the matrix of the first track by that of a clockwise turn, `scale` 1 for the size as it
/// is.
void SetMatrix(const std::string& path, double degrees, double scale = 1) {
  const double cosine = std::cos(degrees * kPi / 180) * scale;
  const double sine = std::sin(degrees * kPi / 180) * scale;
  const std::string matrix =
      FixedPoint(cosine) + FixedPoint(sine) + BigEndian(0) + FixedPoint(-sine) + FixedPoint(cosine);
  std::string film = vela_test::ReadFile(path);
  const size_t header = film.find("tkhd");
  ASSERT_NE(header, std::string::npos);
  film.replace(header + 44, matrix.size(), matrix);
  vela_test::WriteFile(path, film);
}

void Ffmpeg(const std::vector<std::string>& arguments) {
  const auto result = vela_test::RunProgram("/usr/bin/ffmpeg", arguments);
  ASSERT_EQ(result.exitCode, 0) << result.err;
}

class VideoMetadata : public vela_test::SandboxTest {};

TEST_F(VideoMetadata, OfALandscapeFilm) {
  MakeFilm("/tmp/a.mp4");
  const auto metadata = MetadataOf("/tmp/a.mp4");
  ASSERT_TRUE(metadata.has_value());
  EXPECT_EQ(metadata->rotation, 0);
  EXPECT_EQ(metadata->duration, 1);
  EXPECT_EQ(metadata->bitrate, vela_test::FileSize("/tmp/a.mp4") * 8);
}

TEST_F(VideoMetadata, HasNoRotationForAPortraitFilmStoredUpright) {
  FilmRecipe recipe;
  recipe.width = 48;
  recipe.height = 64;
  MakeFilm("/tmp/a.mp4", recipe);
  EXPECT_EQ(RotationOf("/tmp/a.mp4"), 0);
}

TEST_F(VideoMetadata, HasTheRotationClockwise) {
  for (const int rotation : {0, 90, 180, 270}) {
    MakeFilm("/tmp/a.mp4", Turned(rotation));
    EXPECT_EQ(RotationOf("/tmp/a.mp4"), rotation);
    MakeFilm("/tmp/a.mov", Turned(rotation));
    EXPECT_EQ(RotationOf("/tmp/a.mov"), rotation);
  }
}

TEST_F(VideoMetadata, HasTheNearestQuarterTurn) {
  MakeFilm("/tmp/a.mp4");
  const struct {
    double stored;
    int told;
  } cases[] = {{1, 0},     {44, 0},    {46, 90},   {134, 90},  {136, 180}, {179, 180},
               {181, 180}, {224, 180}, {226, 270}, {314, 270}, {316, 0},   {359, 0}};
  for (const auto& turn : cases) {
    SetMatrix("/tmp/a.mp4", turn.stored);
    EXPECT_EQ(RotationOf("/tmp/a.mp4"), turn.told) << turn.stored;
  }
}

TEST_F(VideoMetadata, HasTheRotationOfAScaledPicture) {
  MakeFilm("/tmp/a.mp4");
  SetMatrix("/tmp/a.mp4", 90, 2);
  EXPECT_EQ(RotationOf("/tmp/a.mp4"), 90);
}

TEST_F(VideoMetadata, HasNoRotationForAMatrixOfZeros) {
  MakeFilm("/tmp/a.mp4");
  SetMatrix("/tmp/a.mp4", 90, 0);
  EXPECT_EQ(RotationOf("/tmp/a.mp4"), 0);
}

TEST_F(VideoMetadata, HasTheDurationRoundedToTheNearestSecond) {
  MakeFilm("/tmp/a.mp4", Lasting(2.4));
  EXPECT_EQ(DurationOf("/tmp/a.mp4"), 2);
  MakeFilm("/tmp/a.mp4", Lasting(2.6));
  EXPECT_EQ(DurationOf("/tmp/a.mp4"), 3);
  MakeFilm("/tmp/a.mp4", Lasting(75));
  EXPECT_EQ(DurationOf("/tmp/a.mp4"), 75);
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
    const auto metadata = MetadataOf(path);
    ASSERT_TRUE(metadata.has_value()) << path;
    EXPECT_EQ(metadata->rotation, 0) << path;
    EXPECT_EQ(metadata->duration, 4) << path;
    const double average = static_cast<double>(vela_test::FileSize(path)) * 8 / 4;
    EXPECT_NEAR(metadata->bitrate, average, average / 10) << path;
  }
}

TEST_F(VideoMetadata, IsEstimatedWhenNoHeaderTellsTheDuration) {
  MakeFilm("/tmp/a.mpg", Lasting(20, "mpeg2video"));
  const auto metadata = MetadataOf("/tmp/a.mpg");
  ASSERT_TRUE(metadata.has_value());
  EXPECT_NEAR(metadata->duration, 20, 1);
  const double average = static_cast<double>(vela_test::FileSize("/tmp/a.mpg")) * 8 / 20;
  EXPECT_NEAR(metadata->bitrate, average, average / 10);
}

TEST_F(VideoMetadata, HasTheBitRateThatTheContainerTells) {
  FilmRecipe recipe = Lasting(0.4, "dvvideo");
  recipe.width = 720;
  recipe.height = 576;
  MakeFilm("/tmp/a.dv", recipe);
  constexpr int kFrameBytes = 144000;
  EXPECT_EQ(BitRateOf("/tmp/a.dv"), kFrameBytes * 8 * 25);
}

TEST_F(VideoMetadata, HasNoMoreThanTheHighestBitRate) {
  MakeFilm("/tmp/a.mp4");
  ASSERT_EQ(truncate("/tmp/a.mp4", 1LL << 30), 0);
  EXPECT_EQ(BitRateOf("/tmp/a.mp4"), INT32_MAX);
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
  const int64_t size = vela_test::FileSize("/tmp/a.mp4");
  vela_test::MakeCutFilm("/tmp/a.mp4", static_cast<size_t>(size - 100), recipe);
  ASSERT_EQ(vela_test::FileSize("/tmp/a.mp4"), size - 100);
  EXPECT_EQ(RotationOf("/tmp/a.mp4"), 90);
  EXPECT_EQ(DurationOf("/tmp/a.mp4"), 2);
}

TEST_F(VideoMetadata, FailsForACutFilmWithItsHeaderLast) {
  MakeFilm("/tmp/a.mp4");
  const auto size = static_cast<size_t>(vela_test::FileSize("/tmp/a.mp4"));
  vela_test::MakeCutFilm("/tmp/a.mp4", size / 4);
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
  vela_test::MakeImage("/tmp/cover.png", 64, 48);
  Ffmpeg({"-v", "error", "-f", "lavfi", "-i", "sine=duration=1", "-i", "/tmp/cover.png", "-map",
          "0", "-map", "1", "-c:a", "aac", "-c:v", "copy", "-disposition:v:0", "attached_pic",
          "/tmp/a.mp4"});
  EXPECT_FALSE(MetadataOf("/tmp/a.mp4").has_value());
}

TEST_F(VideoMetadata, FailsForAnythingButVideos) {
  vela_test::WriteFile("/tmp/empty.mp4", "");
  vela_test::WriteFile("/tmp/text.mp4", "no film\n");
  vela_test::WriteFile("/tmp/list.mp4", "#EXTM3U\n#EXTINF:1,\n/tmp/a.mp4\n");
  vela_test::MakeImage("/tmp/photo.png", 64, 48);
  MakeFilm("/tmp/a.mp4");
  ASSERT_EQ(mkfifo("/tmp/pipe.mp4", 0600), 0);
  for (const char* path : {"/tmp/empty.mp4", "/tmp/text.mp4", "/tmp/list.mp4", "/tmp/photo.png",
                           "/tmp/pipe.mp4", "/tmp", ""}) {
    EXPECT_FALSE(MetadataOf(path).has_value()) << path;
  }
}

TEST_F(VideoMetadata, TellsWhyItFails) {
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
  for (const char* name : {"two  words .mp4", "100%03d%s.mp4", "http:a.mp4", "pipe:0.mp4", "-i.mp4",
                           "\xff\xfe.mp4", "two\nlines.mp4", "it's \"q\" $HOME `x`;.mp4"}) {
    MakeFilm(name, Turned(270));
    EXPECT_EQ(RotationOf(name), 270) << name;
    EXPECT_EQ(RotationOf(std::string("/tmp/") + name), 270) << name;
  }
}

TEST_F(VideoMetadata, FailsOrIsTheSameForFilmsCutAnywhere) {
  FilmRecipe recipe = Turned(90);
  recipe.headerFirst = true;
  MakeFilm("/tmp/a.mp4", recipe);
  const std::string whole = vela_test::ReadFile("/tmp/a.mp4");
  for (size_t length = 0; length < whole.size(); length += 37) {
    vela_test::WriteFile("/tmp/cut.mp4", whole.substr(0, length));
    const auto metadata = MetadataOf("/tmp/cut.mp4");
    if (metadata.has_value()) {
      EXPECT_EQ(metadata->rotation, 90) << length;
      EXPECT_GE(metadata->bitrate, 0) << length;
    }
  }
}

TEST_F(VideoMetadata, PrintsNothingAndLeavesNoDescriptorOpen) {
  MakeFilm("/tmp/a.mp4");
  vela_test::MakeCutFilm("/tmp/broken.mp4", 500);
  const int result = platform_test::RunForked([] {
    if (freopen("/tmp/printed", "w", stderr) == nullptr) return 1;
    MetadataOf("/tmp/a.mp4");
    const int before = platform_test::CountDescriptors();
    for (int i = 0; i < 5; ++i) {
      if (!MetadataOf("/tmp/a.mp4").has_value()) return 2;
      if (MetadataOf("/tmp/broken.mp4").has_value()) return 3;
    }
    fflush(stderr);
    return platform_test::CountDescriptors() == before ? 0 : 4;
  });
  EXPECT_EQ(result, 0);
  EXPECT_EQ(vela_test::ReadFile("/tmp/printed"), "");
}

}  // namespace
