// Which phase a photo is in, told from the thumbnails it has.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <ctime>
#include <string>
#include <vector>

#include "program/stub_program_test.h"
#include "support/files.h"
#include "support/images.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr const char* kPhoto = "/tmp/photos/a.jpg";
constexpr const char* kReport = "POST_PHOTO_CONVERT /tmp/photos/a.jpg";
constexpr const char* kQuestion = "GET_INDEX_VERSION /tmp/photos/a.jpg";

/// The system asks for more kinds than the profiles make, unless a test says otherwise: the status
/// of a photo is never "nothing needed" then, and the choice of the phase decides.
class PhaseChoice : public StubProgramTest {
 protected:
  void SetUp() override {
    StubProgramTest::SetUp();
    MakePhoto(kPhoto);
  }

  /// Runs it; returns the requests.
  static std::vector<std::string> RunAndGetRequests() {
    const DaemonPeer daemon;
    EXPECT_GOOD_END(Run());
    EXPECT_THAT(ErrorLines(), IsEmpty());
    return RequestsOf(daemon);
  }

  /// Size classes of the thumbnails that the converter made, with the source each call took them
  /// from: "photo: 1280 320".
  std::vector<std::string> Made() const {
    std::vector<std::string> made;
    for (const StubCall& call : Converter().Calls()) {
      std::string line = SourceOf(call) == kPhoto ? "photo:" : SourceOf(call) + ":";
      if (SourceOf(call) == Thumb(kPhoto, "XL")) {
        line = "XL:";
      }
      for (const std::string& argument : call.arguments) {
        if (argument.compare(0, 10, "jpeg:size=") == 0) {
          line += " " + argument.substr(10, argument.find('x') - 10);
        }
      }
      made.push_back(line);
    }
    return made;
  }

  static void Empty(const std::string& path, size_t bytes) { WriteFileOfSize(path, bytes); }

  /// Dates a thumbnail a second before the photo.
  static void MakeOld(const std::string& path) {
    SetFileTime(path, ModificationTime(kPhoto).seconds - 1);
  }
};

TEST_F(PhaseChoice, PhotoThatNeedsNothingIsReportedOnly) {
  WriteFile(kSettings, kThreePhasesSizeMap);
  PutThumbs(kPhoto, {"XL", "M", "B", "S"});
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kReport));
  EXPECT_THAT(Made(), IsEmpty());
  EXPECT_FALSE(Exists(kPhotoProgress));
  EXPECT_FALSE(Exists(kQueue));
}

TEST_F(PhaseChoice, StatusComesBeforeThePhases) {
  // What the system does not ask for is not made, whatever the profiles say.
  WriteFile(kSettings, kThreePhasesSizeMap);
  PutThumbs(kPhoto, {"XL", "M", "B", "S"});
  Empty(Thumb(kPhoto, "XL"), 1);  // too small for its phase, but there
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kReport));
  EXPECT_THAT(Made(), IsEmpty());
}

TEST_F(PhaseChoice, NoWantedSizeAtAllIsNothingNeeded) {
  WriteFile(kSettings, "photo_thumb_size_map=\"0\"\n");
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kReport));
  EXPECT_THAT(MetadataOf(kPhoto), IsEmpty());
  EXPECT_TRUE(IsDirectory(MetadataDirOf(kPhoto)));
}

TEST_F(PhaseChoice, CompletePhasesAreReportedOnly) {
  PutThumbs(kPhoto, {"XL", "M", "B", "S"});
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kReport));
  EXPECT_THAT(Made(), IsEmpty());
  EXPECT_FALSE(Exists(kPhotoProgress));
  EXPECT_FALSE(Exists(kQueue));
}

TEST_F(PhaseChoice, Phase0WithoutOneThumbnail) {
  PutThumbs(kPhoto, {"XL", "B", "S"});
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kQuestion, kReport));
  EXPECT_THAT(Made(), ElementsAre("photo: 320"));
  // Phase 1 follows, though nothing is left to be made of it.
  EXPECT_EQ(3, Progress("completed_thumb"));
  EXPECT_EQ(0, Progress("completed"));
  EXPECT_EQ("/tmp/photos\n", ReadFile(kQueue));
}

TEST_F(PhaseChoice, Phase1) {
  PutThumbs(kPhoto, {"XL", "M", "S"});
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kQuestion, kReport));
  EXPECT_THAT(Made(), ElementsAre("XL: 640"));
  EXPECT_EQ(1, Progress("completed_thumb"));
  EXPECT_EQ(0, Progress("completed"));
  EXPECT_EQ("/tmp/photos\n", ReadFile(kQueue));
}

