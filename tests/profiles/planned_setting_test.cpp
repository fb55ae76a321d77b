// Adding a setting to a job.
#include <gmock/gmock.h>

#include "profiles/photo_thumb_plan.h"
#include "support/files.h"
#include "support/sandbox.h"

namespace vela_test {
namespace {

using ::testing::IsEmpty;
using ::testing::SizeIs;

class PlannedSetting : public SandboxTest {};

TEST_F(PlannedSetting, GetsATemporaryNameAndIsCopied) {
  MakeDirectories("/tmp/out");
  PhotoConvertJob job;
  PhotoThumbSetting setting;
  setting.srcPath = "/tmp/a.jpg";
  setting.destPath = "/tmp/out/thumb.png";
  setting.outDir = "/tmp/out";
  setting.width = 7;
  setting.fillArea = true;
  AddPhotoThumbSetting(job, setting);
  EXPECT_THAT(setting.tempPath,
              ::testing::MatchesRegex("/tmp/out/VELAPHOTO\\.tmp\\.[^./]{6}\\.png"));
  ASSERT_THAT(job.settings, SizeIs(1));
  EXPECT_EQ(job.settings[0].tempPath, setting.tempPath);
  EXPECT_EQ(job.settings[0].destPath, "/tmp/out/thumb.png");
  EXPECT_EQ(job.settings[0].srcPath, "/tmp/a.jpg");
  EXPECT_EQ(job.settings[0].width, 7);
  EXPECT_TRUE(job.settings[0].fillArea);
  setting.destPath = "/tmp/out/other";
  setting.width = 8;
  AddPhotoThumbSetting(job, setting);
  ASSERT_THAT(job.settings, SizeIs(2));
  EXPECT_EQ(job.settings[0].width, 7);
  EXPECT_EQ(job.settings[1].width, 8);
  EXPECT_NE(job.settings[0].tempPath, job.settings[1].tempPath);
  EXPECT_THAT(ListDirectory("/tmp/out"), IsEmpty());
}

}  // namespace
}  // namespace vela_test
