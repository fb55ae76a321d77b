// The pass that checks the thumbnails of one media file and removes bad ones.
#include "storage/velamk_util.h"
#include "storage/video_fixture.h"
#include "support/images.h"
#include "support/named_case.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::MatchesRegex;
using ::testing::SizeIs;
using ::testing::UnorderedElementsAreArray;

/// The state of a derived file; an outdated one is landscape and older than its video.
enum Kind { kLandscape, kPortrait, kOutdated, kEmpty };

constexpr const char* kS = kThumbNames[0];
constexpr const char* kM = kThumbNames[1];
constexpr const char* kB = kThumbNames[2];
constexpr const char* kXL = kThumbNames[4];
constexpr const char* kSM = kThumbNames[5];
constexpr const char* kOldM = kOldThumbNames[1];
constexpr const char* kOldXL = kOldThumbNames[4];
constexpr const char* kMarker = "VELAPHOTO_THUMB_M.fail";

struct DerivedFile {
  const char* name;
  Kind kind;
};

struct ThumbCase : NamedCase {
  const char* record;
  std::vector<DerivedFile> files;
  int sizeMap;
  int isComplete;
  std::vector<std::string> left;
  size_t requests;
};

class ThumbCheck : public VideoTest {
 protected:
  int Check(int sizeMap) const { return CheckEAThumbs(Media().c_str(), sizeMap); }

  void Make(const DerivedFile& file) const {
    if (file.kind == kEmpty) {
      WriteFile(Derived(file.name), "");
      return;
    }
    JpegRecipe recipe;
    recipe.width = file.kind == kPortrait ? 48 : 64;
    recipe.height = file.kind == kPortrait ? 64 : 48;
    MakeJpeg(Derived(file.name), recipe);
    SetFileTime(Derived(file.name), kMediaTime - (file.kind == kOutdated ? 1 : 0));
  }
};

class CheckedThumbs : public ThumbCheck, public ::testing::WithParamInterface<ThumbCase> {};

TEST_P(CheckedThumbs, AreJudged) {
  const ThumbCase& row = GetParam();
  SetRecord(row.record);
  for (const DerivedFile& file : row.files) {
    Make(file);
  }
  EXPECT_EQ(Check(row.sizeMap), row.isComplete);
  EXPECT_THAT(Left(), UnorderedElementsAreArray(row.left));
  EXPECT_EQ(RequestCount(), row.requests);
}

constexpr const char* kWide = kLandscapeRecord;
constexpr const char* kTall = kPortraitRecord;

const ThumbCase kCases[] = {
    {"MissingThumb", kWide, {{kS, kLandscape}, {kMarker, kEmpty}}, 3, 0, {kMarker, kS}, 1},
    {"NoWantedSize", kWide, {{kM, kPortrait}, {kS, kEmpty}}, 0, 1, {kM, kS}, 0},
    {"UnwantedSize",
     kWide,
     {{kS, kPortrait}, {kM, kPortrait}, {kB, kLandscape}},
     kBitM | kBitB,
     0,
     {kS, kB},
     2},
    {"OutdatedUnderBothNames", kWide, {{kM, kOutdated}, {kOldM, kLandscape}}, kBitM, 0, {}, 0},
    {"Empty", kWide, {{kM, kEmpty}}, kBitM, 0, {}, 0},
    {"OutdatedOlderName", kWide, {{kOldM, kOutdated}}, kBitM, 0, {}, 0},
    {"OutdatedBesideCurrentName",
     kWide,
     {{kM, kLandscape}, {kOldM, kOutdated}},
     kBitM,
     1,
     {kM, kOldM},
     1},
    {"LandscapeOfPortrait", kTall, {{kM, kLandscape}, {kOldM, kLandscape}}, kBitM, 0, {}, 1},
    {"PortraitOfLandscape", kWide, {{kM, kPortrait}}, kBitM, 0, {}, 1},
    {"PortraitOlderName", kWide, {{kOldM, kPortrait}}, kBitM, 0, {}, 1},
    {"PortraitOfPortrait",
     kTall,
     {{kM, kPortrait}, {kOldXL, kPortrait}},
     kBitM | kBitXL,
     1,
     {kM, kOldXL},
     2},
    {"SeveralBadOnes",
     kWide,
     {{kS, kPortrait}, {kOldM, kOutdated}, {kB, kLandscape}, {kXL, kEmpty}, {kSM, kPortrait}},
     63,
     0,
     {kB},
     3},
};
INSTANTIATE_TEST_SUITE_P(Video, CheckedThumbs, ::testing::ValuesIn(kCases), CaseName());

