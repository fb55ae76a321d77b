// Finding the thumbnail of a profile, checking whether it is up to date, and failure markers.
#include <sys/stat.h>

#include "profiles/plan_fixture.h"
#include "support/mounts.h"
#include "support/named_case.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::UnorderedElementsAre;

constexpr const char* kCurrent = "VELAPHOTO_THUMB_M.jpg";
constexpr const char* kCurrentMarker = "VELAPHOTO_THUMB_M.fail";
constexpr const char* kOlder = "VELAPHOTO:THUMB_M.jpg";
constexpr const char* kOlderMarker = "VELAPHOTO:THUMB_M.fail";

struct Thumb {
  const char* name;
  const char* content = "thumb";
  int64_t seconds = 1;  ///< its age relative to the photo
};

/// A profile with the older name and one with the current name.
class ProfileOfEachName : public PlanTest {
 protected:
  void SetUp() override {
    PlanTest::SetUp();
    colon_ = &AddProfile(320, kOlder);
    underscore_ = &AddProfile(320, kCurrent);
  }

  const ThumbnailProfile* colon_ = nullptr;
  const ThumbnailProfile* underscore_ = nullptr;
};

class ThumbLookup : public ProfileOfEachName {
 protected:
  /// The path found, "" for none.
  static std::string Found(const ThumbnailProfile& profile, struct stat* status = nullptr) {
    std::string path = "untouched";
    struct stat found = {};
    const int result = FindExistingThumb(profile, kEaDir, path, found);
    EXPECT_TRUE(result == 0 || result == 1);
    if (result == 0) {
      EXPECT_EQ(path, "untouched");
      return "";
    }
    if (status != nullptr) {
      *status = found;
    }
    return path;
  }

  static int UpToDate(const ThumbnailProfile& profile) {
    return IsThumbUpToDate(profile, kPhoto, kEaDir);
  }
};

struct LookupCase : NamedCase {
  std::vector<Thumb> thumbs;
  std::string colonFinds;       ///< result for the profile with the older name, "" for none
  std::string underscoreFinds;  ///< the same for the profile with the current name
  int isColonUpToDate;
  int isUnderscoreUpToDate;
};

class LookupCases : public ThumbLookup, public ::testing::WithParamInterface<LookupCase> {
 protected:
  static std::string FoundName(const ThumbnailProfile& profile) {
    const std::string path = Found(profile);
    return path.empty() ? "" : path.substr(InEaDir("").size());
  }
};

TEST_P(LookupCases, AreFoundAndJudged) {
  for (const Thumb& thumb : GetParam().thumbs) {
    MakeThumb(thumb.name, thumb.content, thumb.seconds);
  }
  EXPECT_EQ(FoundName(*colon_), GetParam().colonFinds);
  EXPECT_EQ(FoundName(*underscore_), GetParam().underscoreFinds);
  EXPECT_EQ(UpToDate(*colon_), GetParam().isColonUpToDate);
  EXPECT_EQ(UpToDate(*underscore_), GetParam().isUnderscoreUpToDate);
}

const LookupCase kCases[] = {
    {"NoThumb", {}, "", "", 0, 0},
    {"CurrentName", {{kCurrent}}, kCurrent, kCurrent, 1, 1},
    {"OlderName", {{kOlder}}, kOlder, "", 1, 0},
    {"EmptyCurrentName", {{kCurrent, ""}, {kOlder}}, kCurrent, kCurrent, 0, 0},
    {"SameAge", {{kCurrent, "x", 0}}, kCurrent, kCurrent, 1, 1},
    {"OlderThanThePhoto", {{kCurrent, "x", -1}}, kCurrent, kCurrent, 0, 0},
    {"Empty", {{kCurrent, ""}}, kCurrent, kCurrent, 0, 0},
};
INSTANTIATE_TEST_SUITE_P(Photo, LookupCases, ::testing::ValuesIn(kCases), CaseName());

TEST_F(ThumbLookup, FindsNothingWithoutMetadataDirectory) {
  RemoveTree(kEaDir);
  EXPECT_EQ(Found(*colon_), "");
}

TEST_F(ThumbLookup, ReturnsTheStatusOfTheFileFound) {
  MakeThumb(kOlder, "seventeen bytes..", 42);
  struct stat status = {};
  EXPECT_EQ(Found(*colon_, &status), InEaDir(kOlder));
  EXPECT_EQ(status.st_size, 17);
  EXPECT_EQ(status.st_mtim.tv_sec, kPhotoTime + 42);
}

TEST_F(ThumbLookup, OnlyWholeSecondsCount) {
  MakeThumb(kCurrent, "x", 0);
  SetFileTime(kPhoto, kPhotoTime, 999999999);
  EXPECT_EQ(UpToDate(*underscore_), 1);
}

TEST_F(ThumbLookup, NoThumbOfAMissingPhotoIsUpToDate) {
  MakeThumb(kCurrent);
  RemoveTree(kPhoto);
  EXPECT_EQ(UpToDate(*underscore_), 0);
}

