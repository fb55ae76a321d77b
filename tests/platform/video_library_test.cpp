// The conditions under which the video library is loaded.
#include <optional>

#include "platform/platform_fixture.h"
#include "support/build_paths.h"
#include "support/images.h"
#include "support/profile_file.h"
#include "support/program.h"
#include "support/stub_tool.h"

namespace vela_test {
namespace {

using ::testing::HasSubstr;
using ::testing::Not;

constexpr const char* kThumb = "VELAPHOTO_THUMB_S.jpg";

class VideoLibrary : public SandboxTest {};

TEST_F(VideoLibrary, IsNotLoadedWithTheProgram) {
  ProgramOptions options;
  options.addedEnvironment = {"LD_TRACE_LOADED_OBJECTS=1"};
  const auto result = RunProgram(VelathumbPath(), {}, options);
  ASSERT_EQ(result.exitCode, 0) << result.err;
  EXPECT_THAT(result.out, HasSubstr("libjsoncpp.so"));
  EXPECT_THAT(result.out, Not(HasSubstr("libav")));
}

TEST_F(VideoLibrary, IsNotLoadedForPhotos) {
  StubTool converter(kConverterPath);
  converter.Plan(StubPlan().WriteOutputs());
  MakeDirectories("/tmp/photos");
  MakeJpeg("/tmp/photos/a.jpg");
  WriteProfileFile("/tmp/profiles.conf", {{"thumb_s", 120, 70, std::nullopt, kThumb, 0}});
  ProgramOptions options;
  options.addedEnvironment = {"LD_DEBUG=files", "LD_DEBUG_OUTPUT=/tmp/loaded"};
  Program pass = StartProgram(VelathumbPath(), {"/tmp/profiles.conf", "/tmp/photos"}, options);
  const auto result = pass.Wait();
  ASSERT_TRUE(result);
  ASSERT_EQ(result->exitCode, 0) << result->err;
  ASSERT_TRUE(IsRegularFile(std::string("/tmp/photos/@eaDir/a.jpg/") + kThumb));
  const std::string loaded = ReadFile("/tmp/loaded." + std::to_string(pass.Pid()));
  EXPECT_THAT(loaded, HasSubstr("libjsoncpp.so"));
  EXPECT_THAT(loaded, Not(HasSubstr("libavformat")));
}

}  // namespace
}  // namespace vela_test
