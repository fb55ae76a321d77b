// Which videos need a converted version for browsers.
#include "platform/video_fixture.h"
#include "support/named_case.h"

namespace vela_test {
namespace {

int NeedOf(const std::string& path) {
  return VELAIDX_IsVideoNeedConvert(path.c_str());
}

/// Replaces the major brand in the video's first box.
void SetBrand(const std::string& path, const std::string& brand) {
  std::string film = ReadFile(path);
  ASSERT_EQ(film.substr(4, 4), "ftyp");
  film.replace(8, 4, brand);
  WriteFile(path, film);
}

class VideoConversionNeed : public SandboxTest {};

struct NeedCase {
  const char* file;
  const char* videoCodec;
  const char* audioCodec;
  const char* format;  ///< "": that of the file's extension
  int need;
};

struct NeedGroup : NamedCase {
  std::vector<NeedCase> cases;
};

class VideoKinds : public SandboxTest, public testing::WithParamInterface<NeedGroup> {};

TEST_P(VideoKinds, NeedConversion) {
  for (const NeedCase& video : GetParam().cases) {
    FilmRecipe recipe;
    recipe.videoCodec = video.videoCodec;
    recipe.audioCodec = video.audioCodec;
    recipe.format = video.format;
    EXPECT_EQ(NeedOf(MakeFilm(std::string("/tmp/") + video.file, recipe)), video.need)
        << video.file << " " << video.videoCodec << " " << video.audioCodec;
  }
}

const NeedGroup kNeedGroups[] = {
    {"H264InMp4",
     {{"a.mp4", "libx264", "", "", 0},
      {"b.mp4", "libx264", "aac", "", 0},
      {"c.m4v", "libx264", "aac", "", 0},
      {"d.3gp", "libx264", "aac", "", 0},
      {"name without extension", "libx264", "aac", "mp4", 0}}},
    {"OtherSoundInMp4",
     {{"a.mp4", "libx264", "libmp3lame", "", 1},
      {"b.mp4", "libx264", "ac3", "", 1},
      {"c.mp4", "libx264", "libopus", "", 1}}},
    {"OtherPicturesInMp4",
     {{"a.mp4", "mpeg4", "aac", "", 1},
      {"b.mp4", "libx265", "aac", "", 1},
      {"c.mp4", "libvpx-vp9", "", "", 1},
      {"d.mp4", "libaom-av1", "", "", 1}}},
    {"H264InOtherContainers",
     {{"a.mkv", "libx264", "aac", "", 1},
      {"b.mov", "libx264", "aac", "", 1},
      {"c.flv", "libx264", "aac", "", 1},
      {"d.ts", "libx264", "aac", "", 1},
      {"e.avi", "libx264", "", "", 1},
      {"f.webm", "libx264", "", "matroska", 1}}},
    {"OlderVideos",
     {{"a.avi", "mpeg4", "", "", 1},
      {"b.wmv", "wmv2", "", "", 1},
      {"c.mpg", "mpeg2video", "", "", 1},
      {"d.ogv", "libtheora", "", "", 1}}},
    {"Webm",
     {{"a.webm", "libvpx", "", "", 0},
      {"a.webm", "libvpx-vp9", "", "", 0},
      {"a.webm", "libaom-av1", "", "", 0},
      {"b.webm", "libvpx", "libvorbis", "", 0},
      {"b.webm", "libvpx-vp9", "libvorbis", "", 0},
      {"b.webm", "libaom-av1", "libvorbis", "", 0},
      {"c.webm", "libvpx", "libopus", "", 0},
      {"c.webm", "libvpx-vp9", "libopus", "", 0},
      {"c.webm", "libaom-av1", "libopus", "", 0},
      {"d.WebM", "libvpx", "", "", 0}}},
    {"OtherMatroskaFiles",
     {{"a.mkv", "libvpx-vp9", "", "", 1},
      {"b.webm", "libvpx-vp9", "aac", "matroska", 1},
      {"c.webm", "libvpx-vp9", "libmp3lame", "matroska", 1},
      {"webm", "libvpx-vp9", "libopus", "webm", 1}}},
    {"ContainersUnderAnotherName",
     {{"matroska.mp4", "libx264", "aac", "matroska", 1},
      {"quicktime.mp4", "libx264", "aac", "mov", 1},
      {"mp4.mov", "libx264", "aac", "mp4", 0},
      {"mp4.webm", "libvpx-vp9", "", "mp4", 1}}},
    {"WithoutPicture", {{"a.mp4", "", "aac", "", -1}, {"a.webm", "", "libopus", "", -1}}},
};

INSTANTIATE_TEST_SUITE_P(VideoConversionNeed, VideoKinds, testing::ValuesIn(kNeedGroups),
                         CaseName());

TEST_F(VideoConversionNeed, DependsOnTheBrand) {
  EXPECT_EQ(NeedOf(MakeFilm("/tmp/a.mp4")), 0);
  for (const char* brand : {"mp41", "mp42", "avc1", "iso6", "M4V "}) {
    SetBrand("/tmp/a.mp4", brand);
    EXPECT_EQ(NeedOf("/tmp/a.mp4"), 0) << brand;
  }
  SetBrand("/tmp/a.mp4", "qt  ");
  EXPECT_EQ(NeedOf("/tmp/a.mp4"), 1);
}

TEST_F(VideoConversionNeed, ExistsForQuicktimeWithoutBrand) {
  ASSERT_EQ(NeedOf(MakeFilm("/tmp/a.mov")), 1);
  // Readers skip a box of this type.
  std::string film = ReadFile("/tmp/a.mov");
  ASSERT_EQ(film.substr(4, 4), "ftyp");
  film.replace(4, 4, "free");
  WriteFile("/tmp/a.mov", film);
  EXPECT_EQ(NeedOf("/tmp/a.mov"), 1);
}

TEST_F(VideoConversionNeed, DependsOnTheFirstSound) {
  FilmRecipe recipe;
  recipe.audioCodec = "aac";
  MakeFilm("/tmp/aac.mp4", recipe);
  const auto needOf = [](const char* first, const char* second, const char* path) {
    Ffmpeg({"-v", "error", "-i", "/tmp/aac.mp4", "-map", "0:v", "-map", "0:a", "-map", "0:a",
            "-c:v", "copy", "-c:a:0", first, "-c:a:1", second, path});
    return NeedOf(path);
  };
  EXPECT_EQ(needOf("copy", "ac3", "/tmp/first.mp4"), 0);
  EXPECT_EQ(needOf("ac3", "copy", "/tmp/second.mp4"), 1);
}

TEST_F(VideoConversionNeed, IsTheSameForATurnedVideo) {
  FilmRecipe recipe;
  recipe.rotation = 90;
  EXPECT_EQ(NeedOf(MakeFilm("/tmp/a.mp4", recipe)), 0);
}

TEST_F(VideoConversionNeed, IsUnknownForCutVideosWithoutHeader) {
  FilmRecipe recipe;
  MakeFilm("/tmp/a.mp4", recipe);
  const auto size = static_cast<size_t>(FileSize("/tmp/a.mp4"));
  EXPECT_EQ(NeedOf(MakeCutFilm("/tmp/a.mp4", size / 4, recipe)), -1);
  EXPECT_EQ(NeedOf(MakeCutFilm("/tmp/a.mkv", 20, recipe)), -1);
  recipe.headerFirst = true;
  EXPECT_EQ(NeedOf(MakeCutFilm("/tmp/a.mp4", size - 100, recipe)), 0);
}

TEST_F(VideoConversionNeed, IsUnknownForAnythingButVideos) {
  for (const std::string& path : MakeFilesThatAreNoVideos()) EXPECT_EQ(NeedOf(path), -1) << path;
}

TEST_F(VideoConversionNeed, ReportsWhyItIsUnknown) {
  EXPECT_EQ(NeedOf("/tmp/absent.mp4"), -1);
  EXPECT_EQ(VLIBCErrGet(), ENOENT);
  EXPECT_EQ(NeedOf("/tmp"), -1);
  EXPECT_EQ(VLIBCErrGet(), EINVAL);
  EXPECT_EQ(NeedOf("/tmp/absent.mp4"), -1);
  EXPECT_EQ(VLIBCErrGet(), ENOENT);
  EXPECT_EQ(VELAIDX_IsVideoNeedConvert(nullptr), -1);
  EXPECT_EQ(VLIBCErrGet(), EINVAL);
}

TEST_F(VideoConversionNeed, OfVideosWithOddNames) {
  ASSERT_EQ(chdir("/tmp"), 0);
  for (const std::string& name : kOddNames) {
    EXPECT_EQ(NeedOf(MakeFilm(name)), 0) << name;
    EXPECT_EQ(NeedOf("/tmp/" + name), 0) << name;
  }
}

TEST_F(VideoConversionNeed, PrintsNothingAndLeavesNoDescriptorOpen) {
  MakeFilm("/tmp/a.mp4");
  MakeCutFilm("/tmp/broken.mp4", 500);
  const auto examine = [] {
    for (int i = 0; i < 5; ++i) {
      EXPECT_EQ(NeedOf("/tmp/a.mp4"), 0);
      EXPECT_EQ(NeedOf("/tmp/broken.mp4"), -1);
    }
  };
  EXPECT_EQ(PrintedBy([&] {
              NeedOf("/tmp/a.mp4");  // loads the video library
              ExpectNoDescriptorLeak(examine);
            }),
            "");
}

}  // namespace
}  // namespace vela_test
