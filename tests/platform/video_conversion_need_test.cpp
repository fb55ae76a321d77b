// Which videos browsers need a converted film of.
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
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

/// Makes the film under that name and asks about it.
int NeedOf(const std::string& name, const std::string& videoCodec,
           const std::string& audioCodec = std::string(),
           const std::string& format = std::string()) {
  FilmRecipe recipe;
  recipe.videoCodec = videoCodec;
  recipe.audioCodec = audioCodec;
  recipe.format = format;
  return VELAIDX_IsVideoNeedConvert(MakeFilm("/tmp/" + name, recipe).c_str());
}

/// Replaces the brand that the film's first box names as its major one.
void SetBrand(const std::string& path, const std::string& brand) {
  std::string film = vela_test::ReadFile(path);
  ASSERT_EQ(film.substr(4, 4), "ftyp");
  film.replace(8, 4, brand);
  vela_test::WriteFile(path, film);
}

class VideoConversionNeed : public vela_test::SandboxTest {};

TEST_F(VideoConversionNeed, IsNotThereForH264InMp4) {
  EXPECT_EQ(NeedOf("a.mp4", "libx264"), 0);
  EXPECT_EQ(NeedOf("b.mp4", "libx264", "aac"), 0);
  EXPECT_EQ(NeedOf("c.m4v", "libx264", "aac"), 0);
  EXPECT_EQ(NeedOf("d.3gp", "libx264", "aac"), 0);
  EXPECT_EQ(NeedOf("name without extension", "libx264", "aac", "mp4"), 0);
}

TEST_F(VideoConversionNeed, IsThereForOtherSoundInMp4) {
  EXPECT_EQ(NeedOf("a.mp4", "libx264", "libmp3lame"), 1);
  EXPECT_EQ(NeedOf("b.mp4", "libx264", "ac3"), 1);
  EXPECT_EQ(NeedOf("c.mp4", "libx264", "libopus"), 1);
}

TEST_F(VideoConversionNeed, IsThereForOtherPicturesInMp4) {
  EXPECT_EQ(NeedOf("a.mp4", "mpeg4", "aac"), 1);
  EXPECT_EQ(NeedOf("b.mp4", "libx265", "aac"), 1);
  EXPECT_EQ(NeedOf("c.mp4", "libvpx-vp9"), 1);
  EXPECT_EQ(NeedOf("d.mp4", "libaom-av1"), 1);
}

TEST_F(VideoConversionNeed, IsThereForH264InOtherContainers) {
  EXPECT_EQ(NeedOf("a.mkv", "libx264", "aac"), 1);
  EXPECT_EQ(NeedOf("b.mov", "libx264", "aac"), 1);
  EXPECT_EQ(NeedOf("c.flv", "libx264", "aac"), 1);
  EXPECT_EQ(NeedOf("d.ts", "libx264", "aac"), 1);
  EXPECT_EQ(NeedOf("e.avi", "libx264"), 1);
  EXPECT_EQ(NeedOf("f.webm", "libx264", "", "matroska"), 1);
}

TEST_F(VideoConversionNeed, IsThereForOlderVideos) {
  EXPECT_EQ(NeedOf("a.avi", "mpeg4"), 1);
  EXPECT_EQ(NeedOf("b.wmv", "wmv2"), 1);
  EXPECT_EQ(NeedOf("c.mpg", "mpeg2video"), 1);
  EXPECT_EQ(NeedOf("d.ogv", "libtheora"), 1);
}

TEST_F(VideoConversionNeed, IsNotThereForWebm) {
  for (const char* codec : {"libvpx", "libvpx-vp9", "libaom-av1"}) {
    EXPECT_EQ(NeedOf("a.webm", codec), 0) << codec;
    EXPECT_EQ(NeedOf("b.webm", codec, "libvorbis"), 0) << codec;
    EXPECT_EQ(NeedOf("c.webm", codec, "libopus"), 0) << codec;
  }
  EXPECT_EQ(NeedOf("d.WebM", "libvpx"), 0);
}

