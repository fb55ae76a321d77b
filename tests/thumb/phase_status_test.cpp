// Whether the thumbnails of a phase exist and are up to date, and the marking of failed phases.
#include "thumb/phase_status.h"

#include "thumb/thumb_test.h"

using namespace vela;

namespace vela_test {
namespace {

constexpr int64_t kNow = 1700000000;

class PhaseOutdated : public PassTest {
 protected:
  void SetUp() override {
    PassTest::SetUp();
    PutFile(kPhoto, 10, kNow, 500);
  }

  bool IsOutdated(int phase) const { return IsPhaseThumbOutdated(Job(), phase, kPhoto, kMetadata); }
};

/// Thumbnails with their dates relative to the photo, and whether they make a phase outdated.
struct DatedThumbs : NamedCase {
  struct Thumb {
    const char* sizeClass;
    int64_t seconds;
    int64_t nanoseconds;
  };
  std::vector<Thumb> thumbs;
  int phase;
  bool isOutdated;
};

class DatedPhase : public PhaseOutdated, public ::testing::WithParamInterface<DatedThumbs> {};

TEST_P(DatedPhase, IsOutdatedByAnyThumbnailOfAnEarlierSecond) {
  for (const size_t bytes : {10U, 0U}) {  // only the date of an empty thumbnail matters
    for (const DatedThumbs::Thumb& thumb : GetParam().thumbs) {
      PutFile(Thumb(thumb.sizeClass), bytes, kNow + thumb.seconds, thumb.nanoseconds);
    }
    EXPECT_EQ(IsOutdated(GetParam().phase), GetParam().isOutdated) << bytes;
  }
}

INSTANTIATE_TEST_SUITE_P(
    Thumbs, DatedPhase,
    ::testing::Values(DatedThumbs{"NoneInPhase0", {}, 0, false},
                      DatedThumbs{"NoneInPhase1", {}, 1, false},
                      DatedThumbs{"NoneInPhase2", {}, 2, false},
                      DatedThumbs{"NoneAtAll", {}, kAllPhases, false},
                      DatedThumbs{"SecondBefore", {{"B", -1, 999999999}}, 1, true},
                      DatedThumbs{"SameSecond", {{"B", 0, 0}}, 1, false},
                      DatedThumbs{"SecondAfter", {{"B", 1, 0}}, 1, false},
                      DatedThumbs{"BothUpToDate", {{"M", 0, 0}, {"XL", 0, 0}}, 0, false},
                      DatedThumbs{"LargerOutdated", {{"M", 0, 0}, {"XL", -1, 0}}, 0, true},
                      DatedThumbs{"SmallerOutdated", {{"M", -1, 0}, {"XL", 0, 0}}, 0, true},
                      DatedThumbs{"OneMissing", {{"XL", -1, 0}}, 0, true},
                      DatedThumbs{"OfALaterPhase", {{"B", -1, 0}}, 0, false},
                      DatedThumbs{"OfAnEarlierPhase", {{"B", -1, 0}}, 2, false},
                      DatedThumbs{"AllPhasesTogether", {{"B", -1, 0}}, kAllPhases, true}),
    CaseName());

TEST_F(PhaseOutdated, KnowsOlderNames) {
  UseProfiles({{"thumb_b", 640, 80, std::nullopt, "VELAPHOTO:THUMB_B.jpg", 1}});
  PutFile(OldThumb("B"), 10, kNow - 1);
  EXPECT_TRUE(IsOutdated(1));
  // The current name comes first.
  PutFile(Thumb("B"), 10, kNow);
  EXPECT_FALSE(IsOutdated(1));
}

TEST_F(PhaseOutdated, MissingPhotoOutdatesNothing) {
  PutFile(Thumb("B"), 10, kNow - 1);
  ASSERT_EQ(unlink(kPhoto), 0);
  EXPECT_FALSE(IsOutdated(1));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(PhaseOutdated, LooksAtThePhotoNotAtTheLinkToIt) {
  PutFile("/tmp/elsewhere", 10, kNow);
  ASSERT_EQ(unlink(kPhoto), 0);
  ASSERT_EQ(symlink("/tmp/elsewhere", kPhoto), 0);
  PutFile(Thumb("B"), 10, kNow);
  EXPECT_FALSE(IsOutdated(1));
  SetFileTime("/tmp/elsewhere", kNow + 1);
  EXPECT_TRUE(IsOutdated(1));
}

TEST_F(PhaseOutdated, PhaseWithoutProfilesIsNotOutdated) {
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

/// Thumbnails with their sizes, and whether they complete a phase.
struct SizedThumbs : NamedCase {
  struct Thumb {
    const char* sizeClass;
    size_t bytes;
  };
  std::vector<Thumb> thumbs;
  int phase;
  bool isComplete;
};

class SizedPhase : public PhaseComplete, public ::testing::WithParamInterface<SizedThumbs> {};

TEST_P(SizedPhase, IsCompleteWithTwoBytesInEachThumbnail) {
  for (const SizedThumbs::Thumb& thumb : GetParam().thumbs) {
    WriteFileOfSize(Thumb(thumb.sizeClass), thumb.bytes);
  }
  EXPECT_EQ(IsComplete(GetParam().phase), GetParam().isComplete);
}

INSTANTIATE_TEST_SUITE_P(
    Thumbs, SizedPhase,
    ::testing::Values(SizedThumbs{"None", {}, 0, false},
                      SizedThumbs{"SmallerOnly", {{"M", 2}}, 0, false},
                      SizedThumbs{"LargerOnly", {{"XL", 2}}, 0, false},
                      SizedThumbs{"Both", {{"M", 2}, {"XL", 2}}, 0, true},
                      SizedThumbs{"LargerEmpty", {{"M", 2}, {"XL", 0}}, 0, false},
                      SizedThumbs{"LargerOfOneByte", {{"M", 2}, {"XL", 1}}, 0, false},
                      SizedThumbs{"SmallerOfOneByte", {{"M", 1}, {"XL", 2}}, 0, false},
                      SizedThumbs{"OfALaterPhase", {{"B", 2}}, 0, false},
                      SizedThumbs{"OfItsOwnPhase", {{"B", 2}}, 1, true},
                      SizedThumbs{"OfAnEarlierPhase", {{"B", 2}}, 2, false},
                      SizedThumbs{"OnePhaseOfAll", {{"B", 2}}, kAllPhases, false}),
    CaseName());

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
  // The current name comes first.
  WriteFileOfSize(Thumb("B"), 1);
  EXPECT_FALSE(IsComplete(1));
}

TEST_F(PhaseComplete, PhaseWithoutProfilesIsComplete) {
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
  EXPECT_EQ(MarkPhaseFailed(Job(), 0, kMetadata), 2);
  EXPECT_THAT(Metadata(), ElementsAre("VELAPHOTO_THUMB_M.fail", "VELAPHOTO_THUMB_XL.fail"));
  EXPECT_EQ(MarkPhaseFailed(Job(), 1, kMetadata), 1);
  EXPECT_EQ(MarkPhaseFailed(Job(), 2, kMetadata), 1);
  EXPECT_THAT(Metadata(), ElementsAre("VELAPHOTO_THUMB_B.fail", "VELAPHOTO_THUMB_M.fail",
                                      "VELAPHOTO_THUMB_S.fail", "VELAPHOTO_THUMB_XL.fail"));
}

TEST_F(MarkFailed, AllAtOnce) {
  EXPECT_EQ(MarkAllProfilesFailed(Job(), kMetadata), 4);
  EXPECT_THAT(Metadata(), ElementsAre("VELAPHOTO_THUMB_B.fail", "VELAPHOTO_THUMB_M.fail",
                                      "VELAPHOTO_THUMB_S.fail", "VELAPHOTO_THUMB_XL.fail"));
}

TEST_F(MarkFailed, MarkersAreEmptyAndWritableByAll) {
  MarkPhaseFailed(Job(), 1, kMetadata);
  const std::string marker = std::string(kMetadata) + "/VELAPHOTO_THUMB_B.fail";
  EXPECT_EQ(FileSize(marker), 0);
  EXPECT_EQ(ModeOf(marker), 0777);
}

TEST_F(MarkFailed, RemovesTheThumbnailsOfThePhaseOnly) {
  UseProfiles({{"thumb_m", 320, 80, std::nullopt, "VELAPHOTO_THUMB_M.jpg", 0},
               {"thumb_b", 640, 80, std::nullopt, "VELAPHOTO:THUMB_B.jpg", 1}});
  for (const std::string& path : {Thumb("M"), Thumb("B"), OldThumb("B")}) {
    WriteFile(path, "xx");
  }
  EXPECT_EQ(MarkPhaseFailed(Job(), 1, kMetadata), 1);
  EXPECT_THAT(Metadata(), ElementsAre("VELAPHOTO_THUMB_B.fail", "VELAPHOTO_THUMB_M.jpg"));
}

TEST_F(MarkFailed, MakesNoMarkerWithoutProfiles) {
  UseProfiles({});
  EXPECT_EQ(MarkAllProfilesFailed(Job(), kMetadata), 0);
  for (const int phase : {0, 1, 2}) {
    EXPECT_EQ(MarkPhaseFailed(Job(), phase, kMetadata), 0);
  }
  EXPECT_THAT(Metadata(), IsEmpty());
}

TEST_F(MarkFailed, CountsProfilesAlsoWhenNoMarkerCanBeMade) {
  const ReadOnlyMount mount(kMetadata);
  EXPECT_EQ(MarkAllProfilesFailed(Job(), kMetadata), 4);
  EXPECT_EQ(MarkPhaseFailed(Job(), 0, kMetadata), 2);
  EXPECT_THAT(Metadata(), IsEmpty());
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

}  // namespace
}  // namespace vela_test