TEST_F(PhaseChoice, Phase2) {
  PutThumbs(kPhoto, {"XL", "M", "B"});
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kQuestion, kReport));
  EXPECT_THAT(Made(), ElementsAre("XL: 120"));
  EXPECT_EQ(1, Progress("completed_thumb"));
  EXPECT_EQ(1, Progress("completed"));
  EXPECT_FALSE(Exists(kQueue));
}

TEST_F(PhaseChoice, EmptyThumbnailIsMadeAgain) {
  PutThumbs(kPhoto, {"XL", "M", "B", "S"});
  Empty(Thumb(kPhoto, "M"), 0);
  RunAndGetRequests();
  EXPECT_THAT(Made(), ElementsAre("photo: 320"));
  EXPECT_GT(FileSize(Thumb(kPhoto, "M")), 1);
}

TEST_F(PhaseChoice, EmptyThumbnailOfALaterPhaseIsMadeAgain) {
  PutThumbs(kPhoto, {"XL", "M", "B", "S"});
  Empty(Thumb(kPhoto, "S"), 0);
  RunAndGetRequests();
  EXPECT_THAT(Made(), ElementsAre("XL: 120"));
}

TEST_F(PhaseChoice, ThumbnailOfOneByteMakesItsPhaseDue) {
  // It is no file that has to be made again, but none that a complete phase may have either.
  PutThumbs(kPhoto, {"XL", "M", "B", "S"});
  Empty(Thumb(kPhoto, "M"), 1);
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kQuestion, kReport));
  EXPECT_EQ(3, Progress("completed_thumb"));
  EXPECT_EQ("/tmp/photos\n", ReadFile(kQueue));
}

TEST_F(PhaseChoice, ThumbnailOfTwoBytesIsComplete) {
  PutThumbs(kPhoto, {"XL", "M", "B", "S"});
  Empty(Thumb(kPhoto, "M"), 2);
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kReport));
}

TEST_F(PhaseChoice, OutdatedPhase0IsMadeAgainAndTheOthersBehindIt) {
  PutThumbs(kPhoto, {"XL", "M", "B", "S"});
  for (const char* sizeClass : {"XL", "M", "B", "S"}) {
    MakeOld(Thumb(kPhoto, sizeClass));
  }
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kQuestion, kReport));
  EXPECT_THAT(Made(), ElementsAre("photo: 1280 320", "XL: 640"));
  EXPECT_EQ(3, Progress("completed_thumb"));
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kQuestion, kReport));
  EXPECT_THAT(Made(), ElementsAre("photo: 1280 320", "XL: 640", "XL: 120"));
  EXPECT_EQ(4, Progress("completed_thumb"));
  EXPECT_EQ(1, Progress("completed"));
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kReport));
}

TEST_F(PhaseChoice, OneOutdatedThumbnailIsMadeAgain) {
  PutThumbs(kPhoto, {"XL", "M", "B", "S"});
  MakeOld(Thumb(kPhoto, "M"));
  RunAndGetRequests();
  EXPECT_THAT(Made(), ElementsAre("photo: 320"));
}

TEST_F(PhaseChoice, OutdatedPhase1IsMadeAgain) {
  PutThumbs(kPhoto, {"XL", "M", "B", "S"});
  MakeOld(Thumb(kPhoto, "B"));
  RunAndGetRequests();
  EXPECT_THAT(Made(), ElementsAre("XL: 640"));
  EXPECT_EQ("/tmp/photos\n", ReadFile(kQueue));
}

TEST_F(PhaseChoice, OutdatedPhase2IsMadeAgain) {
  PutThumbs(kPhoto, {"XL", "M", "B", "S"});
  MakeOld(Thumb(kPhoto, "S"));
  RunAndGetRequests();
  EXPECT_THAT(Made(), ElementsAre("XL: 120"));
  EXPECT_EQ(1, Progress("completed"));
}

TEST_F(PhaseChoice, EarlierPhaseComesFirst) {
  PutThumbs(kPhoto, {"XL", "M"});
  MakeOld(Thumb(kPhoto, "XL"));
  RunAndGetRequests();
  EXPECT_THAT(Made(), ElementsAre("photo: 1280", "XL: 640"));
}

TEST_F(PhaseChoice, ThumbnailOfThePhotosOwnSecondIsUpToDate) {
  PutThumbs(kPhoto, {"XL", "M", "B", "S"});
  const int64_t second = ModificationTime(kPhoto).seconds;
  SetFileTime(kPhoto, second, 999999999);
  for (const char* sizeClass : {"XL", "M", "B", "S"}) {
    SetFileTime(Thumb(kPhoto, sizeClass), second, 0);
  }
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kReport));
}