class FailMarker : public ProfileOfEachName {
 protected:
  static void MakeEverything() {
    for (const char* name : {kCurrent, kCurrentMarker, kOlder, kOlderMarker,
                             "VELAPHOTO_THUMB_S.jpg", "VELAPHOTO_THUMB_S.fail"}) {
      MakeThumb(name);
    }
  }
};

TEST_F(FailMarker, RemovalIncludesThumbAndMarkerUnderBothNames) {
  MakeEverything();
  RemoveThumbAndFailMarker(*colon_, kEaDir);
  EXPECT_THAT(EaFiles(), ElementsAre("VELAPHOTO_THUMB_S.fail", "VELAPHOTO_THUMB_S.jpg"));
}

TEST_F(FailMarker, RemovalKeepsTheOlderNameOfAProfileThatDoesNotNameIt) {
  MakeEverything();
  RemoveThumbAndFailMarker(*underscore_, kEaDir);
  EXPECT_THAT(EaFiles(), UnorderedElementsAre(kOlder, kOlderMarker, "VELAPHOTO_THUMB_S.fail",
                                              "VELAPHOTO_THUMB_S.jpg"));
}

TEST_F(FailMarker, RemovalIgnoresErrors) {
  MakeThumb(kCurrent);
  MakeThumb(kOlderMarker);
  MakeDirectories(InEaDir(kOlder));  // cannot be removed like a file
  RemoveThumbAndFailMarker(*colon_, kEaDir);
  EXPECT_THAT(EaFiles(), ElementsAre(kOlder));
  RemoveThumbAndFailMarker(*colon_, kEaDir);
  RemoveThumbAndFailMarker(*colon_, "/tmp/missing");
}

TEST_F(FailMarker, ReplacesTheThumb) {
  MakeEverything();
  CreateThumbFailMarker(*colon_, kEaDir);
  EXPECT_THAT(EaFiles(),
              ElementsAre(kCurrentMarker, "VELAPHOTO_THUMB_S.fail", "VELAPHOTO_THUMB_S.jpg"));
  EXPECT_EQ(FileSize(InEaDir(kCurrentMarker)), 0);
  EXPECT_EQ(ModeOf(InEaDir(kCurrentMarker)), 0777);
}

TEST_F(FailMarker, TheMaskAppliesToItsMode) {
  umask(027);
  CreateThumbFailMarker(*colon_, kEaDir);
  EXPECT_EQ(ModeOf(InEaDir(kCurrentMarker)), 0750);
}

TEST_F(FailMarker, TheLastDotBeginsTheExtension) {
  AddProfile(1, "a.b.c");
  CreateThumbFailMarker(AddProfile(1, "a.b.c"), kEaDir);
  EXPECT_THAT(EaFiles(), ElementsAre("a.b.fail"));
}

TEST_F(FailMarker, ATargetThatCannotBeMadeIsIgnored) {
  CreateThumbFailMarker(*colon_, "/tmp/missing");
  EXPECT_FALSE(Exists("/tmp/missing"));
  MakeThumb(kCurrent);
  {
    const ReadOnlyMount readOnly("/tmp/photo");
    CreateThumbFailMarker(*colon_, kEaDir);
  }
  EXPECT_THAT(EaFiles(), ElementsAre(kCurrent));
}

TEST_F(FailMarker, APathWithoutADotHasNoMarker) {
  const std::string eaDir = "/tmp/plain";
  MakeDirectories(eaDir);
  WriteFile(eaDir + "/name", "thumb");
  CreateThumbFailMarker(AddProfile(1, "name"), eaDir);
  EXPECT_THAT(ListDirectory(eaDir), IsEmpty());
}

TEST_F(FailMarker, AWholePhaseIsMarkedAtOnce) {
  AddProfile(640, "VELAPHOTO:THUMB_B.jpg", 1);
  AddProfile(800, "VELAPHOTO_THUMB_L.jpg", 1);
  AddProfile(1280, "VELAPHOTO_THUMB_XL.jpg", 2);
  MakeEverything();
  MakeThumb("VELAPHOTO:THUMB_B.jpg");
  EXPECT_EQ(CreatePhaseFailMarkers(Job(), 1, kEaDir), 2);
  EXPECT_THAT(EaFiles(), UnorderedElementsAre(kCurrent, kCurrentMarker, kOlder, kOlderMarker,
                                              "VELAPHOTO_THUMB_S.jpg", "VELAPHOTO_THUMB_S.fail",
                                              "VELAPHOTO_THUMB_B.fail", "VELAPHOTO_THUMB_L.fail"));
  EXPECT_EQ(CreatePhaseFailMarkers(Job(), 2, kEaDir), 1);
  EXPECT_TRUE(Exists(InEaDir("VELAPHOTO_THUMB_XL.fail")));
}

}  // namespace
}  // namespace vela_test
