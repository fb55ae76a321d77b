// Pixel sizes of media files, photos and videos.
#include "header/header_reader.h"
#include "platform/video_fixture.h"

namespace vela_test {
namespace {

std::string SizeOf(const std::string& path) {
  VELA_RESOLUTION resolution = {7, 8};
  if (VELAIDX_GetMediaResolution(path.c_str(), &resolution) != 0) {
    EXPECT_EQ(resolution.width, 7);
    EXPECT_EQ(resolution.height, 8);
    return "failed";
  }
  return std::to_string(resolution.width) + "x" + std::to_string(resolution.height);
}

/// Makes a video of half a second, with more arguments for the output. Returns `path`.
std::string MakeVideo(const std::string& path, const std::string& size = "320x180",
                      const Strings& outputArguments = {}) {
  Strings arguments = {
      "-v", "error", "-y", "-f", "lavfi", "-i", "testsrc=duration=0.5:rate=10:size=" + size};
  arguments.insert(arguments.end(), outputArguments.begin(), outputArguments.end());
  arguments.push_back(path);
  Ffmpeg(arguments);
  return path;
}

class MediaResolution : public SandboxTest {
 protected:
  void TearDown() override { vela::EndHeaderReader(); }
};

TEST_F(MediaResolution, OfPhotos) {
  EXPECT_EQ(SizeOf(MakeImage("/tmp/a.jpg", 123, 45)), "123x45");
  EXPECT_EQ(SizeOf(MakeImage("/tmp/A.PNG", 45, 123)), "45x123");
}

TEST_F(MediaResolution, OfVideosInAllContainers) {
  for (const char* extension : {"mp4", "mov", "mkv", "avi", "webm", "ts", "wmv", "ogv", "flv"}) {
    EXPECT_EQ(SizeOf(MakeVideo(std::string("/tmp/a.") + extension)), "320x180") << extension;
  }
  // These formats allow only a few frame rates and sizes.
  for (const char* path : {"/tmp/a.mpg", "/tmp/a.m2ts"}) {
    EXPECT_EQ(SizeOf(MakeVideo(path, "320x180", {"-r", "25"})), "320x180") << path;
  }
  EXPECT_EQ(SizeOf(MakeVideo("/tmp/a.3gp", "176x144", {"-c:v", "h263"})), "176x144");
}

TEST_F(MediaResolution, IsTheCodedOneWhateverTheRotation) {
  FilmRecipe recipe;
  recipe.rotation = 90;
  EXPECT_EQ(SizeOf(MakeFilm("/tmp/turned.mp4", recipe)), "64x48");
}

TEST_F(MediaResolution, DependsOnTheContentNotTheName) {
  CopyFile(MakeVideo("/tmp/a.mkv"), "/tmp/film with % and \xff");
  EXPECT_EQ(SizeOf("/tmp/film with % and \xff"), "320x180");
}

TEST_F(MediaResolution, FailsWithoutPicture) {
  FilmRecipe recipe;
  recipe.videoCodec.clear();
  recipe.audioCodec = "aac";
  EXPECT_EQ(SizeOf(MakeFilm("/tmp/a.mp4", recipe)), "failed");
}

TEST_F(MediaResolution, FailsForAnythingButMedia) {
  WriteFile("/tmp/empty.mp4", "");
  WriteFile("/tmp/text.mp4", "no film\n");
  WriteFile("/tmp/text.jpg", "no photo\n");
  // Addresses in playlists are not followed.
  WriteFile("/tmp/list.mp4",
            "#EXTM3U\n#EXT-X-TARGETDURATION:5\n#EXTINF:5,\nhttp://127.0.0.1:9/a.ts\n");
  ASSERT_EQ(mkfifo("/tmp/pipe.mp4", 0600), 0);
  for (const char* path : {"/tmp/empty.mp4", "/tmp/text.mp4", "/tmp/text.jpg", "/tmp/list.mp4",
                           "/tmp/pipe.mp4", "/tmp", "/tmp/absent.mp4"}) {
    EXPECT_EQ(SizeOf(path), "failed") << path;
  }
  EXPECT_EQ(VLIBCErrGet(), ENOENT);
  VELA_RESOLUTION resolution;
  EXPECT_EQ(VELAIDX_GetMediaResolution(nullptr, &resolution), -1);
  EXPECT_EQ(VELAIDX_GetMediaResolution("/tmp/a.mp4", nullptr), -1);
}

TEST_F(MediaResolution, FailsForCutVideos) {
  const std::string whole = ReadFile(MakeVideo("/tmp/a.mp4"));
  for (size_t length = 0; length < whole.size(); length += 97) {
    WriteFile("/tmp/cut.mp4", whole.substr(0, length));
    EXPECT_THAT(SizeOf("/tmp/cut.mp4"), testing::AnyOf("failed", "320x180")) << length;
  }
}

TEST_F(MediaResolution, PrintsNothingAndLeavesNoDescriptorOpen) {
  MakeVideo("/tmp/a.mp4");
  WriteFile("/tmp/broken.mp4", ReadFile("/tmp/a.mp4").substr(0, 2000));
  const auto examine = [] {
    for (int i = 0; i < 5; ++i) {
      SizeOf("/tmp/a.mp4");
      SizeOf("/tmp/broken.mp4");
    }
  };
  EXPECT_EQ(PrintedBy([&] {
              SizeOf("/tmp/a.mp4");  // loads the video library
              ExpectNoDescriptorLeak(examine);
            }),
            "");
}

}  // namespace
}  // namespace vela_test