TEST_F(PhaseChoice, OlderNamesAreAccepted) {
  WriteProfileFile(kProfiles, {{"thumb_xl", 1280, 90, std::nullopt, "VELAPHOTO:THUMB_XL.jpg", 0},
                               {"thumb_b", 640, 90, std::nullopt, "VELAPHOTO:THUMB_B.jpg", 1},
                               {"thumb_s", 120, 90, std::nullopt, "VELAPHOTO:THUMB_S.jpg", 2}});
  for (const char* sizeClass : {"XL", "B", "S"}) {
    MakeDirectories(MetadataDirOf(kPhoto));
    MakeJpeg(OldThumb(kPhoto, sizeClass));
  }
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kReport));
  EXPECT_THAT(Made(), IsEmpty());
}

TEST_F(PhaseChoice, OlderNamesAreAcceptedByTheStatusWhateverTheProfilesSay) {
  WriteFile(kSettings, kThreePhasesSizeMap);
  MakeDirectories(MetadataDirOf(kPhoto));
  for (const char* sizeClass : {"XL", "M", "B", "S"}) {
    MakeJpeg(OldThumb(kPhoto, sizeClass));
  }
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kReport));
  EXPECT_THAT(Made(), IsEmpty());
}

TEST_F(PhaseChoice, ReferenceMayHaveItsOlderName) {
  WriteProfileFile(kProfiles, {{"thumb_xl", 1280, 90, std::nullopt, "VELAPHOTO:THUMB_XL.jpg", 0},
                               {"thumb_b", 640, 90, std::nullopt, "VELAPHOTO:THUMB_B.jpg", 1}});
  MakeDirectories(MetadataDirOf(kPhoto));
  MakeJpeg(OldThumb(kPhoto, "XL"));
  RunAndGetRequests();
  EXPECT_THAT(ConvertedSources(), ElementsAre(OldThumb(kPhoto, "XL")));
  EXPECT_TRUE(Exists(Thumb(kPhoto, "B")));
  EXPECT_FALSE(Exists(OldThumb(kPhoto, "B")));
}

TEST_F(PhaseChoice, CurrentNameOfTheReferenceComesFirst) {
  WriteProfileFile(kProfiles, {{"thumb_xl", 1280, 90, std::nullopt, "VELAPHOTO:THUMB_XL.jpg", 0},
                               {"thumb_b", 640, 90, std::nullopt, "VELAPHOTO:THUMB_B.jpg", 1}});
  PutThumbs(kPhoto, {"XL"});
  MakeJpeg(OldThumb(kPhoto, "XL"));
  RunAndGetRequests();
  EXPECT_THAT(ConvertedSources(), ElementsAre(Thumb(kPhoto, "XL")));
}

TEST_F(PhaseChoice, EachPhotoHasItsOwnPhase) {
  MakePhoto("/tmp/photos/b.jpg");
  MakePhoto("/tmp/photos/c.jpg");
  MakePhoto("/tmp/photos/d.jpg");
  PutThumbs("/tmp/photos/b.jpg", {"XL", "M"});
  PutThumbs("/tmp/photos/c.jpg", {"XL", "M", "B"});
  PutThumbs("/tmp/photos/d.jpg", {"XL", "M", "B", "S"});
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kQuestion, kReport,                      //
                                               "GET_INDEX_VERSION /tmp/photos/b.jpg",   //
                                               "POST_PHOTO_CONVERT /tmp/photos/b.jpg",  //
                                               "GET_INDEX_VERSION /tmp/photos/c.jpg",   //
                                               "POST_PHOTO_CONVERT /tmp/photos/c.jpg",  //
                                               "POST_PHOTO_CONVERT /tmp/photos/d.jpg"));
  EXPECT_THAT(ConvertedSources(),
              ElementsAre(kPhoto, Thumb(kPhoto, "XL"), Thumb("/tmp/photos/b.jpg", "XL"),
                          Thumb("/tmp/photos/c.jpg", "XL")));
  EXPECT_EQ(5, Progress("completed_thumb"));
  EXPECT_EQ(1, Progress("completed"));
}

TEST_F(PhaseChoice, PhotoFromTheFutureIsDoneInTwoRunsToo) {
  SetFileTimeFromNow(kPhoto, 3600);
  const int64_t second = ModificationTime(kPhoto).seconds;
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kQuestion, kReport));
  EXPECT_EQ((FileTime{second, 0}), ModificationTime(Thumb(kPhoto, "XL")));
  EXPECT_EQ((FileTime{second, 0}), ModificationTime(Thumb(kPhoto, "B")));
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kQuestion, kReport));
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kReport));
  EXPECT_THAT(Made(), ElementsAre("photo: 1280 320", "XL: 640", "XL: 120"));
}

}  // namespace
}  // namespace vela_test
