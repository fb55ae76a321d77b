// Reading the profile file.
#include <gmock/gmock.h>
#include <sys/stat.h>

#include <climits>
#include <string>
#include <vector>

#include "profiles/thumbnail_profile.h"
#include "support/files.h"
#include "support/privileges.h"
#include "support/profile_file.h"
#include "support/sandbox.h"
#include "support/system_log.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;

constexpr const char* kProfileFile = "/tmp/profiles.conf";
constexpr const char* kDirectory = "/tmp/photo";

class ProfileParser : public SandboxTest {
 protected:
  /// Parses the text into the list.
  int Parse(const std::string& text) {
    WriteFile(kProfileFile, text);
    return ParseThumbnailProfiles(list_, kProfileFile, kDirectory);
  }

  /// Parses the text, which holds one accepted profile; returns that.
  const ThumbnailProfile& ParseOne(const std::string& text) {
    list_ = ThumbnailProfileList();
    EXPECT_EQ(Parse(text), 1);
    EXPECT_THAT(list_.all, SizeIs(1));
    static const ThumbnailProfile kNone(-1, -1, "none", "none", -1);
    return list_.all.empty() ? kNone : *list_.all.front();
  }

  /// The profiles' sizes.
  std::vector<int> Sizes(int phaseIndex = kAllPhases) const {
    std::vector<int> sizes;
    for (int i = 0; i < GetProfileCount(list_, phaseIndex); ++i) {
      sizes.push_back(GetProfileAt(list_, i, phaseIndex)->size());
    }
    return sizes;
  }

  void ExpectEmptyList() const {
    EXPECT_THAT(list_.all, IsEmpty());
    EXPECT_THAT(list_.phase0, IsEmpty());
    EXPECT_THAT(list_.phase1, IsEmpty());
    EXPECT_THAT(list_.phase2, IsEmpty());
  }

  ThumbnailProfileList list_;
};