TEST_F(VideoConversionNeed, IsThereForOtherMatroskaFiles) {
  EXPECT_EQ(NeedOf("a.mkv", "libvpx-vp9"), 1);
  EXPECT_EQ(NeedOf("b.webm", "libvpx-vp9", "aac", "matroska"), 1);
  EXPECT_EQ(NeedOf("c.webm", "libvpx-vp9", "libmp3lame", "matroska"), 1);
  EXPECT_EQ(NeedOf("webm", "libvpx-vp9", "libopus", "webm"), 1);
}

TEST_F(VideoConversionNeed, IsToldByTheContainerNotTheName) {
  EXPECT_EQ(NeedOf("matroska.mp4", "libx264", "aac", "matroska"), 1);
  EXPECT_EQ(NeedOf("quicktime.mp4", "libx264", "aac", "mov"), 1);
  EXPECT_EQ(NeedOf("mp4.mov", "libx264", "aac", "mp4"), 0);
  EXPECT_EQ(NeedOf("mp4.webm", "libvpx-vp9", "", "mp4"), 1);
}

TEST_F(VideoConversionNeed, GoesByTheBrand) {
  EXPECT_EQ(NeedOf("a.mp4", "libx264"), 0);
  for (const char* brand : {"mp41", "mp42", "avc1", "iso6", "M4V "}) {
    SetBrand("/tmp/a.mp4", brand);
    EXPECT_EQ(VELAIDX_IsVideoNeedConvert("/tmp/a.mp4"), 0) << brand;
  }
  SetBrand("/tmp/a.mp4", "qt  ");
  EXPECT_EQ(VELAIDX_IsVideoNeedConvert("/tmp/a.mp4"), 1);
}

TEST_F(VideoConversionNeed, IsThereForQuicktimeWithoutBrand) {
  ASSERT_EQ(NeedOf("a.mov", "libx264"), 1);
  // A box of this type is stepped over.
  std::string film = vela_test::ReadFile("/tmp/a.mov");
  ASSERT_EQ(film.substr(4, 4), "ftyp");
  film.replace(4, 4, "free");
  vela_test::WriteFile("/tmp/a.mov", film);
  EXPECT_EQ(VELAIDX_IsVideoNeedConvert("/tmp/a.mov"), 1);
}

TEST_F(VideoConversionNeed, GoesByTheFirstSound) {
  FilmRecipe recipe;
  recipe.audioCodec = "aac";
  MakeFilm("/tmp/aac.mp4", recipe);
  const auto make = [](const char* first, const char* second, const char* path) {
    const auto result =
        vela_test::RunProgram("/usr/bin/ffmpeg", {"-v", "error", "-i", "/tmp/aac.mp4", "-map",
                                                  "0:v", "-map", "0:a", "-map", "0:a", "-c:v",
                                                  "copy", "-c:a:0", first, "-c:a:1", second, path});
    ASSERT_EQ(result.exitCode, 0) << result.err;
  };
  make("copy", "ac3", "/tmp/first.mp4");
  EXPECT_EQ(VELAIDX_IsVideoNeedConvert("/tmp/first.mp4"), 0);
  make("ac3", "copy", "/tmp/second.mp4");
  EXPECT_EQ(VELAIDX_IsVideoNeedConvert("/tmp/second.mp4"), 1);
}

TEST_F(VideoConversionNeed, IsTheSameForATurnedFilm) {
  FilmRecipe recipe;
  recipe.rotation = 90;
  EXPECT_EQ(VELAIDX_IsVideoNeedConvert(MakeFilm("/tmp/a.mp4", recipe).c_str()), 0);
}

TEST_F(VideoConversionNeed, IsUnknownForCutFilmsWithoutHeader) {
  FilmRecipe recipe;
  MakeFilm("/tmp/a.mp4", recipe);
  const auto size = static_cast<size_t>(vela_test::FileSize("/tmp/a.mp4"));
  vela_test::MakeCutFilm("/tmp/a.mp4", size / 4, recipe);
  EXPECT_EQ(VELAIDX_IsVideoNeedConvert("/tmp/a.mp4"), -1);
  vela_test::MakeCutFilm("/tmp/a.mkv", 20, recipe);
  EXPECT_EQ(VELAIDX_IsVideoNeedConvert("/tmp/a.mkv"), -1);
  recipe.headerFirst = true;
  vela_test::MakeCutFilm("/tmp/a.mp4", size - 100, recipe);
  EXPECT_EQ(VELAIDX_IsVideoNeedConvert("/tmp/a.mp4"), 0);
}