TEST_F(ThumbCheck, EveryThumbIsThereAndGood) {
  for (const char* name : kThumbNames) {
    Make({name, kLandscape});
  }
  EXPECT_EQ(Check(-1), 1);
  EXPECT_EQ(Check(63), 1);
  EXPECT_THAT(Left(), SizeIs(6));
}

TEST_F(ThumbCheck, EveryClassIsFoundUnderBothNames) {
  for (int row = 0; row < 6; ++row) {
    for (const char* name : {kThumbNames[row], kOldThumbNames[row]}) {
      SCOPED_TRACE(name);
      EXPECT_EQ(Check(1 << row), 0);
      Make({name, kLandscape});
      EXPECT_EQ(Check(1 << row), 1);
      Remove(name);
    }
  }
}

TEST_F(ThumbCheck, TheRecordIsThatOfTheVideo) {
  Make({kM, kLandscape});
  Check(kBitM);
  EXPECT_THAT(Requests(), ElementsAre(kMediaRequest));
}

TEST_F(ThumbCheck, AThumbOfAMissingVideoIsJudgedByItsOrientation) {
  RemoveTree(Media());
  const char* line = "velamk_util:64 Fail to get /tmp/media/film.mp4 file information";
  Make({kM, kLandscape});
  EXPECT_EQ(Check(kBitM), 1);
  EXPECT_THAT(TakeErrorLines(), ElementsAre(line));
  Make({kM, kPortrait});
  EXPECT_EQ(Check(kBitM), 0);
  EXPECT_THAT(Left(), IsEmpty());
  EXPECT_THAT(TakeErrorLines(), ElementsAre(line));
}

TEST_F(ThumbCheck, AnUnknownVideoIsLandscape) {
  SetRecord(kNoRecord);
  Make({kS, kLandscape});
  Make({kM, kPortrait});
  EXPECT_EQ(Check(kBitS | kBitM), 0);
  EXPECT_THAT(Left(), ElementsAre(kS));
  EXPECT_THAT(TakeErrorLines(),
              ElementsAre(kDaemonFailed, kUnknownOrientation, kDaemonFailed, kUnknownOrientation));
}

TEST_F(ThumbCheck, ANullPathIsRefused) {
  const char* line = "velamk_util:545 Bad parameters.";
  EXPECT_EQ(CheckEAThumbs(nullptr, 63), 0);
  EXPECT_EQ(CheckEAThumbs(nullptr, 0), 0);
  EXPECT_THAT(TakeErrorLines(), ElementsAre(line, line));
}

TEST_F(ThumbCheck, AFileWithoutMetadataDirectoryIsRefused) {
  const std::string inside = Derived("inside.mp4");
  EXPECT_EQ(CheckEAThumbs(inside.c_str(), 0), 0);
  const std::string expected = NoDirectoryLine(550, inside);
  EXPECT_THAT(expected, MatchesRegex("velamk_util:550 VELAEADirPath error \\[0x[0-9A-F]{4} "
                                     "[^ :]+:[1-9][0-9]*\\] on /tmp/media/.*"));
  EXPECT_THAT(TakeErrorLines(), ElementsAre(expected));
}

}  // namespace
}  // namespace vela_test