TEST_F(ProfileParser, ReadsEveryKey) {
  const ThumbnailProfile& profile = ParseOne(
      "[thumb_m]\nsize=320\nquality=85\nunsharp=0.5x0.5+1.25+0.0\n"
      "filename=VELAPHOTO_THUMB_M.jpg\nphase=2\n");
  EXPECT_EQ(profile.size(), 320);
  EXPECT_EQ(profile.quality(), 85);
  EXPECT_EQ(profile.unsharp(), "0.5x0.5+1.25+0.0");
  EXPECT_EQ(profile.filename(), "VELAPHOTO_THUMB_M.jpg");
  EXPECT_EQ(profile.thumbName(), "VELAPHOTO_THUMB_M.jpg");
  EXPECT_EQ(profile.phase(), 2);
  EXPECT_TRUE(profile.fillArea());
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(ProfileParser, KeysHaveDefaults) {
  const ThumbnailProfile& profile = ParseOne("[thumb]\nfilename=VELAPHOTO_THUMB_S.jpg\n");
  EXPECT_EQ(profile.size(), 120);
  EXPECT_EQ(profile.quality(), 80);
  EXPECT_EQ(profile.unsharp(), "");
  EXPECT_EQ(profile.phase(), 0);
  EXPECT_FALSE(profile.fillArea());
}

TEST_F(ProfileParser, OtherKeysAreIgnored) {
  const ThumbnailProfile& profile = ParseOne(
      "[thumb]\nSize=1\nwidth=2\nfilename=VELAPHOTO_THUMB_S.jpg\nphases=1\nthumbName=x\n"
      "fillArea=1\n");
  EXPECT_EQ(profile.size(), 120);
  EXPECT_EQ(profile.phase(), 0);
  EXPECT_EQ(profile.thumbName(), "VELAPHOTO_THUMB_S.jpg");
  EXPECT_FALSE(profile.fillArea());
}

TEST_F(ProfileParser, SectionsAreToldByTheirBeginning) {
  EXPECT_EQ(Parse("[thumb]\nsize=1\nfilename=VELAPHOTO_THUMB_S.jpg\n"
                  "[thumb1]\nsize=2\nfilename=VELAPHOTO_THUMB_S.jpg\n"
                  "[thumb_xl]\nsize=3\nfilename=VELAPHOTO_THUMB_S.jpg\n"
                  "[thumbnail_extra]\nsize=4\nfilename=VELAPHOTO_THUMB_S.jpg\n"
                  "[Thumb]\nsize=5\nfilename=VELAPHOTO_THUMB_S.jpg\n"
                  "[xthumb]\nsize=6\nfilename=VELAPHOTO_THUMB_S.jpg\n"
                  "[thum]\nsize=7\nfilename=VELAPHOTO_THUMB_S.jpg\n"
                  "[general]\nsize=8\nfilename=VELAPHOTO_THUMB_S.jpg\n"
                  "[THUMB2]\nsize=9\nfilename=VELAPHOTO_THUMB_S.jpg\n"),
            1);
  EXPECT_THAT(Sizes(), ElementsAre(1, 2, 3, 4));
}

TEST_F(ProfileParser, AMistypedNameElsewhereIsNobodysBusiness) {
  EXPECT_EQ(Parse("[general]\nfilename=thumb.jpg\n"), 1);
  ExpectEmptyList();
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(ProfileParser, KeysBeforeTheFirstSectionBelongToNone) {
  EXPECT_EQ(Parse("size=7\nfilename=VELAPHOTO_THUMB_S.jpg\n"), 1);
  ExpectEmptyList();
}

TEST_F(ProfileParser, ColonNamesAreWrittenWithUnderscores) {
  const ThumbnailProfile& profile = ParseOne("[thumb]\nfilename=VELAPHOTO:THUMB_XL.jpg\n");
  EXPECT_EQ(profile.filename(), "VELAPHOTO:THUMB_XL.jpg");
  EXPECT_EQ(profile.thumbName(), "VELAPHOTO_THUMB_XL.jpg");
  EXPECT_TRUE(profile.fillArea());
}

TEST_F(ProfileParser, SomeClassesFillTheirBox) {
  const struct {
    const char* name;
    bool fills;
  } cases[] = {{"S", false}, {"M", true}, {"B", false}, {"L", true}, {"XL", true}, {"SM", true}};
  for (const auto& c : cases) {
    for (const char* beginning : {"VELAPHOTO_THUMB_", "VELAPHOTO:THUMB_"}) {
      const std::string name = std::string(beginning) + c.name + ".jpg";
      EXPECT_EQ(ParseOne("[thumb]\nfilename=" + name + "\n").fillArea(), c.fills) << name;
    }
  }
}

TEST_F(ProfileParser, WithoutFileNamesAllListsAreEmpty) {
  EXPECT_EQ(Parse("[thumb1]\nsize=320\nphase=0\n[thumb2]\nsize=640\nphase=1\n"
                  "[thumb3]\nsize=120\nphase=2\nfilename=\n"),
            1);
  ExpectEmptyList();
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(ProfileParser, AMistypedFileNameIsLoggedAndDropped) {
  EXPECT_EQ(Parse("[thumb1]\nfilename=thumb.jpg\n"
                  "[thumb2]\nsize=320\nfilename=VELAPHOTO_THUMB_M.jpg\n"
                  "[thumb3]\nfilename=velaphoto_thumb_s.jpg\n"),
            1);
  EXPECT_THAT(Sizes(), ElementsAre(320));
  EXPECT_THAT(ErrorLines(), ElementsAre("velamk_util:113 [Error] invalid thumb filename: thumb.jpg",
                                        "velamk_util:113 [Error] invalid thumb filename: "
                                        "velaphoto_thumb_s.jpg"));
}

TEST_F(ProfileParser, ProfilesAreSortedBySize) {
  EXPECT_EQ(Parse("[thumb1]\nsize=800\nfilename=VELAPHOTO_THUMB_L.jpg\nphase=0\n"
                  "[thumb2]\nsize=120\nfilename=VELAPHOTO_THUMB_S.jpg\nphase=1\n"
                  "[thumb3]\nsize=320\nfilename=VELAPHOTO_THUMB_M.jpg\nphase=0\n"),
            1);
  EXPECT_THAT(Sizes(), ElementsAre(120, 320, 800));
  EXPECT_THAT(Sizes(0), ElementsAre(320, 800));
  EXPECT_THAT(Sizes(1), ElementsAre(120));
  EXPECT_THAT(Sizes(2), IsEmpty());
}

TEST_F(ProfileParser, ManyProfilesAreSortedInEveryPhase) {
  std::string text;
  for (int i = 0; i < 60; ++i) {
    const int size = (i * 37) % 60 + 1;  // every number from 1 to 60 once
    text += "[thumb" + std::to_string(i) + "]\nsize=" + std::to_string(size) +
            "\nfilename=VELAPHOTO_THUMB_M.jpg\nphase=" + std::to_string(size % 3) + "\n";
  }
  EXPECT_EQ(Parse(text), 1);
  for (int phase = 0; phase < 3; ++phase) {
    std::vector<int> expected;
    for (int size = 1; size <= 60; ++size) {
      if (size % 3 == phase) {
        expected.push_back(size);
      }
    }
    EXPECT_EQ(Sizes(phase), expected);
  }
  EXPECT_THAT(list_.all, SizeIs(60));
}

TEST_F(ProfileParser, PhasesBeyondTheKnownOnesAreTheFirst) {
  EXPECT_EQ(Parse("[thumb1]\nsize=1\nfilename=VELAPHOTO_THUMB_S.jpg\nphase=7\n"
                  "[thumb2]\nsize=2\nfilename=VELAPHOTO_THUMB_S.jpg\nphase=-1\n"
                  "[thumb3]\nsize=3\nfilename=VELAPHOTO_THUMB_S.jpg\nphase=3\n"
                  "[thumb4]\nsize=4\nfilename=VELAPHOTO_THUMB_S.jpg\nphase=2\n"
                  "[thumb5]\nsize=5\nfilename=VELAPHOTO_THUMB_S.jpg\nphase=1\n"
                  "[thumb6]\nsize=6\nfilename=VELAPHOTO_THUMB_S.jpg\nphase=0\n"
                  "[thumb7]\nsize=7\nfilename=VELAPHOTO_THUMB_S.jpg\n"),
            1);
  EXPECT_THAT(Sizes(0), ElementsAre(1, 2, 3, 6, 7));
  EXPECT_THAT(Sizes(1), ElementsAre(5));
  EXPECT_THAT(Sizes(2), ElementsAre(4));
  EXPECT_EQ(list_.all.front()->phase(), 7);
  EXPECT_EQ(list_.all[1]->phase(), -1);
}

TEST_F(ProfileParser, PhaseListsReferToTheProfilesOfTheWholeList) {
  WriteProfileFile(kProfileFile, UsualProfiles());
  ASSERT_EQ(ParseThumbnailProfiles(list_, kProfileFile, kDirectory), 1);
  EXPECT_THAT(Sizes(), ElementsAre(120, 320, 640, 1280));
  EXPECT_THAT(list_.phase0, ElementsAre(list_.all[1].get(), list_.all[3].get()));
  EXPECT_THAT(list_.phase1, ElementsAre(list_.all[2].get()));
  EXPECT_THAT(list_.phase2, ElementsAre(list_.all[0].get()));
}

TEST_F(ProfileParser, TwoSectionsMayNameTheSameThumb) {
  EXPECT_EQ(Parse("[thumb1]\nsize=320\nfilename=VELAPHOTO_THUMB_M.jpg\n"
                  "[thumb2]\nsize=300\nfilename=VELAPHOTO:THUMB_M.jpg\n"
                  "[thumb3]\nsize=320\nfilename=VELAPHOTO_THUMB_M.jpg\n"),
            1);
  EXPECT_THAT(Sizes(), ElementsAre(300, 320, 320));
  EXPECT_THAT(Sizes(0), ElementsAre(300, 320, 320));
}

TEST_F(ProfileParser, ASectionInTwoPartsIsOne) {
  EXPECT_EQ(Parse("[thumb1]\nsize=300\nquality=70\n"
                  "[thumb2]\nsize=100\nfilename=VELAPHOTO_THUMB_S.jpg\n"
                  "[thumb1]\nsize=320\nfilename=VELAPHOTO_THUMB_M.jpg\n"),
            1);
  EXPECT_THAT(Sizes(), ElementsAre(100, 320));
  EXPECT_EQ(list_.all.back()->quality(), 70);
}

TEST_F(ProfileParser, NumbersAreTakenAsWritten) {
  const ThumbnailProfile& profile =
      ParseOne("[thumb]\nsize=-5\nquality=0\nfilename=VELAPHOTO_THUMB_S.jpg\nphase=-2\n");
  EXPECT_EQ(profile.size(), -5);
  EXPECT_EQ(profile.quality(), 0);
  EXPECT_EQ(profile.phase(), -2);
}

TEST_F(ProfileParser, NumbersBeyondTheirRangeAreHeldWithinIt) {
  const ThumbnailProfile& profile = ParseOne(
      "[thumb]\nsize=99999999999999999999\nquality=-3000000000\n"
      "filename=VELAPHOTO_THUMB_S.jpg\n");
  EXPECT_EQ(profile.size(), INT_MAX);
  EXPECT_EQ(profile.quality(), INT_MIN);
}

TEST_F(ProfileParser, WhatIsNoNumberIsTheDefault) {
  const ThumbnailProfile& profile =
      ParseOne("[thumb]\nsize=large\nquality=\nfilename=VELAPHOTO_THUMB_S.jpg\nphase=x1\n");
  EXPECT_EQ(profile.size(), 120);
  EXPECT_EQ(profile.quality(), 80);
  EXPECT_EQ(profile.phase(), 0);
}

TEST_F(ProfileParser, NumbersEndAtTheirLastDigit) {
  const ThumbnailProfile& profile = ParseOne(
      "[thumb]\nsize=320px\nquality=85.5\nfilename=VELAPHOTO_THUMB_S.jpg\nphase=1 then 2\n");
  EXPECT_EQ(profile.size(), 320);
  EXPECT_EQ(profile.quality(), 85);
  EXPECT_EQ(profile.phase(), 1);
}

TEST_F(ProfileParser, OnlyWantedClassesAreKept) {
  WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"18\"\nvideo_thumb_size_map=\"1\"\n");
  WriteProfileFile(kProfileFile, UsualProfiles());
  EXPECT_EQ(ParseThumbnailProfiles(list_, kProfileFile, kDirectory), 1);
  EXPECT_THAT(Sizes(), ElementsAre(320, 1280));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(ProfileParser, ASizeMapOfZeroKeepsNothing) {
  WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"0\"\n");
  WriteProfileFile(kProfileFile, UsualProfiles());
  EXPECT_EQ(ParseThumbnailProfiles(list_, kProfileFile, kDirectory), 1);
  ExpectEmptyList();
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(ProfileParser, AnEmptyFileIsAnEmptyList) {
  EXPECT_EQ(Parse(""), 1);
  ExpectEmptyList();
}

TEST_F(ProfileParser, AFileThatCannotBeReadIsAFailure) {
  EXPECT_EQ(ParseThumbnailProfiles(list_, "/tmp/missing.conf", kDirectory), 0);
  EXPECT_EQ(ParseThumbnailProfiles(list_, "", kDirectory), 0);
  MakeDirectories("/tmp/directory.conf");
  EXPECT_EQ(ParseThumbnailProfiles(list_, "/tmp/directory.conf", kDirectory), 0);
  WriteProfileFile(kProfileFile, UsualProfiles());
  ASSERT_EQ(chmod(kProfileFile, 0), 0);
  {
    const WithoutCapabilities ordinary;
    EXPECT_EQ(ParseThumbnailProfiles(list_, kProfileFile, kDirectory), 0);
  }
  ExpectEmptyList();
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(ProfileParser, AFileWithABrokenLineIsAFailure) {
  EXPECT_EQ(Parse("[thumb]\nsize=320\nfilename=VELAPHOTO_THUMB_M.jpg\nno pair and no section\n"),
            0);
  ExpectEmptyList();
}

TEST_F(ProfileParser, EveryParseReadsTheFileAnew) {
  EXPECT_EQ(ParseOne("[thumb]\nsize=1\nfilename=VELAPHOTO_THUMB_S.jpg\n").size(), 1);
  EXPECT_EQ(ParseOne("[thumb]\nsize=2\nfilename=VELAPHOTO_THUMB_S.jpg\n").size(), 2);
}

}  // namespace
}  // namespace vela_test
