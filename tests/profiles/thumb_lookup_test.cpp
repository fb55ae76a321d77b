// Finding a profile's thumbnail and telling whether it can stay.
#include <gmock/gmock.h>

#include <string>

#include "profiles/plan_fixture.h"

namespace vela_test {
namespace {

constexpr const char* kCurrent = "VELAPHOTO_THUMB_M.jpg";
constexpr const char* kOlder = "VELAPHOTO:THUMB_M.jpg";

class ThumbLookup : public PlanTest {
 protected:
  void SetUp() override {
    PlanTest::SetUp();
    colon_ = &AddProfile(320, kOlder);
    underscore_ = &AddProfile(320, kCurrent);
  }

  /// The path found, "" when none is.
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

  const ThumbnailProfile* colon_ = nullptr;
  const ThumbnailProfile* underscore_ = nullptr;
};

TEST_F(ThumbLookup, FindsNothingInAnEmptyDirectory) {
  EXPECT_EQ(Found(*colon_), "");
  EXPECT_EQ(Found(*underscore_), "");
  RemoveTree(kEaDir);
  EXPECT_EQ(Found(*colon_), "");
}

TEST_F(ThumbLookup, FindsTheCurrentName) {
  MakeThumb(kCurrent);
  EXPECT_EQ(Found(*colon_), InEaDir(kCurrent));
  EXPECT_EQ(Found(*underscore_), InEaDir(kCurrent));
}

TEST_F(ThumbLookup, FindsTheConfiguredName) {
  MakeThumb(kOlder);
  EXPECT_EQ(Found(*colon_), InEaDir(kOlder));
  EXPECT_EQ(Found(*underscore_), "");
}

TEST_F(ThumbLookup, TheCurrentNameGoesFirst) {
  MakeThumb(kCurrent, "");
  MakeThumb(kOlder);
  EXPECT_EQ(Found(*colon_), InEaDir(kCurrent));
}

TEST_F(ThumbLookup, GivesTheStatusOfTheFileFound) {
  MakeThumb(kOlder, "seventeen bytes..", 42);
  struct stat status = {};
  EXPECT_EQ(Found(*colon_, &status), InEaDir(kOlder));
  EXPECT_EQ(status.st_size, 17);
  EXPECT_EQ(status.st_mtim.tv_sec, kPhotoTime + 42);
}

TEST_F(ThumbLookup, AThumbAsOldAsThePhotoIsUpToDate) {
  MakeThumb(kCurrent, "x", 0);
  EXPECT_EQ(UpToDate(*underscore_), 1);
}

TEST_F(ThumbLookup, AYoungerThumbIsUpToDate) {
  MakeThumb(kCurrent, "x", 1);
  EXPECT_EQ(UpToDate(*underscore_), 1);
}

TEST_F(ThumbLookup, AnOlderThumbIsNot) {
  MakeThumb(kCurrent, "x", -1);
  EXPECT_EQ(UpToDate(*underscore_), 0);
}

TEST_F(ThumbLookup, OnlyWholeSecondsCount) {
  MakeThumb(kCurrent, "x", 0);
  SetFileTime(kPhoto, kPhotoTime, 999999999);
  EXPECT_EQ(UpToDate(*underscore_), 1);
}

TEST_F(ThumbLookup, AnEmptyThumbIsNot) {
  MakeThumb(kCurrent, "");
  EXPECT_EQ(UpToDate(*underscore_), 0);
}

TEST_F(ThumbLookup, AMissingThumbIsNot) {
  EXPECT_EQ(UpToDate(*underscore_), 0);
}

TEST_F(ThumbLookup, TheConfiguredNameCounts) {
  MakeThumb(kOlder);
  EXPECT_EQ(UpToDate(*colon_), 1);
  EXPECT_EQ(UpToDate(*underscore_), 0);
}

TEST_F(ThumbLookup, AnEmptyThumbOfTheCurrentNameHidesTheConfiguredOne) {
  MakeThumb(kCurrent, "");
  MakeThumb(kOlder);
  EXPECT_EQ(UpToDate(*colon_), 0);
}

TEST_F(ThumbLookup, NoThumbFitsAPhotoThatIsGone) {
  MakeThumb(kCurrent);
  RemoveTree(kPhoto);
  EXPECT_EQ(UpToDate(*underscore_), 0);
  EXPECT_THAT(ErrorLines(), ::testing::IsEmpty());
}

}  // namespace
}  // namespace vela_test
