// The video makers, compared with the output of a player.
#include "support/films.h"

#include <gtest/gtest.h>

#include <string>

#include "support/files.h"
#include "support/image_checks.h"
#include "support/program.h"
#include "support/sandbox.h"

namespace vela_test {
namespace {

class FilmsTest : public SandboxTest {};

/// The size of the video in a player, and the letters of its quadrants.
std::string ShownBy(const std::string& path) {
  const ProgramResult result =
      RunProgram("/usr/bin/ffmpeg", {"-v", "error", "-y", "-i", "file:" + path, "-frames:v", "1",
                                     "-pix_fmt", "yuvj444p", "-q:v", "2", "/tmp/frame.jpg"});
  EXPECT_EQ(result.exitCode, 0) << result.err;
  const auto frame = DecodeJpeg("/tmp/frame.jpg");
  if (!frame.has_value()) return "nothing";
  return std::to_string(frame->Width()) + "x" + std::to_string(frame->Height()) + " " +
         QuadrantLetters("/tmp/frame.jpg");
}

std::string Probe(const std::string& entries, const std::string& path) {
  return RunProgram("/usr/bin/ffprobe",
                    {"-v", "error", "-show_entries", entries, "-of", "csv=p=0", "file:" + path})
      .out;
}

TEST_F(FilmsTest, FilmShowsTheQuadrants) {
  EXPECT_EQ(MakeFilm("/tmp/a.mp4"), "/tmp/a.mp4");
  EXPECT_EQ(ShownBy("/tmp/a.mp4"), "64x48 RGBY");
  EXPECT_EQ(Probe("stream=codec_name", "/tmp/a.mp4"), "h264\n");
}

TEST_F(FilmsTest, FilmIsTurnedClockwise) {
  FilmRecipe recipe;
  for (const char* path : {"/tmp/a.mp4", "/tmp/a.mov"}) {
    for (const int rotation : {90, 180, 270}) {
      recipe.rotation = rotation;
      MakeFilm(path, recipe);
      const std::string size = rotation == 180 ? "64x48 " : "48x64 ";
      EXPECT_EQ(ShownBy(path), size + LettersAfterTurn(rotation)) << path << " " << rotation;
    }
  }
}

TEST_F(FilmsTest, FilmHasItsSizeLengthAndCodecs) {
  FilmRecipe recipe;
  recipe.width = 96;
  recipe.height = 128;
  recipe.videoCodec = "libvpx-vp9";
  recipe.audioCodec = "libopus";
  recipe.seconds = 2;
  recipe.format = "webm";
  MakeFilm("/tmp/film", recipe);
  EXPECT_EQ(ShownBy("/tmp/film"), "96x128 RGBY");
  EXPECT_EQ(Probe("stream=codec_name", "/tmp/film"), "vp9\nopus\n");
  EXPECT_NEAR(std::stod("0" + Probe("format=duration", "/tmp/film")), 2, 0.1);
}

TEST_F(FilmsTest, HeaderComesFirstWhenAskedFor) {
  FilmRecipe recipe;
  MakeFilm("/tmp/last.mp4", recipe);
  recipe.headerFirst = true;
  MakeFilm("/tmp/first.mp4", recipe);
  const std::string last = ReadFile("/tmp/last.mp4");
  const std::string first = ReadFile("/tmp/first.mp4");
  EXPECT_GT(last.find("moov"), last.find("mdat"));
  EXPECT_LT(first.find("moov"), first.find("mdat"));
}

TEST_F(FilmsTest, CutFilmIsTheBeginningOfTheFilm) {
  const std::string whole = ReadFile(MakeFilm("/tmp/a.mp4"));
  EXPECT_EQ(MakeCutFilm("/tmp/cut.mp4", 300), "/tmp/cut.mp4");
  EXPECT_EQ(ReadFile("/tmp/cut.mp4"), whole.substr(0, 300));
}

}  // namespace
}  // namespace vela_test
