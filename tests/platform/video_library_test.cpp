// When the video library is loaded.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <optional>
#include <string>

#include "support/build_paths.h"
#include "support/files.h"
#include "support/images.h"
#include "support/profile_file.h"
#include "support/program.h"
#include "support/sandbox.h"
#include "support/stub_tool.h"

namespace {

using ::testing::HasSubstr;
using ::testing::Not;

constexpr const char* kThumb = "VELAPHOTO_THUMB_S.jpg";

class VideoLibrary : public vela_test::SandboxTest {};

TEST_F(VideoLibrary, IsNotLoadedWithTheProgram) {
  vela_test::ProgramOptions options;
  options.addedEnvironment = {"LD_TRACE_LOADED_OBJECTS=1"};
  const auto result = vela_test::RunProgram(vela_test::VelathumbPath(), {}, options);
  ASSERT_EQ(result.exitCode, 0) << result.err;
  EXPECT_THAT(result.out, HasSubstr("libjsoncpp.so"));
  EXPECT_THAT(result.out, Not(HasSubstr("libav")));
}

TEST_F(VideoLibrary, IsNotLoadedForPhotos) {
  vela_test::StubTool converter(vela_test::kConverterPath);
  converter.Plan(vela_test::StubPlan().WriteOutputs());
  vela_test::MakeDirectories("/tmp/photos");
  vela_test::MakeJpeg("/tmp/photos/a.jpg");
  vela_test::WriteProfileFile("/tmp/profiles.conf",
                              {{"thumb_s", 120, 70, std::nullopt, kThumb, 0}});
  vela_test::ProgramOptions options;
  options.addedEnvironment = {"LD_DEBUG=files", "LD_DEBUG_OUTPUT=/tmp/loaded"};
  vela_test::Program pass = vela_test::StartProgram(vela_test::VelathumbPath(),
                                                    {"/tmp/profiles.conf", "/tmp/photos"}, options);
  const auto result = pass.Wait();
  ASSERT_TRUE(result);
  ASSERT_EQ(result->exitCode, 0) << result->err;
  ASSERT_TRUE(vela_test::IsRegularFile(std::string("/tmp/photos/@eaDir/a.jpg/") + kThumb));
  const std::string loaded = vela_test::ReadFile("/tmp/loaded." + std::to_string(pass.Pid()));
  EXPECT_THAT(loaded, HasSubstr("libjsoncpp.so"));
  EXPECT_THAT(loaded, Not(HasSubstr("libavformat")));
}

}  // namespace
