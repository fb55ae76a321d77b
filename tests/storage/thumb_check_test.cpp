// The check-and-clean pass over the thumbnails of one media file.
#include <gmock/gmock.h>

#include <cstdio>
#include <optional>
#include <string>
#include <vector>

#include "platform/vlibc.h"
#include "storage/media_fixture.h"
#include "storage/velamk_util.h"
#include "support/daemon_peer.h"
#include "support/files.h"
#include "support/images.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::MatchesRegex;
using ::testing::SizeIs;
using ::testing::UnorderedElementsAre;

constexpr const char* kLandscape = R"({"success":true,"media":{"width":640,"height":480}})";
constexpr const char* kPortrait = R"({"success":true,"media":{"width":480,"height":640}})";

class ThumbCheck : public MediaTest {
 protected:
  ThumbCheck() : MediaTest("film.mp4") {}

  void SetUp() override {
    MediaTest::SetUp();
    daemon_.emplace();
    SetRecord(kLandscape);
  }

  void SetRecord(const std::string& reply) {
    daemon_->Answer("GET_MEDIA_FROM_PLUGIN_DB", DaemonReply::Line(reply));
  }

  int Check(int sizeMap) const { return CheckEAThumbs(Media().c_str(), sizeMap); }

  void MakeThumb(const std::string& name, int width = 64, int height = 48, int64_t seconds = 0) {
    JpegRecipe recipe;
    recipe.width = width;
    recipe.height = height;
    MakeJpeg(Derived(name), recipe);
    SetFileTime(Derived(name), kMediaTime + seconds);
  }
  void MakeLandscape(const std::string& name) { MakeThumb(name, 64, 48); }
  void MakePortrait(const std::string& name) { MakeThumb(name, 48, 64); }

  std::vector<DaemonRequest> Requests() const { return daemon_->Requests(); }
  std::vector<std::string> Left() const { return ListDirectory(EaDir()); }

 private:
  std::optional<DaemonPeer> daemon_;  // not before the sandbox is reset
};

