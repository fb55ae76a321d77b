// Whether one video needs work.
#include <utility>

#include "storage/velamk_thumb_status.h"
#include "storage/video_fixture.h"
#include "support/images.h"
#include "support/named_case.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

/// The content of the video; browsers play only the playable one.
enum Content { kText, kPlayable, kUnplayable };

enum Thumbs { kNone, kAll, kAllButSm, kMediumOnly };

class VideoWork : public VideoTest {
 protected:
  static void Make(const std::string& path, Content content) {
    if (content == kText) {
      WriteFile(path, "text");
      return;
    }
    FilmRecipe recipe;
    recipe.videoCodec = content == kPlayable ? "libx264" : "mpeg4";
    recipe.format = content == kPlayable ? "" : "avi";
    MakeFilm(path, recipe);
  }

  void MakeMedia(Content content) const {
    Make(Media(), content);
    SetFileTime(Media(), kMediaTime);
  }

  void MakeThumb(const std::string& name) const {
    MakeJpeg(Derived(name));
    SetFileTime(Derived(name), kMediaTime);
  }

  void MakeThumbs(Thumbs thumbs) const {
    for (int row = 0; row < 6; ++row) {
      if (thumbs == kAll || (thumbs == kAllButSm && row != 5) ||
          (thumbs == kMediumOnly && row == 1)) {
        MakeThumb(kThumbNames[row]);
      }
    }
  }

  int IsNeeded() const { return IsVideoWorkNeeded(Media().c_str()); }
};

struct WorkCase : NamedCase {
  Content video;
  Thumbs thumbs;
  std::vector<std::pair<std::string, size_t>> convertedVideos;  ///< with their bytes
  const char* settings;
  int isNeeded;
};

class WorkCases : public VideoWork, public ::testing::WithParamInterface<WorkCase> {};

TEST_P(WorkCases, AreJudged) {
  MakeMedia(GetParam().video);
  MakeThumbs(GetParam().thumbs);
  for (const auto& [name, bytes] : GetParam().convertedVideos) {
    MakeDerived(name, bytes);
  }
  WriteFile(kSettings, GetParam().settings);
  EXPECT_EQ(IsNeeded(), GetParam().isNeeded);
}

constexpr const char* kMediumSize = "photo_thumb_size_map=\"63\"\nvideo_thumb_size_map=\"2\"\n";
constexpr const char* kNoSize = "video_thumb_size_map=\"0\"\n";
constexpr const char* kMobileWanted = "enable_mobile_video=\"yes\"\n";

const WorkCase kCases[] = {
    {"TextWithoutThumbs", kText, kNone, {}, "", 1},
    {"UnreadableVideoNeedsNoConversion", kText, kAll, {}, "", 0},
    {"PlayableWithoutThumbs", kPlayable, kNone, {}, "", 1},
    {"PlayableWithThumbs", kPlayable, kAll, {}, "", 0},
    {"OneThumbMissing", kPlayable, kAllButSm, {}, "", 1},
    {"WantedThumbMissing", kPlayable, kNone, {}, kMediumSize, 1},
    {"WantedThumbPresent", kPlayable, kMediumOnly, {}, kMediumSize, 0},
    {"NoThumbWanted", kPlayable, kNone, {}, kNoSize, 0},
    {"NotPlayableAndNoThumbWanted", kUnplayable, kNone, {}, kNoSize, 1},
    {"NotPlayable", kUnplayable, kAll, {}, "", 1},
    {"ConvertedToOneByte", kUnplayable, kAll, {{kHigh.name, 1}}, "", 1},
    {"ConvertedToTwoBytes", kUnplayable, kAll, {{kHigh.name, 2}}, "", 0},
    {"ConvertedWithoutThumbs", kUnplayable, kNone, {{kHigh.name, 10}}, "", 1},
    {"ConvertedForWeb", kUnplayable, kAll, {{kFlash.name, 10}}, "", 0},
    {"ConvertedForWebOnly", kUnplayable, kAll, {{kFlash.name, 10}}, kMobileWanted, 1},
    {"ConvertedForMobileToo",
     kUnplayable,
     kAll,
     {{kFlash.name, 10}, {kMpeg4.name, 10}},
     kMobileWanted,
     0},
};
INSTANTIATE_TEST_SUITE_P(Video, WorkCases, ::testing::ValuesIn(kCases), CaseName());

