// The order of a job's settings.
#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "convert/convert_fixture.h"

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

TEST_F(SettingOrder, TheJobIsSortedThoughThePhotoIsMissing) {
  PhotoConvertJob job = MakeJob({320, 1280});
  RemoveTree(kPhoto);
  EXPECT_EQ(RunPhotoConvertJob(job), -1);
  EXPECT_THAT(Widths(job), ElementsAre(1280, 320));
}

TEST_F(SettingOrder, FillModesStayAtTheirPositionsWhateverTheOrder) {
  // Long jobs are sorted in another way than short ones.
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

TEST_F(SettingOrder, OutputsAreCommittedInIt) {
  // The converter writes nothing, so that every commit leaves a line.
  Converter().Plan(StubPlan());
  PhotoConvertJob job = MakeJob({320, 1280, 120});
  EXPECT_EQ(RunPhotoConvertJob(job), -1);
  const std::string beginning = "velamk_photo_thumb:430 [Error] rename: ";
  EXPECT_THAT(ErrorLines(), ElementsAre(beginning + TempPath(1280) + ", " + ThumbPath(1280),
                                        beginning + TempPath(320) + ", " + ThumbPath(320),
                                        beginning + TempPath(120) + ", " + ThumbPath(120)));
}

}  // namespace
}  // namespace vela_test
