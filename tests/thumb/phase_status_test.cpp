// Whether the thumbnails of a phase are there and up to date, and the marking of failed phases.
#include "thumb/phase_status.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <string>

#include "support/files.h"
#include "support/mounts.h"
#include "support/system_log.h"
#include "thumb/pass_test.h"

using namespace vela;

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr int64_t kNow = 1700000000;

class PhaseOutdated : public PassTest {
 protected:
  void SetUp() override {
    PassTest::SetUp();
    PutFile(kPhoto, 10, kNow, 500);
  }

  bool IsOutdated(int phase) const { return IsPhaseThumbOutdated(Job(), phase, kPhoto, kMetadata); }
};

TEST_F(PhaseOutdated, MissingThumbnailsAreNotOutdated) {
  for (const int phase : {0, 1, 2, kAllPhases}) {
    EXPECT_FALSE(IsOutdated(phase)) << phase;
  }
}

TEST_F(PhaseOutdated, CountsWholeSeconds) {
  PutFile(Thumb("B"), 10, kNow - 1, 999999999);
  EXPECT_TRUE(IsOutdated(1));
  SetFileTime(Thumb("B"), kNow, 0);  // 500 ns before the photo
  EXPECT_FALSE(IsOutdated(1));
  SetFileTime(Thumb("B"), kNow + 1);
  EXPECT_FALSE(IsOutdated(1));
}

TEST_F(PhaseOutdated, OneOfSeveralIsEnough) {
  PutFile(Thumb("M"), 10, kNow);
  PutFile(Thumb("XL"), 10, kNow);
  EXPECT_FALSE(IsOutdated(0));
  SetFileTime(Thumb("XL"), kNow - 1);
  EXPECT_TRUE(IsOutdated(0));
  SetFileTime(Thumb("XL"), kNow);
  SetFileTime(Thumb("M"), kNow - 1);
  EXPECT_TRUE(IsOutdated(0));
}

TEST_F(PhaseOutdated, MissingOnesDoNotHideAnOutdatedOne) {
  PutFile(Thumb("XL"), 10, kNow - 1);
  EXPECT_TRUE(IsOutdated(0));
}

TEST_F(PhaseOutdated, OtherPhasesDoNotCount) {
  PutFile(Thumb("B"), 10, kNow - 1);
  EXPECT_FALSE(IsOutdated(0));
  EXPECT_TRUE(IsOutdated(1));
  EXPECT_FALSE(IsOutdated(2));
  EXPECT_TRUE(IsOutdated(kAllPhases));
}

TEST_F(PhaseOutdated, EmptyThumbnailsCountByTheirDateOnly) {
  PutFile(Thumb("B"), 0, kNow);
  EXPECT_FALSE(IsOutdated(1));
  SetFileTime(Thumb("B"), kNow - 1);
  EXPECT_TRUE(IsOutdated(1));
}

TEST_F(PhaseOutdated, KnowsOlderNames) {
  UseProfiles({{"thumb_b", 640, 80, std::nullopt, "VELAPHOTO:THUMB_B.jpg", 1}});
  PutFile(OldThumb("B"), 10, kNow - 1);
  EXPECT_TRUE(IsOutdated(1));
  // The current name is looked at first.
  PutFile(Thumb("B"), 10, kNow);
  EXPECT_FALSE(IsOutdated(1));
}