TEST_F(VideoConversionNeed, IsUnknownWithoutPicture) {
  EXPECT_EQ(NeedOf("a.mp4", "", "aac"), -1);
  EXPECT_EQ(NeedOf("a.webm", "", "libopus"), -1);
}

TEST_F(VideoConversionNeed, IsUnknownForAnythingButVideos) {
  vela_test::WriteFile("/tmp/empty.mp4", "");
  vela_test::WriteFile("/tmp/text.mp4", "no film\n");
  vela_test::WriteFile("/tmp/list.mp4", "#EXTM3U\n#EXTINF:1,\n/tmp/a.mp4\n");
  vela_test::MakeImage("/tmp/photo.png", 64, 48);
  MakeFilm("/tmp/a.mp4");
  ASSERT_EQ(mkfifo("/tmp/pipe.mp4", 0600), 0);
  for (const char* path : {"/tmp/empty.mp4", "/tmp/text.mp4", "/tmp/list.mp4", "/tmp/photo.png",
                           "/tmp/pipe.mp4", "/tmp", ""}) {
    EXPECT_EQ(VELAIDX_IsVideoNeedConvert(path), -1) << path;
  }
}

TEST_F(VideoConversionNeed, TellsWhyItIsUnknown) {
  EXPECT_EQ(VELAIDX_IsVideoNeedConvert("/tmp/absent.mp4"), -1);
  EXPECT_EQ(VLIBCErrGet(), ENOENT);
  EXPECT_EQ(VELAIDX_IsVideoNeedConvert("/tmp"), -1);
  EXPECT_EQ(VLIBCErrGet(), EINVAL);
  EXPECT_EQ(VELAIDX_IsVideoNeedConvert("/tmp/absent.mp4"), -1);
  EXPECT_EQ(VLIBCErrGet(), ENOENT);
  EXPECT_EQ(VELAIDX_IsVideoNeedConvert(nullptr), -1);
  EXPECT_EQ(VLIBCErrGet(), EINVAL);
}

TEST_F(VideoConversionNeed, OfFilmsWithOddNames) {
  ASSERT_EQ(chdir("/tmp"), 0);
  for (const char* name : {"two  words .mp4", "100%03d%s.mp4", "http:a.mp4", "pipe:0.mp4", "-i.mp4",
                           "\xff\xfe.mp4", "two\nlines.mp4", "it's \"q\" $HOME `x`;.mp4"}) {
    MakeFilm(name);
    EXPECT_EQ(VELAIDX_IsVideoNeedConvert(name), 0) << name;
    EXPECT_EQ(VELAIDX_IsVideoNeedConvert((std::string("/tmp/") + name).c_str()), 0) << name;
  }
}

TEST_F(VideoConversionNeed, PrintsNothingAndLeavesNoDescriptorOpen) {
  MakeFilm("/tmp/a.mp4");
  vela_test::MakeCutFilm("/tmp/broken.mp4", 500);
  const int result = platform_test::RunForked([] {
    if (freopen("/tmp/printed", "w", stderr) == nullptr) return 1;
    VELAIDX_IsVideoNeedConvert("/tmp/a.mp4");
    const int before = platform_test::CountDescriptors();
    for (int i = 0; i < 5; ++i) {
      if (VELAIDX_IsVideoNeedConvert("/tmp/a.mp4") != 0) return 2;
      if (VELAIDX_IsVideoNeedConvert("/tmp/broken.mp4") != -1) return 3;
    }
    fflush(stderr);
    return platform_test::CountDescriptors() == before ? 0 : 4;
  });
  EXPECT_EQ(result, 0);
  EXPECT_EQ(vela_test::ReadFile("/tmp/printed"), "");
}

}  // namespace
