// Pixel sizes of media files, photos and videos.
#include <sys/stat.h>

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

std::string SizeOf(const std::string& path) {
  VELA_RESOLUTION resolution = {7, 8};
  if (VELAIDX_GetMediaResolution(path.c_str(), &resolution) != 0) {
    EXPECT_EQ(resolution.width, 7);
    EXPECT_EQ(resolution.height, 8);
    return "failed";
  }
  return std::to_string(resolution.width) + "x" + std::to_string(resolution.height);
}

/// A video of half a second; `arguments` stand between input and output.
void MakeVideo(const std::string& path, const std::string& size,
               const std::vector<std::string>& arguments = {}) {
  std::vector<std::string> all = {
      "-v", "error", "-y", "-f", "lavfi", "-i", "testsrc=duration=0.5:rate=10:size=" + size};
  all.insert(all.end(), arguments.begin(), arguments.end());
  all.push_back(path);
  const auto result = vela_test::RunProgram("/usr/bin/ffmpeg", all);
  ASSERT_EQ(result.exitCode, 0) << result.err;
}

class MediaResolution : public vela_test::SandboxTest {};

TEST_F(MediaResolution, OfPhotos) {
  vela_test::MakeImage("/tmp/a.jpg", 123, 45);
  EXPECT_EQ(SizeOf("/tmp/a.jpg"), "123x45");
  vela_test::MakeImage("/tmp/A.PNG", 45, 123);
  EXPECT_EQ(SizeOf("/tmp/A.PNG"), "45x123");
}

TEST_F(MediaResolution, OfVideosInAllContainers) {
  for (const char* name : {"a.mp4", "a.mov", "a.mkv", "a.avi", "a.webm", "a.mpg", "a.ts", "a.wmv",
                           "a.ogv", "a.3gp", "a.m2ts"}) {
    const std::string path = std::string("/tmp/") + name;
    const bool isSmallFormat = std::string(name) == "a.3gp";
    const std::vector<std::string> arguments =
        isSmallFormat ? std::vector<std::string>{"-c:v", "h263"} : std::vector<std::string>();
    const std::string size = isSmallFormat ? "176x144" : "320x180";
    std::vector<std::string> all = arguments;
    if (std::string(name) == "a.mpg" || std::string(name) == "a.m2ts") {
      all.insert(all.end(), {"-r", "25"});
    }
    MakeVideo(path, size, all);
    EXPECT_EQ(SizeOf(path), size) << name;
  }
}

TEST_F(MediaResolution, OfAFlashVideo) {
  MakeVideo("/tmp/a.flv", "320x180");
  EXPECT_EQ(SizeOf("/tmp/a.flv"), "320x180");
}

TEST_F(MediaResolution, IsTheCodedOneWhateverTheRotation) {
  vela_test::FilmRecipe recipe;
  recipe.rotation = 90;
  vela_test::MakeFilm("/tmp/turned.mp4", recipe);
  EXPECT_EQ(SizeOf("/tmp/turned.mp4"), "64x48");
}

TEST_F(MediaResolution, IsToldByTheContentNotTheName) {
  MakeVideo("/tmp/a.mkv", "320x180");
  vela_test::CopyFile("/tmp/a.mkv", "/tmp/film with % and \xff");
  EXPECT_EQ(SizeOf("/tmp/film with % and \xff"), "320x180");
}

TEST_F(MediaResolution, FailsWithoutPicture) {
  vela_test::FilmRecipe recipe;
  recipe.videoCodec.clear();
  recipe.audioCodec = "aac";
  vela_test::MakeFilm("/tmp/a.mp4", recipe);
  EXPECT_EQ(SizeOf("/tmp/a.mp4"), "failed");
}

TEST_F(MediaResolution, FailsForAnythingButMedia) {
  vela_test::WriteFile("/tmp/empty.mp4", "");
  vela_test::WriteFile("/tmp/text.mp4", "no film\n");
  vela_test::WriteFile("/tmp/text.jpg", "no photo\n");
  EXPECT_EQ(SizeOf("/tmp/empty.mp4"), "failed");
  EXPECT_EQ(SizeOf("/tmp/text.mp4"), "failed");
  EXPECT_EQ(SizeOf("/tmp/text.jpg"), "failed");
  EXPECT_EQ(SizeOf("/tmp"), "failed");
  EXPECT_EQ(SizeOf("/tmp/absent.mp4"), "failed");
  EXPECT_EQ(VLIBCErrGet(), ENOENT);
  ASSERT_EQ(mkfifo("/tmp/pipe.mp4", 0600), 0);
  EXPECT_EQ(SizeOf("/tmp/pipe.mp4"), "failed");
  VELA_RESOLUTION resolution;
  EXPECT_EQ(VELAIDX_GetMediaResolution(nullptr, &resolution), -1);
  EXPECT_EQ(VELAIDX_GetMediaResolution("/tmp/a.mp4", nullptr), -1);
}

TEST_F(MediaResolution, FailsForCutVideos) {
  MakeVideo("/tmp/a.mp4", "320x180");
  const std::string whole = vela_test::ReadFile("/tmp/a.mp4");
  for (size_t length = 0; length < whole.size(); length += 97) {
    vela_test::WriteFile("/tmp/cut.mp4", whole.substr(0, length));
    const std::string cut = SizeOf("/tmp/cut.mp4");
    EXPECT_TRUE(cut == "failed" || cut == "320x180") << length << ": " << cut;
  }
}

TEST_F(MediaResolution, FollowsNoAddressInAPlaylist) {
  vela_test::WriteFile("/tmp/list.mp4",
                       "#EXTM3U\n#EXT-X-TARGETDURATION:5\n#EXTINF:5,\nhttp://127.0.0.1:9/a.ts\n");
  EXPECT_EQ(SizeOf("/tmp/list.mp4"), "failed");
}

TEST_F(MediaResolution, PrintsNothingAndLeavesNoDescriptorOpen) {
  MakeVideo("/tmp/a.mp4", "320x180");
  vela_test::WriteFile("/tmp/broken.mp4", vela_test::ReadFile("/tmp/a.mp4").substr(0, 2000));
  const int result = platform_test::RunForked([] {
    if (freopen("/tmp/printed", "w", stderr) == nullptr) return 1;
    SizeOf("/tmp/a.mp4");
    const int before = platform_test::CountDescriptors();
    for (int i = 0; i < 5; ++i) {
      SizeOf("/tmp/a.mp4");
      SizeOf("/tmp/broken.mp4");
    }
    fflush(stderr);
    return platform_test::CountDescriptors() == before ? 0 : 2;
  });
  EXPECT_EQ(result, 0);
  EXPECT_EQ(vela_test::ReadFile("/tmp/printed"), "");
}

}  // namespace