TEST_F(PhaseOutdated, MissingPhotoOutdatesNothing) {
  PutFile(Thumb("B"), 10, kNow - 1);
  ASSERT_EQ(0, unlink(kPhoto));
  EXPECT_FALSE(IsOutdated(1));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(PhaseOutdated, LooksAtThePhotoNotAtTheLinkToIt) {
  PutFile("/tmp/elsewhere", 10, kNow);
  ASSERT_EQ(0, unlink(kPhoto));
  ASSERT_EQ(0, symlink("/tmp/elsewhere", kPhoto));
  PutFile(Thumb("B"), 10, kNow);
  EXPECT_FALSE(IsOutdated(1));
  SetFileTime("/tmp/elsewhere", kNow + 1);
  EXPECT_TRUE(IsOutdated(1));
}

TEST_F(PhaseOutdated, PhaseWithoutProfilesIsNot) {
  UseProfiles({{"thumb_b", 640, 80, std::nullopt, "VELAPHOTO_THUMB_B.jpg", 1}});
  PutFile(Thumb("XL"), 10, kNow - 1);
  PutFile(Thumb("S"), 10, kNow - 1);
  EXPECT_FALSE(IsOutdated(0));
  EXPECT_FALSE(IsOutdated(2));
}

class PhaseComplete : public PassTest {
 protected:
  bool IsComplete(int phase) const { return IsPhaseThumbComplete(Job(), phase, kMetadata); }
};

TEST_F(PhaseComplete, NeedsEveryThumbnail) {
  EXPECT_FALSE(IsComplete(0));
  WriteFileOfSize(Thumb("M"), 2);
  EXPECT_FALSE(IsComplete(0));
  WriteFileOfSize(Thumb("XL"), 2);
  EXPECT_TRUE(IsComplete(0));
  ASSERT_EQ(0, unlink(Thumb("M").c_str()));
  EXPECT_FALSE(IsComplete(0));
}

TEST_F(PhaseComplete, NeedsTwoBytesInEach) {
  WriteFileOfSize(Thumb("M"), 2);
  for (const size_t bytes : {0U, 1U}) {
    WriteFileOfSize(Thumb("XL"), bytes);
    EXPECT_FALSE(IsComplete(0)) << bytes;
  }
  WriteFileOfSize(Thumb("XL"), 2);
  EXPECT_TRUE(IsComplete(0));
  WriteFileOfSize(Thumb("M"), 1);
  EXPECT_FALSE(IsComplete(0));
}

TEST_F(PhaseComplete, OtherPhasesDoNotCount) {
  WriteFileOfSize(Thumb("B"), 2);
  EXPECT_FALSE(IsComplete(0));
  EXPECT_TRUE(IsComplete(1));
  EXPECT_FALSE(IsComplete(2));
  EXPECT_FALSE(IsComplete(kAllPhases));
}

TEST_F(PhaseComplete, AllPhasesTogether) {
  for (const char* sizeClass : {"S", "M", "B", "XL"}) {
    EXPECT_FALSE(IsComplete(kAllPhases));
    WriteFileOfSize(Thumb(sizeClass), 2);
  }
  EXPECT_TRUE(IsComplete(kAllPhases));
}

TEST_F(PhaseComplete, KnowsOlderNames) {
  UseProfiles({{"thumb_b", 640, 80, std::nullopt, "VELAPHOTO:THUMB_B.jpg", 1}});
  WriteFileOfSize(OldThumb("B"), 2);
  EXPECT_TRUE(IsComplete(1));
  // The current name is looked at first.
  WriteFileOfSize(Thumb("B"), 1);
  EXPECT_FALSE(IsComplete(1));
}

TEST_F(PhaseComplete, PhaseWithoutProfilesIs) {
  UseProfiles({{"thumb_b", 640, 80, std::nullopt, "VELAPHOTO_THUMB_B.jpg", 1}});
  EXPECT_TRUE(IsComplete(0));
  EXPECT_FALSE(IsComplete(1));
  EXPECT_TRUE(IsComplete(2));
}

class MarkFailed : public PassTest {
 protected:
  static std::vector<std::string> Metadata() { return ListDirectory(kMetadata); }
};

TEST_F(MarkFailed, PutsAMarkerForEachProfileOfThePhase) {
  EXPECT_EQ(2, MarkPhaseFailed(Job(), 0, kMetadata));
  EXPECT_THAT(Metadata(), ElementsAre("VELAPHOTO_THUMB_M.fail", "VELAPHOTO_THUMB_XL.fail"));
  EXPECT_EQ(1, MarkPhaseFailed(Job(), 1, kMetadata));
  EXPECT_EQ(1, MarkPhaseFailed(Job(), 2, kMetadata));
  EXPECT_THAT(Metadata(), ElementsAre("VELAPHOTO_THUMB_B.fail", "VELAPHOTO_THUMB_M.fail",
                                      "VELAPHOTO_THUMB_S.fail", "VELAPHOTO_THUMB_XL.fail"));
}

TEST_F(MarkFailed, AllAtOnce) {
  EXPECT_EQ(4, MarkAllProfilesFailed(Job(), kMetadata));
  EXPECT_THAT(Metadata(), ElementsAre("VELAPHOTO_THUMB_B.fail", "VELAPHOTO_THUMB_M.fail",
                                      "VELAPHOTO_THUMB_S.fail", "VELAPHOTO_THUMB_XL.fail"));
}

TEST_F(MarkFailed, MarkersAreEmptyAndForEverybody) {
  MarkPhaseFailed(Job(), 1, kMetadata);
  const std::string marker = std::string(kMetadata) + "/VELAPHOTO_THUMB_B.fail";
  EXPECT_EQ(0, FileSize(marker));
  EXPECT_EQ(0777, ModeOf(marker));
}

TEST_F(MarkFailed, TakesAwayTheThumbnailsOfThePhaseOnly) {
  UseProfiles({{"thumb_m", 320, 80, std::nullopt, "VELAPHOTO_THUMB_M.jpg", 0},
               {"thumb_b", 640, 80, std::nullopt, "VELAPHOTO:THUMB_B.jpg", 1}});
  for (const std::string& path : {Thumb("M"), Thumb("B"), OldThumb("B")}) {
    WriteFile(path, "xx");
  }
  EXPECT_EQ(1, MarkPhaseFailed(Job(), 1, kMetadata));
  EXPECT_THAT(Metadata(), ElementsAre("VELAPHOTO_THUMB_B.fail", "VELAPHOTO_THUMB_M.jpg"));
}

TEST_F(MarkFailed, NoProfileNoMarker) {
  UseProfiles({});
  EXPECT_EQ(0, MarkAllProfilesFailed(Job(), kMetadata));
  for (const int phase : {0, 1, 2}) {
    EXPECT_EQ(0, MarkPhaseFailed(Job(), phase, kMetadata));
  }
  EXPECT_THAT(Metadata(), IsEmpty());
}

TEST_F(MarkFailed, CountsProfilesAlsoWhenNoMarkerCanBeMade) {
  const ReadOnlyMount mount(kMetadata);
  EXPECT_EQ(4, MarkAllProfilesFailed(Job(), kMetadata));
  EXPECT_EQ(2, MarkPhaseFailed(Job(), 0, kMetadata));
  EXPECT_THAT(Metadata(), IsEmpty());
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

}  // namespace
}  // namespace vela_test
