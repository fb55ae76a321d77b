// The records of a converter run.
#include <gmock/gmock.h>

#include <type_traits>
#include <utility>

#include "convert/photo_convert_job.h"

namespace vela_test {
namespace {

/// A setting in which no field has its first value.
PhotoThumbSetting FilledSetting() {
  PhotoThumbSetting setting;
  setting.srcPath = "source";
  setting.destPath = "destination";
  setting.outDir = "directory";
  setting.tempPath = "temporary";
  setting.fillArea = true;
  setting.width = 1;
  setting.height = 2;
  setting.quality = 3;
  setting.stripProfiles = false;
  setting.flatten = false;
  setting.autoOrient = true;
  setting.rotate = 4;
  setting.unsharp = "unsharp";
  setting.colorspace = "Gray";
  return setting;
}

void ExpectFilledButFillArea(const PhotoThumbSetting& setting) {
  EXPECT_EQ(setting.srcPath, "source");
  EXPECT_EQ(setting.destPath, "destination");
  EXPECT_EQ(setting.outDir, "directory");
  EXPECT_EQ(setting.tempPath, "temporary");
  EXPECT_EQ(setting.width, 1);
  EXPECT_EQ(setting.height, 2);
  EXPECT_EQ(setting.quality, 3);
  EXPECT_FALSE(setting.stripProfiles);
  EXPECT_FALSE(setting.flatten);
  EXPECT_TRUE(setting.autoOrient);
  EXPECT_EQ(setting.rotate, 4);
  EXPECT_EQ(setting.unsharp, "unsharp");
  EXPECT_EQ(setting.colorspace, "Gray");
}

TEST(PhotoThumbSetting, NewOnesHoldTheDefaults) {
  const PhotoThumbSetting setting;
  EXPECT_EQ(setting.srcPath, "");
  EXPECT_EQ(setting.destPath, "");
  EXPECT_EQ(setting.outDir, "");
  EXPECT_EQ(setting.tempPath, "");
  EXPECT_FALSE(setting.fillArea);
  EXPECT_EQ(setting.width, 320);
  EXPECT_EQ(setting.height, 320);
  EXPECT_EQ(setting.quality, 90);
  EXPECT_TRUE(setting.stripProfiles);
  EXPECT_TRUE(setting.flatten);
  EXPECT_FALSE(setting.autoOrient);
  EXPECT_EQ(setting.rotate, -1);
  EXPECT_EQ(setting.unsharp, "");
  EXPECT_EQ(setting.colorspace, "sRGB");
}

TEST(PhotoThumbSetting, CopyConstructionCopiesEveryField) {
  const PhotoThumbSetting original = FilledSetting();
  const PhotoThumbSetting copy(original);
  ExpectFilledButFillArea(copy);
  EXPECT_TRUE(copy.fillArea);
}

TEST(PhotoThumbSetting, CopyAssignmentKeepsTheFillMode) {
  const PhotoThumbSetting original = FilledSetting();
  PhotoThumbSetting target;
  target = original;
  ExpectFilledButFillArea(target);
  EXPECT_FALSE(target.fillArea);

  PhotoThumbSetting filling = FilledSetting();
  filling = PhotoThumbSetting();
  EXPECT_TRUE(filling.fillArea);
  EXPECT_EQ(filling.width, 320);
  EXPECT_EQ(filling.srcPath, "");
}

TEST(PhotoThumbSetting, MovingIsCopying) {
  PhotoThumbSetting original = FilledSetting();
  const PhotoThumbSetting constructed(std::move(original));
  EXPECT_TRUE(constructed.fillArea);
  PhotoThumbSetting target;
  PhotoThumbSetting another = FilledSetting();
  target = std::move(another);
  ExpectFilledButFillArea(target);
  EXPECT_FALSE(target.fillArea);
}

TEST(PhotoThumbSetting, SelfAssignmentChangesNothing) {
  PhotoThumbSetting setting = FilledSetting();
  const PhotoThumbSetting& same = setting;
  setting = same;
  ExpectFilledButFillArea(setting);
  EXPECT_TRUE(setting.fillArea);
}

TEST(PhotoThumbSetting, NumbersHave32Bits) {
  EXPECT_TRUE((std::is_same_v<decltype(PhotoThumbSetting::width), int32_t>));
  EXPECT_TRUE((std::is_same_v<decltype(PhotoThumbSetting::height), int32_t>));
  EXPECT_TRUE((std::is_same_v<decltype(PhotoThumbSetting::quality), int32_t>));
  EXPECT_TRUE((std::is_same_v<decltype(PhotoThumbSetting::rotate), int32_t>));
}

TEST(PhotoConvertJob, NewOnesKnowTheConverterAndNothingElse) {
  const PhotoConvertJob job;
  EXPECT_EQ(job.toolPath, "/usr/vela/bin/convert-thumb");
  EXPECT_TRUE(job.settings.empty());
}

TEST(PhotoConvertJob, OwnsItsSettings) {
  PhotoThumbSetting setting = FilledSetting();
  PhotoConvertJob job;
  job.settings.push_back(setting);
  setting.width = 99;
  EXPECT_EQ(job.settings.front().width, 1);
  EXPECT_TRUE(job.settings.front().fillArea);
}

}  // namespace
}  // namespace vela_test
