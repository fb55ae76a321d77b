// Reading the profile file.
#include <sys/stat.h>

#include "profiles/thumbnail_profile.h"
#include "support/files.h"
#include "support/named_case.h"
#include "support/privileges.h"
#include "support/profile_file.h"
#include "support/quiet_test.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;

constexpr const char* kProfileFile = "/tmp/profiles.conf";
constexpr const char* kDirectory = "/tmp/photo";

class ProfileParser : public QuietTest {
 protected:
  /// Parses the text into the list.
  int Parse(const std::string& text) {
    WriteFile(kProfileFile, text);
    return ParseThumbnailProfiles(list_, kProfileFile, kDirectory);
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

struct SectionCase : NamedCase {
  const char* text;     ///< of the one section
  const char* profile;  ///< as Described
};

class ProfileSections : public ProfileParser, public ::testing::WithParamInterface<SectionCase> {
 protected:
  static std::string Described(const ThumbnailProfile& profile) {
    return std::to_string(profile.size()) + ", quality " + std::to_string(profile.quality()) +
           ", phase " + std::to_string(profile.phase()) + ", unsharp " + profile.unsharp() + ", " +
           profile.filename() + ", " + profile.thumbName() + (profile.fillArea() ? ", fill" : "");
  }
};

TEST_P(ProfileSections, AreRead) {
  EXPECT_EQ(Parse(std::string("[thumb]\n") + GetParam().text), 1);
  ASSERT_THAT(list_.all, SizeIs(1));
  EXPECT_EQ(Described(*list_.all.front()), GetParam().profile);
}

const SectionCase kSections[] = {
    {"EveryKey",
     "size=320\nquality=85\nunsharp=0.5x0.5+1.25+0.0\nfilename=VELAPHOTO_THUMB_M.jpg\nphase=2\n",
     "320, quality 85, phase 2, unsharp 0.5x0.5+1.25+0.0, VELAPHOTO_THUMB_M.jpg, "
     "VELAPHOTO_THUMB_M.jpg, fill"},
    {"Defaults", "filename=VELAPHOTO_THUMB_S.jpg\n",
     "120, quality 80, phase 0, unsharp , VELAPHOTO_THUMB_S.jpg, VELAPHOTO_THUMB_S.jpg"},
    {"OtherKeys",
     "Size=1\nwidth=2\nfilename=VELAPHOTO_THUMB_S.jpg\nphases=1\nthumbName=x\nfillArea=1\n",
     "120, quality 80, phase 0, unsharp , VELAPHOTO_THUMB_S.jpg, VELAPHOTO_THUMB_S.jpg"},
    {"ColonName", "filename=VELAPHOTO:THUMB_XL.jpg\n",
     "120, quality 80, phase 0, unsharp , VELAPHOTO:THUMB_XL.jpg, VELAPHOTO_THUMB_XL.jpg, fill"},
    {"UnusualNumbers", "size=-5\nquality=0\nfilename=VELAPHOTO_THUMB_S.jpg\nphase=-2\n",
     "-5, quality 0, phase -2, unsharp , VELAPHOTO_THUMB_S.jpg, VELAPHOTO_THUMB_S.jpg"},
    {"NumbersOutOfRange",
     "size=99999999999999999999\nquality=-3000000000\nfilename=VELAPHOTO_THUMB_S.jpg\n",
     "2147483647, quality -2147483648, phase 0, unsharp , VELAPHOTO_THUMB_S.jpg, "
     "VELAPHOTO_THUMB_S.jpg"},
    {"NotNumbers", "size=large\nquality=\nfilename=VELAPHOTO_THUMB_S.jpg\nphase=x1\n",
     "120, quality 80, phase 0, unsharp , VELAPHOTO_THUMB_S.jpg, VELAPHOTO_THUMB_S.jpg"},
    {"NumbersWithASuffix",
     "size=320px\nquality=85.5\nfilename=VELAPHOTO_THUMB_S.jpg\nphase=1 then 2\n",
     "320, quality 85, phase 1, unsharp , VELAPHOTO_THUMB_S.jpg, VELAPHOTO_THUMB_S.jpg"},
};
INSTANTIATE_TEST_SUITE_P(File, ProfileSections, ::testing::ValuesIn(kSections), CaseName());

TEST_F(ProfileParser, SomeClassesFillTheirBox) {
  const struct {
    const char* name;
    bool fills;
  } cases[] = {{"S", false}, {"M", true}, {"B", false}, {"L", true}, {"XL", true}, {"SM", true}};
  for (const auto& c : cases) {
    for (const char* beginning : {"VELAPHOTO_THUMB_", "VELAPHOTO:THUMB_"}) {
      const std::string name = std::string(beginning) + c.name + ".jpg";
      list_ = ThumbnailProfileList();
      EXPECT_EQ(Parse("[thumb]\nfilename=" + name + "\n"), 1);
      EXPECT_EQ(list_.all.at(0)->fillArea(), c.fills) << name;
    }
  }
}

struct ListCase : NamedCase {
  const char* text;
  std::vector<int> sizes;
};

class ProfileLists : public ProfileParser, public ::testing::WithParamInterface<ListCase> {};

TEST_P(ProfileLists, AreRead) {
  EXPECT_EQ(Parse(GetParam().text), 1);
  EXPECT_EQ(Sizes(), GetParam().sizes);
  EXPECT_EQ(list_.phase0.size() + list_.phase1.size() + list_.phase2.size(), list_.all.size());
}

const ListCase kLists[] = {
    {"EmptyFile", "", {}},
    {"NamesOfSections",
     "[thumb]\nsize=1\nfilename=VELAPHOTO_THUMB_S.jpg\n"
     "[thumb1]\nsize=2\nfilename=VELAPHOTO_THUMB_S.jpg\n"
     "[thumb_xl]\nsize=3\nfilename=VELAPHOTO_THUMB_S.jpg\n"
     "[thumbnail_extra]\nsize=4\nfilename=VELAPHOTO_THUMB_S.jpg\n"
     "[Thumb]\nsize=5\nfilename=VELAPHOTO_THUMB_S.jpg\n"
     "[xthumb]\nsize=6\nfilename=VELAPHOTO_THUMB_S.jpg\n"
     "[thum]\nsize=7\nfilename=VELAPHOTO_THUMB_S.jpg\n"
     "[general]\nsize=8\nfilename=VELAPHOTO_THUMB_S.jpg\n"
     "[THUMB2]\nsize=9\nfilename=VELAPHOTO_THUMB_S.jpg\n",
     {1, 2, 3, 4}},
    {"UnknownNameInAnotherSection", "[general]\nfilename=thumb.jpg\n", {}},
    {"KeysBeforeTheFirstSection", "size=7\nfilename=VELAPHOTO_THUMB_S.jpg\n", {}},
    {"WithoutFileNames",
     "[thumb1]\nsize=320\nphase=0\n[thumb2]\nsize=640\nphase=1\n"
     "[thumb3]\nsize=120\nphase=2\nfilename=\n",
     {}},
    {"TwoSectionsForOneThumb",
     "[thumb1]\nsize=320\nfilename=VELAPHOTO_THUMB_M.jpg\n"
     "[thumb2]\nsize=300\nfilename=VELAPHOTO:THUMB_M.jpg\n"
     "[thumb3]\nsize=320\nfilename=VELAPHOTO_THUMB_M.jpg\n",
     {300, 320, 320}},
};
INSTANTIATE_TEST_SUITE_P(File, ProfileLists, ::testing::ValuesIn(kLists), CaseName());

TEST_F(ProfileParser, AnUnknownFileNameIsLoggedAndDropped) {
  EXPECT_EQ(Parse("[thumb1]\nfilename=thumb.jpg\n"
                  "[thumb2]\nsize=320\nfilename=VELAPHOTO_THUMB_M.jpg\n"
                  "[thumb3]\nfilename=velaphoto_thumb_s.jpg\n"),
            1);
  EXPECT_THAT(Sizes(), ElementsAre(320));
  EXPECT_THAT(TakeErrorLines(),
              ElementsAre("velamk_util:113 [Error] invalid thumb filename: thumb.jpg",
                          "velamk_util:113 [Error] invalid thumb filename: velaphoto_thumb_s.jpg"));
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

TEST_F(ProfileParser, UnknownPhasesCountAsTheFirst) {
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

TEST_F(ProfileParser, ASectionInTwoPartsIsOne) {
  EXPECT_EQ(Parse("[thumb1]\nsize=300\nquality=70\n"
                  "[thumb2]\nsize=100\nfilename=VELAPHOTO_THUMB_S.jpg\n"
                  "[thumb1]\nsize=320\nfilename=VELAPHOTO_THUMB_M.jpg\n"),
            1);
  EXPECT_THAT(Sizes(), ElementsAre(100, 320));
  EXPECT_EQ(list_.all.back()->quality(), 70);
}

TEST_F(ProfileParser, OnlyWantedClassesAreKept) {
  WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"18\"\nvideo_thumb_size_map=\"1\"\n");
  WriteProfileFile(kProfileFile, UsualProfiles());
  EXPECT_EQ(ParseThumbnailProfiles(list_, kProfileFile, kDirectory), 1);
  EXPECT_THAT(Sizes(), ElementsAre(320, 1280));
}

TEST_F(ProfileParser, ASizeMapOfZeroSelectsNothing) {
  WriteFile("/etc/velainfo.conf", "photo_thumb_size_map=\"0\"\n");
  WriteProfileFile(kProfileFile, UsualProfiles());
  EXPECT_EQ(ParseThumbnailProfiles(list_, kProfileFile, kDirectory), 1);
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
}

TEST_F(ProfileParser, AFileWithABrokenLineIsAFailure) {
  EXPECT_EQ(Parse("[thumb]\nsize=320\nfilename=VELAPHOTO_THUMB_M.jpg\nno pair and no section\n"),
            0);
  ExpectEmptyList();
}

TEST_F(ProfileParser, EveryParseReadsTheFileAgain) {
  for (const int size : {1, 2}) {
    list_ = ThumbnailProfileList();
    EXPECT_EQ(Parse("[thumb]\nfilename=VELAPHOTO_THUMB_S.jpg\nsize=" + std::to_string(size)), 1);
    EXPECT_THAT(Sizes(), ElementsAre(size));
  }
}

}  // namespace
}  // namespace vela_test