TEST_F(VideoWork, IsNotNeededForOtherFiles) {
  EXPECT_EQ(IsVideoWorkNeeded(nullptr), 0);
  EXPECT_EQ(IsVideoWorkNeeded(""), 0);
  EXPECT_EQ(IsVideoWorkNeeded("/tmp/media/none.mp4"), 0);
  MakeDirectories("/tmp/media/directory.mp4");
  EXPECT_EQ(IsVideoWorkNeeded("/tmp/media/directory.mp4"), 0);
  for (const char* name : {"/tmp/media/a.jpg", "/tmp/media/a.txt", "/tmp/media/mp4"}) {
    WriteFile(name, "no video");
    EXPECT_EQ(IsVideoWorkNeeded(name), 0) << name;
  }
}

TEST_F(VideoWork, AThumbOfTheOlderNameIsEnough) {
  MakeMedia(kPlayable);
  MakeThumbs(kAllButSm);
  MakeThumb(kOldThumbNames[5]);
  EXPECT_EQ(IsNeeded(), 0);
}

TEST_F(VideoWork, ThumbsOfTheOtherOrientationAreRemoved) {
  MakeMedia(kPlayable);
  MakeThumbs(kAll);
  MakeThumb(kOldThumbNames[1]);
  SetRecord(kPortraitRecord);
  EXPECT_EQ(IsNeeded(), 1);
  EXPECT_THAT(Left(), IsEmpty());
}

TEST_F(VideoWork, OutdatedThumbsAreRemoved) {
  MakeMedia(kPlayable);
  MakeThumbs(kAll);
  SetFileTime(Derived(kThumbNames[0]), kMediaTime - 1);
  EXPECT_EQ(IsNeeded(), 1);
  EXPECT_FALSE(Exists(Derived(kThumbNames[0])));
  EXPECT_TRUE(Exists(Derived(kThumbNames[1])));
}

TEST_F(VideoWork, UnwantedThumbsAreNotChecked) {
  MakeMedia(kPlayable);
  WriteFile(kSettings, kNoSize);
  WriteFile(Derived(kThumbNames[0]), "");
  EXPECT_EQ(IsNeeded(), 0);
  EXPECT_TRUE(Exists(Derived(kThumbNames[0])));
}

TEST_F(VideoWork, AFailedCheckForConvertedVideosCountsAsConverted) {
  WriteFile(kSettings, kNoSize);
  const std::string outside = "/tmp/media/b.avi";
  const std::string inside = Derived("b.avi");
  Make(outside, kUnplayable);
  CopyFile(outside, inside);
  EXPECT_EQ(IsVideoWorkNeeded(outside.c_str()), 1);
  EXPECT_EQ(IsVideoWorkNeeded(inside.c_str()), 0);
  const std::string line = NoDirectoryLine(465, inside);
  EXPECT_THAT(TakeErrorLines(), ElementsAre(line));
}

TEST_F(VideoWork, AVideoWithoutMetadataDirectoryLacksItsThumbs) {
  const std::string inside = Derived("b.mp4");
  WriteFile(inside, "video");
  EXPECT_EQ(IsVideoWorkNeeded(inside.c_str()), 1);
  const std::string line = NoDirectoryLine(550, inside);
  EXPECT_THAT(TakeErrorLines(), ElementsAre(line));
}

TEST_F(VideoWork, PathsMayBeLongAsLongAsDerivedNamesFit) {
  const std::string longest = PathOfLength(4066, "a.mp4");
  WriteFile(longest, "video");
  EXPECT_EQ(IsVideoWorkNeeded(longest.c_str()), 1);
  const std::string tooLong = PathOfLength(4067, "a.mp4");
  WriteFile(tooLong, "video");
  EXPECT_EQ(IsVideoWorkNeeded(tooLong.c_str()), 0);
  EXPECT_THAT(TakeErrorLines(),
              ElementsAre("velamk_thumb_status:295 [Error] path is too long and can't create "
                          "thumbnail: " +
                          tooLong));
}

TEST_F(VideoWork, OnlyVideosAreLoggedAsTooLong) {
  const std::string photo = PathOfLength(4067, "a.jpg");
  WriteFile(photo, "photo");
  EXPECT_EQ(IsVideoWorkNeeded(photo.c_str()), 0);
  EXPECT_EQ(IsVideoWorkNeeded(PathOfLength(4067, "none.mp4").c_str()), 0);
}

}  // namespace
}  // namespace vela_test
