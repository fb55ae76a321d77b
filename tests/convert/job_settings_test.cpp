// The records of a converter run and the order of a job's settings.
#include <gmock/gmock.h>

#include <sstream>
#include <type_traits>
#include <utility>

#include "convert/convert_fixture.h"
#include "convert/photo_convert_job.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;

class SettingOrder : public ConvertTest {
 protected:
  static std::vector<int> Widths(const PhotoConvertJob& job) {
    std::vector<int> widths;
    for (const PhotoThumbSetting& setting : job.settings) {
      widths.push_back(setting.width);
    }
    return widths;
  }
};

TEST_F(SettingOrder, IsByDescendingWidth) {
  PhotoThumbSetting wide = MakeSetting(640);
  PhotoThumbSetting narrow = MakeSetting(320);
  narrow.height = 9999;
  narrow.quality = 100;
  EXPECT_TRUE(SortPhotoThumbSetting(wide, narrow));
  EXPECT_FALSE(SortPhotoThumbSetting(narrow, wide));
  EXPECT_FALSE(SortPhotoThumbSetting(wide, MakeSetting(640)));
  EXPECT_TRUE(SortPhotoThumbSetting(MakeSetting(0), MakeSetting(-1)));
}

TEST_F(SettingOrder, TheRunSortsTheJob) {
  PhotoConvertJob job = MakeJob({320, 1280, 120});
  EXPECT_EQ(RunPhotoConvertJob(job), 0);
  EXPECT_THAT(Widths(job), ElementsAre(1280, 320, 120));
  EXPECT_EQ(job.settings[0].destPath, ThumbPath(1280));
  EXPECT_EQ(job.settings[2].tempPath, TempPath(120));
}

TEST_F(SettingOrder, TheJobIsSortedEvenIfThePhotoIsMissing) {
  PhotoConvertJob job = MakeJob({320, 1280});
  RemoveTree(kPhoto);
  EXPECT_EQ(RunPhotoConvertJob(job), -1);
  EXPECT_THAT(Widths(job), ElementsAre(1280, 320));
  EXPECT_THAT(TakeErrorLines(),
              ElementsAre("velamk_photo_thumb:117 [Error] failed to stat file: /tmp/photo/a.jpg"));
}

TEST_F(SettingOrder, FillModesStayAtTheirPositions) {
  // The sort algorithm differs between long and short jobs.
  for (const int count : {1, 2, 3, 5, 16, 17, 40, 200}) {
    SCOPED_TRACE(count);
    PhotoConvertJob job;
    std::vector<int> expected;
    for (int i = 0; i < count; ++i) {
      job.settings.push_back(MakeSetting((i * 7919) % count + 1, i % 3 == 0));
      expected.push_back(count - i);
    }
    Converter().Plan(StubPlan().Exit(1));
    EXPECT_EQ(RunPhotoConvertJob(job), -1);
    EXPECT_EQ(Widths(job), expected);
    for (int i = 0; i < count; ++i) {
      EXPECT_EQ(job.settings[static_cast<size_t>(i)].fillArea, i % 3 == 0) << "position " << i;
    }
  }
}

TEST_F(SettingOrder, OutputsAreCommittedInThisOrder) {
  // The converter writes nothing, so that every commit logs a line.
  Converter().Plan(StubPlan());
  PhotoConvertJob job = MakeJob({320, 1280, 120});
  EXPECT_EQ(RunPhotoConvertJob(job), -1);
  const std::string beginning = "velamk_photo_thumb:430 [Error] rename: ";
  EXPECT_THAT(TakeErrorLines(), ElementsAre(beginning + TempPath(1280) + ", " + ThumbPath(1280),
                                            beginning + TempPath(320) + ", " + ThumbPath(320),
                                            beginning + TempPath(120) + ", " + ThumbPath(120)));
}

/// A setting in which no field has its default value.
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

std::string Described(const PhotoThumbSetting& setting) {
  std::ostringstream text;
  text << std::boolalpha << setting.srcPath << "|" << setting.destPath << "|" << setting.outDir
       << "|" << setting.tempPath << "|" << setting.width << "x" << setting.height << ", quality "
       << setting.quality << ", strip " << setting.stripProfiles << ", flatten " << setting.flatten
       << ", orient " << setting.autoOrient << ", rotate " << setting.rotate << ", unsharp "
       << setting.unsharp << ", " << setting.colorspace << ", fill " << setting.fillArea;
  return text.str();
}

/// All fields but the last, the fill mode.
const std::string kDefaults =
    "||||320x320, quality 90, strip true, flatten true, orient false, rotate -1, unsharp , sRGB";
const std::string kFilled =
    "source|destination|directory|temporary|1x2, quality 3, strip false, flatten false, "
    "orient true, rotate 4, unsharp unsharp, Gray";

TEST(PhotoThumbSetting, NewOnesHoldTheDefaults) {
  EXPECT_EQ(Described(PhotoThumbSetting()), kDefaults + ", fill false");
}

TEST(PhotoThumbSetting, ConstructionCopiesEveryField) {
  PhotoThumbSetting original = FilledSetting();
  const PhotoThumbSetting copy(original);
  EXPECT_EQ(Described(copy), kFilled + ", fill true");
  const PhotoThumbSetting moved(std::move(original));
  EXPECT_EQ(Described(moved), kFilled + ", fill true");
}

TEST(PhotoThumbSetting, AssignmentKeepsTheFillMode) {
  const PhotoThumbSetting original = FilledSetting();
  PhotoThumbSetting target;
  target = original;
  EXPECT_EQ(Described(target), kFilled + ", fill false");
  PhotoThumbSetting moved;
  moved = FilledSetting();
  EXPECT_EQ(Described(moved), kFilled + ", fill false");
  PhotoThumbSetting filling = FilledSetting();
  filling = PhotoThumbSetting();
  EXPECT_EQ(Described(filling), kDefaults + ", fill true");
}

TEST(PhotoThumbSetting, SelfAssignmentChangesNothing) {
  PhotoThumbSetting setting = FilledSetting();
  const PhotoThumbSetting& same = setting;
  setting = same;
  EXPECT_EQ(Described(setting), kFilled + ", fill true");
}

TEST(PhotoThumbSetting, NumbersHave32Bits) {
  EXPECT_TRUE((std::is_same_v<decltype(PhotoThumbSetting::width), int32_t>));
  EXPECT_TRUE((std::is_same_v<decltype(PhotoThumbSetting::height), int32_t>));
  EXPECT_TRUE((std::is_same_v<decltype(PhotoThumbSetting::quality), int32_t>));
  EXPECT_TRUE((std::is_same_v<decltype(PhotoThumbSetting::rotate), int32_t>));
}

TEST(PhotoConvertJob, NewOnesHaveTheConverterAndNoSettings) {
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
