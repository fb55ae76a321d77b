// When the video library is loaded.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

#include "support/build_paths.h"
#include "support/program.h"
#include "support/sandbox.h"

namespace {

using ::testing::HasSubstr;
using ::testing::Not;

class VideoLibrary : public vela_test::SandboxTest {};

TEST_F(VideoLibrary, IsNotLoadedWithTheProgram) {
  vela_test::ProgramOptions options;
  options.addedEnvironment = {"LD_TRACE_LOADED_OBJECTS=1"};
  const auto result = vela_test::RunProgram(vela_test::VelathumbPath(), {}, options);
  ASSERT_EQ(result.exitCode, 0) << result.err;
  EXPECT_THAT(result.out, HasSubstr("libjsoncpp.so"));
  EXPECT_THAT(result.out, Not(HasSubstr("libav")));
}

}  // namespace