TEST_F(ThumbCheck, EverythingThereAndGood) {
  for (const char* name : kThumbNames) {
    MakeLandscape(name);
  }
  EXPECT_EQ(Check(-1), 1);
  EXPECT_EQ(Check(63), 1);
  EXPECT_THAT(Left(), SizeIs(6));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(ThumbCheck, EveryClassIsLookedFor) {
  for (int row = 0; row < 6; ++row) {
    SCOPED_TRACE(kThumbNames[row]);
    EXPECT_EQ(Check(1 << row), 0);
    MakeLandscape(kThumbNames[row]);
    EXPECT_EQ(Check(1 << row), 1);
    RemoveTree(Derived(kThumbNames[row]));
    MakeLandscape(kOldThumbNames[row]);
    EXPECT_EQ(Check(1 << row), 1);
    RemoveTree(Derived(kOldThumbNames[row]));
  }
}

TEST_F(ThumbCheck, AMissingThumbRemovesNothing) {
  MakeLandscape(kThumbNames[0]);
  WriteFile(Derived("VELAPHOTO_THUMB_M.fail"), "");
  EXPECT_EQ(Check(kBitS | kBitM), 0);
  EXPECT_THAT(Left(), ElementsAre("VELAPHOTO_THUMB_M.fail", "VELAPHOTO_THUMB_S.jpg"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(ThumbCheck, NothingWantedIsNothingTouched) {
  MakePortrait(kThumbNames[1]);
  WriteFile(Derived(kThumbNames[0]), "");
  EXPECT_EQ(Check(0), 1);
  EXPECT_THAT(Left(), SizeIs(2));
  EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(ThumbCheck, OnlyWantedClassesAreCleaned) {
  MakePortrait(kThumbNames[0]);
  MakePortrait(kThumbNames[1]);
  MakeLandscape(kThumbNames[2]);
  EXPECT_EQ(Check(kBitM | kBitB), 0);
  EXPECT_THAT(Left(), UnorderedElementsAre(kThumbNames[0], kThumbNames[2]));
}

TEST_F(ThumbCheck, AnOutdatedThumbIsRemovedUnderBothNames) {
  MakeThumb(kThumbNames[1], 64, 48, -1);
  MakeThumb(kOldThumbNames[1], 64, 48, 0);
  EXPECT_EQ(Check(kBitM), 0);
  EXPECT_THAT(Left(), IsEmpty());
  EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(ThumbCheck, AnEmptyThumbIsRemoved) {
  WriteFile(Derived(kThumbNames[1]), "");
  EXPECT_EQ(Check(kBitM), 0);
  EXPECT_THAT(Left(), IsEmpty());
}

TEST_F(ThumbCheck, AnOutdatedThumbOfTheOlderNameIsRemoved) {
  MakeThumb(kOldThumbNames[1], 64, 48, -1);
  EXPECT_EQ(Check(kBitM), 0);
  EXPECT_THAT(Left(), IsEmpty());
}

TEST_F(ThumbCheck, TheCurrentNameGoesBeforeTheOlderOne) {
  MakeThumb(kThumbNames[1], 64, 48, 0);
  MakeThumb(kOldThumbNames[1], 48, 64, -1);
  EXPECT_EQ(Check(kBitM), 1);
  EXPECT_THAT(Left(), SizeIs(2));
}

TEST_F(ThumbCheck, ALandscapeThumbOfAPortraitFilmIsRemovedUnderBothNames) {
  SetRecord(kPortrait);
  MakeLandscape(kThumbNames[1]);
  MakeLandscape(kOldThumbNames[1]);
  EXPECT_EQ(Check(kBitM), 0);
  EXPECT_THAT(Left(), IsEmpty());
}

TEST_F(ThumbCheck, APortraitThumbOfALandscapeFilmIsRemoved) {
  MakePortrait(kThumbNames[1]);
  EXPECT_EQ(Check(kBitM), 0);
  EXPECT_THAT(Left(), IsEmpty());
}

TEST_F(ThumbCheck, ThumbsOfAPortraitFilmArePortrait) {
  SetRecord(kPortrait);
  MakePortrait(kThumbNames[1]);
  MakePortrait(kOldThumbNames[4]);
  EXPECT_EQ(Check(kBitM | kBitXL), 1);
  EXPECT_THAT(Left(), SizeIs(2));
}

TEST_F(ThumbCheck, TheOrientationIsThatOfTheThumbFound) {
  MakePortrait(kOldThumbNames[1]);
  EXPECT_EQ(Check(kBitM), 0);
  EXPECT_THAT(Left(), IsEmpty());
}

TEST_F(ThumbCheck, TheIndexIsAskedAboutTheFilm) {
  MakeLandscape(kThumbNames[1]);
  Check(kBitM);
  ASSERT_THAT(Requests(), SizeIs(1));
  EXPECT_EQ(Requests().front().bytes,
            "{\"command\":\"GET_MEDIA_FROM_PLUGIN_DB\",\"path\":\"/tmp/media/film.mp4\","
            "\"type\":1}\n");
}

TEST_F(ThumbCheck, OneCallRemovesAllThatIsBad) {
  MakePortrait(kThumbNames[0]);
  MakeThumb(kOldThumbNames[1], 64, 48, -1);
  MakeLandscape(kThumbNames[2]);
  WriteFile(Derived(kThumbNames[4]), "");
  MakePortrait(kThumbNames[5]);
  EXPECT_EQ(Check(63), 0);
  EXPECT_THAT(Left(), ElementsAre(kThumbNames[2]));
}

TEST_F(ThumbCheck, AThumbOfAFilmThatIsGoneIsJudgedByItsOrientation) {
  RemoveTree(Media());
  MakeLandscape(kThumbNames[1]);
  EXPECT_EQ(Check(kBitM), 1);
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velamk_util:64 Fail to get /tmp/media/film.mp4 file information"));
  MakePortrait(kThumbNames[1]);
  EXPECT_EQ(Check(kBitM), 0);
  EXPECT_THAT(Left(), IsEmpty());
}

TEST_F(ThumbCheck, AnUnknownFilmIsLandscape) {
  SetRecord(R"({"success":false})");
  MakeLandscape(kThumbNames[0]);
  MakePortrait(kThumbNames[1]);
  EXPECT_EQ(Check(kBitS | kBitM), 0);
  EXPECT_THAT(Left(), ElementsAre(kThumbNames[0]));
  const std::string unknown =
      "velamk_util:128 fail to get media from plugin db: /tmp/media/film.mp4";
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velamk_ipc:30 fail", unknown, "velamk_ipc:30 fail", unknown));
}

TEST_F(ThumbCheck, NoPathIsRefused) {
  EXPECT_EQ(CheckEAThumbs(nullptr, 63), 0);
  EXPECT_EQ(CheckEAThumbs(nullptr, 0), 0);
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velamk_util:545 Bad parameters.", "velamk_util:545 Bad parameters."));
}

TEST_F(ThumbCheck, AFileWithoutMetadataDirectoryIsRefused) {
  const std::string inside = Derived("inside.mp4");
  EXPECT_EQ(CheckEAThumbs(inside.c_str(), 0), 0);
  char expected[512];
  std::snprintf(expected, sizeof expected,
                "velamk_util:550 VELAEADirPath error [0x%04X %s:%d] on %s",
                static_cast<unsigned>(VLIBCErrGet()), VLIBCErrorGetFile(), VLIBCErrorGetLine(),
                inside.c_str());
  EXPECT_THAT(ErrorLines(), ElementsAre(expected));
  EXPECT_THAT(ErrorLines(),
              Each(MatchesRegex("velamk_util:550 VELAEADirPath error \\[0x[0-9A-F]{4} "
                                "[^ :]+:[1-9][0-9]*\\] on /tmp/media/.*")));
}

}  // namespace
}  // namespace vela_test
