// Profiles and lookups in lists of them.
#include <gmock/gmock.h>

#include <climits>
#include <memory>
#include <string>

#include "profiles/thumbnail_profile.h"

using namespace vela;

namespace vela_test {
namespace {

const ThumbnailProfile* Add(ThumbnailProfileList& list, int size, int phase) {
  list.all.push_back(std::make_unique<const ThumbnailProfile>(size, 80, "", "name.jpg", phase));
  const ThumbnailProfile* profile = list.all.back().get();
  (phase == 0 ? list.phase0 : phase == 1 ? list.phase1 : list.phase2).push_back(profile);
  return profile;
}

TEST(ProfileRecord, ReturnsItsArguments) {
  const ThumbnailProfile profile(640, 75, "1x1", "VELAPHOTO:THUMB_B.jpg", 9);
  EXPECT_EQ(profile.size(), 640);
  EXPECT_EQ(profile.quality(), 75);
  EXPECT_EQ(profile.unsharp(), "1x1");
  EXPECT_EQ(profile.filename(), "VELAPHOTO:THUMB_B.jpg");
  EXPECT_EQ(profile.thumbName(), "VELAPHOTO_THUMB_B.jpg");
  EXPECT_EQ(profile.phase(), 9);
  EXPECT_FALSE(profile.fillArea());
}

TEST(ProfileRecord, EveryColonOfTheNameIsReplaced) {
  EXPECT_EQ(ThumbnailProfile(1, 1, "", ":a::b:", 0).thumbName(), "_a__b_");
  EXPECT_TRUE(ThumbnailProfile(1, 1, "", "VELAPHOTO:THUMB:M.jpg", 0).fillArea());
}

TEST(ProfileRecord, OnlyTheExactNamesFillTheirBox) {
  for (const char* name : {"VELAPHOTO_THUMB_M.JPG", "velaphoto_thumb_m.jpg", "VELAPHOTO_THUMB_M",
                           "xVELAPHOTO_THUMB_M.jpg", "VELAPHOTO_THUMB_M.jpgx", ""}) {
    EXPECT_FALSE(ThumbnailProfile(1, 1, "", name, 0).fillArea()) << name;
  }
}

TEST(ProfileOrder, IsBySize) {
  const ThumbnailProfile small(-1, 99, "z", "z", 2);
  const ThumbnailProfile large(120, 1, "a", "a", 0);
  const ThumbnailProfile sameSize(120, 50, "b", "b", 1);
  EXPECT_TRUE(ProfileSortPredicate(small, large));
  EXPECT_FALSE(ProfileSortPredicate(large, small));
  EXPECT_FALSE(ProfileSortPredicate(large, sameSize));
  EXPECT_FALSE(ProfileSortPredicate(sameSize, large));
}

TEST(ProfileList, IsEmptyWhenNew) {
  const ThumbnailProfileList list;
  for (const int phase : {-1, 0, 1, 2, 3}) {
    EXPECT_EQ(GetProfileCount(list, phase), 0);
    EXPECT_EQ(GetProfileAt(list, 0, phase), nullptr);
  }
}

TEST(ProfileList, CountsByPhase) {
  ThumbnailProfileList list;
  Add(list, 1, 0);
  Add(list, 2, 1);
  Add(list, 3, 1);
  Add(list, 4, 2);
  Add(list, 5, 2);
  Add(list, 6, 2);
  EXPECT_EQ(GetProfileCount(list, 0), 1);
  EXPECT_EQ(GetProfileCount(list, 1), 2);
  EXPECT_EQ(GetProfileCount(list, 2), 3);
  for (const int all : {-1, 3, 5, INT_MAX, INT_MIN}) {
    EXPECT_EQ(GetProfileCount(list, all), 6) << all;
  }
}

TEST(ProfileList, FindsProfilesByPhaseAndPosition) {
  ThumbnailProfileList list;
  const ThumbnailProfile* first = Add(list, 1, 1);
  const ThumbnailProfile* second = Add(list, 2, 0);
  const ThumbnailProfile* third = Add(list, 3, 1);
  const ThumbnailProfile* fourth = Add(list, 4, 2);
  EXPECT_EQ(GetProfileAt(list, 0, 0), second);
  EXPECT_EQ(GetProfileAt(list, 0, 1), first);
  EXPECT_EQ(GetProfileAt(list, 1, 1), third);
  EXPECT_EQ(GetProfileAt(list, 0, 2), fourth);
  for (const int all : {-1, 5}) {
    EXPECT_EQ(GetProfileAt(list, 0, all), first);
    EXPECT_EQ(GetProfileAt(list, 1, all), second);
    EXPECT_EQ(GetProfileAt(list, 2, all), third);
    EXPECT_EQ(GetProfileAt(list, 3, all), fourth);
  }
}

TEST(ProfileList, FindsNothingPastTheEnd) {
  ThumbnailProfileList list;
  Add(list, 1, 0);
  Add(list, 2, 1);
  for (const int phase : {0, 1}) {
    EXPECT_NE(GetProfileAt(list, 0, phase), nullptr);
    EXPECT_EQ(GetProfileAt(list, 1, phase), nullptr);
  }
  EXPECT_EQ(GetProfileAt(list, 0, 2), nullptr);
  EXPECT_EQ(GetProfileAt(list, 2, -1), nullptr);
  EXPECT_EQ(GetProfileAt(list, INT_MAX, -1), nullptr);
  EXPECT_EQ(GetProfileAt(list, -1, -1), nullptr);
  EXPECT_EQ(GetProfileAt(list, -1, 0), nullptr);
}

}  // namespace
}  // namespace vela_test
