// The results of a failed conversion: markers, counts and reports.
#include <signal.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include "program/stub_program_test.h"
#include "support/mounts.h"
#include "support/seccomp_fail.h"

namespace vela_test {
namespace {

using Failure = OnePhotoTest;

const Strings kPhase1And2Failed = {"VELAPHOTO_THUMB_B.fail", "VELAPHOTO_THUMB_M.jpg",
                                   "VELAPHOTO_THUMB_S.fail", "VELAPHOTO_THUMB_XL.jpg"};
const Strings kPhase2Failed = {"VELAPHOTO_THUMB_B.jpg", "VELAPHOTO_THUMB_M.jpg",
                               "VELAPHOTO_THUMB_S.fail", "VELAPHOTO_THUMB_XL.jpg"};

/// A run in which a converter call fails.
struct FailedRun : NamedCase {
  Strings thumbs;    ///< size classes that exist before the run
  int call;          ///< the call that fails
  StubPlan plan;     ///< what it does
  Strings metadata;  ///< files that exist after the run
  int completedThumb;
  ::testing::Matcher<Strings> errors = IsEmpty();
};

class FailedConversion : public Failure, public ::testing::WithParamInterface<FailedRun> {};

TEST_P(FailedConversion, IsMarkedCountedAndReportedOnce) {
  const FailedRun& run = GetParam();
  PutThumbs(kPhoto, run.thumbs);
  Converter().PlanCall(run.call, run.plan);
  EXPECT_THAT(RunWithDaemon(), ElementsAre(kVersionRequest, kReport));
  EXPECT_THAT(Converter().Calls(), SizeIs(run.call));
  EXPECT_EQ(MetadataOf(kPhoto), run.metadata);
  ExpectProgress(1, run.completedThumb);
  // The thumbnails of an earlier call have been counted already.
  EXPECT_EQ(ProgressKeys(), run.call == 1 ? Strings({"completed", "completed_thumb"})
                                          : Strings({"completed_thumb", "completed"}));
  EXPECT_FALSE(Exists(kQueue));
  EXPECT_THAT(ErrorLines(), run.errors);
}

const StubPlan kFails = StubPlan().Exit(1);
const StubPlan kOmitsM = StubPlan().WriteOutputs(1);
const StubPlan kMakesTinyM = StubPlan().WriteOutputs(1).WriteOutputsOfSize(1, 1);
const StubPlan kPhotoGrows = StubPlan().WriteOutputs().AppendToSource(1 << 20);
const std::string kTinyM =
    "velamk_photo_thumb:441 [Error] file size of dest path: 1, " + Thumb(kPhoto, "M");

INSTANTIATE_TEST_SUITE_P(
    Conversions, FailedConversion,
    ::testing::Values(
        FailedRun{"Phase0TakesLaterPhasesWithIt", {}, 1, kFails, kAllMarkers, 4},
        FailedRun{"Phase0RemovesAllThumbnails", {"XL", "B", "S"}, 1, kFails, kAllMarkers, 4},
        FailedRun{"Phase1DoesNotUndoPhase0", {}, 2, kFails, kPhase1And2Failed, 4},
        FailedRun{"Phase1AloneCountsPhase2", {"XL", "M", "S"}, 1, kFails, kPhase1And2Failed, 2},
        FailedRun{"Phase2Alone", {"XL", "M", "B"}, 1, kFails, kPhase2Failed, 1},
        FailedRun{"PhotoGrows", {}, 1, kPhotoGrows, kAllMarkers, 4, SizeIs(1)},
        FailedRun{"ThumbnailMissing", {}, 1, kOmitsM, kAllMarkers, 4, SizeIs(1)},
        FailedRun{"ThumbnailTooSmall", {}, 1, kMakesTinyM, kAllMarkers, 4, ElementsAre(kTinyM)}),
    CaseName());

TEST_F(Failure, OfAKilledConverterIsMarked) {
  Converter().Plan(StubPlan().WriteOutputs(1).DieBySignal(SIGKILL));
  EXPECT_THAT(RunWithDaemon(), ElementsAre(kVersionRequest, kReport));
  ExpectProgress(1, 4);
  EXPECT_TRUE(Exists(Marker(kPhoto, "XL")));
  EXPECT_FALSE(Exists(Thumb(kPhoto, "XL")));
}

TEST_F(Failure, IsCountedBeforeItIsReported) {
  Converter().Plan(kFails);
  std::string seen;
  RunAndObserve([&](const std::string& request) {
    if (request == kReport) {
      seen = ReadFile(kPhotoProgress);
    }
  });
  EXPECT_EQ(seen, "completed=\"1\"\ncompleted_thumb=\"4\"\n");
}

TEST_F(Failure, IsTheSameForAConverterThatCannotBeStarted) {
  RemoveTool(kConverterPath);
  EXPECT_THAT(RunWithDaemon(), ElementsAre(kVersionRequest, kReport));
  EXPECT_EQ(MetadataOf(kPhoto), kAllMarkers);
  ExpectProgress(1, 4);
  EXPECT_THAT(ProgressKeys(), ElementsAre("completed", "completed_thumb"));
  EXPECT_FALSE(Exists(kQueue));
}

TEST_F(Failure, IsCountedByTheProfilesOfEachPhase) {
  WriteProfileFile(kProfiles, {Profile("XL", 1280, 0), Profile("L", 800, 1), Profile("B", 640, 1),
                               Profile("M", 320, 2), Profile("SM", 240, 2), Profile("S", 120, 2)});
  Converter().PlanCall(2, kFails);
  RunWithDaemon();
  ExpectProgress(1, 6);
  Converter().PlanCall(3, kFails);
  RunWithDaemon();  // phase 1 again
  ExpectProgress(2, 11);
  Converter().PlanCall(5, kFails);
  RunWithDaemon();  // phase 1 succeeds
  ExpectProgress(2, 13);
  RunWithDaemon();  // phase 2
  ExpectProgress(3, 16);
}

TEST_F(Failure, DoesNotStopTheOtherPhotos) {
  MakePhotos({"b.jpg", "c.jpg"});
  Converter().PlanWhen("/tmp/photos/b.jpg", kFails);
  EXPECT_THAT(ReportedPhotos(RunWithDaemon()),
              ElementsAre(kPhoto, "/tmp/photos/b.jpg", "/tmp/photos/c.jpg"));
  EXPECT_TRUE(Exists(Thumb(kPhoto, "B")));
  EXPECT_TRUE(Exists(Marker("/tmp/photos/b.jpg", "B")));
  EXPECT_TRUE(Exists(Thumb("/tmp/photos/c.jpg", "B")));
  ExpectProgress(1, 10);
  EXPECT_EQ(ReadFile(kQueue), "/tmp/photos\n");
}

TEST_F(Failure, ConverterEndedBySigtermDoesNotEndTheRun) {
  Converter().PlanCall(1, StubPlan().DieBySignal(SIGTERM));
  MakePhoto("/tmp/photos/b.jpg");
  EXPECT_THAT(RunWithDaemon(), ElementsAre(kVersionRequest, kReport,               //
                                           "GET_INDEX_VERSION /tmp/photos/b.jpg",  //
                                           "POST_PHOTO_CONVERT /tmp/photos/b.jpg"));
  EXPECT_TRUE(Exists(Thumb("/tmp/photos/b.jpg", "B")));
}

TEST_F(Failure, MetadataThatCannotBeWritten) {
  MakeDirectories(MetadataDirOf(kPhoto));
  const ReadOnlyMount mount(MetadataDirOf(kPhoto));
  EXPECT_THAT(RunWithDaemon(), ElementsAre(kVersionRequest, kReport));
  EXPECT_THAT(MetadataOf(kPhoto), IsEmpty());
  ExpectProgress(1, 4);
}

TEST_F(Failure, FileInPlaceOfThePhotosMetadataDirectory) {
  WriteFile(MetadataDirOf(kPhoto), "mine");
  EXPECT_THAT(RunWithDaemon(), ElementsAre(kVersionRequest, kReport));
  EXPECT_EQ(ReadFile(MetadataDirOf(kPhoto)), "mine");
  ExpectProgress(1, 4);
}

/// The photo's files change while the daemon is asked for the index version.
class WhileTheDaemonIsAsked : public Failure {
 protected:
  /// Runs the program with `happening` at the version request. Returns the requests.
  static Strings RunWith(const std::function<void()>& happening) {
    return RunAndObserve([&](const std::string& request) {
      if (request == kVersionRequest) {
        happening();
      }
    });
  }

  /// The same, removing one of the existing thumbnails.
  static Strings RunAndRemove(const std::string& sizeClass) {
    return RunWith([&] { ASSERT_EQ(unlink(Thumb(kPhoto, sizeClass).c_str()), 0); });
  }
};

TEST_F(WhileTheDaemonIsAsked, PhotoVanishes) {
  // There is nothing to convert; the thumbnails of the later phases are marked as failed.
  EXPECT_THAT(RunWith([] { ASSERT_EQ(unlink(kPhoto), 0); }), ElementsAre(kVersionRequest, kReport));
  EXPECT_THAT(Converter().Calls(), IsEmpty());
  EXPECT_THAT(MetadataOf(kPhoto), ElementsAre("VELAPHOTO_THUMB_B.fail", "VELAPHOTO_THUMB_S.fail"));
  ExpectProgress(1, 4);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(WhileTheDaemonIsAsked, PhotoBecomesADirectory) {
  const auto replace = [] {
    ASSERT_EQ(unlink(kPhoto), 0);
    ASSERT_EQ(mkdir(kPhoto, 0777), 0);
  };
  EXPECT_THAT(RunWith(replace), ElementsAre(kVersionRequest, kReport));
  EXPECT_THAT(Converter().Calls(), IsEmpty());
  EXPECT_EQ(MetadataOf(kPhoto), kAllMarkers);
  ExpectProgress(1, 4);
  EXPECT_THAT(ProgressKeys(), ElementsAre("completed", "completed_thumb"));
  EXPECT_FALSE(Exists(kQueue));
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velamk_photo_thumb:121 [Error] not a regular file: /tmp/photos/a.jpg"));
}

/// The photo is skipped: no conversion, no counting and no report.
void ExpectSkipped(const Strings& requests) {
  EXPECT_THAT(requests, ElementsAre(kVersionRequest));
  EXPECT_THAT(ConvertedSources(), IsEmpty());
  EXPECT_FALSE(Exists(kPhotoProgress));
  EXPECT_FALSE(Exists(kQueue));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(WhileTheDaemonIsAsked, ReferenceVanishesBeforePhase1) {
  PutThumbs(kPhoto, {"XL", "M"});
  ExpectSkipped(RunAndRemove("XL"));
  EXPECT_THAT(MetadataOf(kPhoto), ElementsAre("VELAPHOTO_THUMB_M.jpg"));
}

TEST_F(WhileTheDaemonIsAsked, ReferenceVanishesBeforePhase2) {
  PutThumbs(kPhoto, {"XL", "M", "B"});
  ExpectSkipped(RunAndRemove("XL"));
}

TEST_F(WhileTheDaemonIsAsked, OtherThumbnailsVanishingDoNotMatter) {
  PutThumbs(kPhoto, {"XL", "M"});
  EXPECT_THAT(RunAndRemove("M"), ElementsAre(kVersionRequest, kReport));
  EXPECT_THAT(ConvertedSources(), ElementsAre(Thumb(kPhoto, "XL")));
}

TEST_F(Failure, PhotoWithoutReferenceIsSkipped) {
  WriteProfileFile(kProfiles, {Profile("B", 640, 1), Profile("S", 120, 2)});
  ExpectSkipped(RunWithDaemon());
  EXPECT_THAT(MetadataOf(kPhoto), IsEmpty());
  PutThumbs(kPhoto, {"B"});
  ExpectSkipped(RunWithDaemon());
}

TEST_F(Failure, OtherThumbnailsDoNotTakeThePlaceOfTheReference) {
  WriteProfileFile(kProfiles, {Profile("B", 640, 1), Profile("S", 120, 2)});
  PutThumbs(kPhoto, {"XL", "M"});
  ExpectSkipped(RunWithDaemon());
}

/// The photos of a directory that is renamed in the middle of a run have not failed.
TEST_F(Failure, OfARenamedDirectoryLeavesNoMarkers) {
  PutThumbs(kPhoto, {"XL", "M", "B"});
  Converter().PlanCall(1, StubPlan().Run("/bin/mv", {kPhotos, "/tmp/moved"}).Exit(1));
  RunWithDaemon();
  EXPECT_THAT(ListTree("/tmp/moved/@eaDir"),
              ::testing::Contains(::testing::HasSubstr("THUMB_XL.jpg")));
  EXPECT_THAT(ListTree("/tmp/moved/@eaDir"),
              ::testing::Not(::testing::Contains(::testing::HasSubstr(".fail"))));
}

TEST_F(Failure, OfAnEarlierRunLeavesNothingForPhotosThatAreGone) {
  for (const char* name : {"VELAPHOTO.tmp.aBc123.jpg", "RAW_TEMP.ppm", "Temp_90.jpg"}) {
    WriteFile(MetadataDirOf(InPhotos("gone.jpg")) + "/" + name, "");
  }
  WriteFile(MetadataDirOf(InPhotos("gone.jpg")) + "/VELAPHOTO_THUMB_S.jpg", "thumb");
  WriteFile(MetadataDirOf(InPhotos("gone.mp4")) + "/VELAPHOTO_FILM_H.mp4", "video");
  EXPECT_SUCCESS(Run());
  EXPECT_EQ(MetadataOf(InPhotos("gone.jpg")), Strings({"VELAPHOTO_THUMB_S.jpg"}));
  EXPECT_EQ(MetadataOf(InPhotos("gone.mp4")), Strings({"VELAPHOTO_FILM_H.mp4"}));
}

TEST_F(Failure, OfSettingAModeIsLoggedOnly) {
  RunWithDaemon({kPhotos}, WithSteps({SeccompFail({SYS_fchmod}, EPERM)}));
  EXPECT_EQ(MetadataOf(kPhoto),
            Strings({"VELAPHOTO_THUMB_B.jpg", "VELAPHOTO_THUMB_M.jpg", "VELAPHOTO_THUMB_XL.jpg"}));
  EXPECT_THAT(ErrorLines(),
              ::testing::Contains("velamk_photo_thumb:437 [Error] Failed to chmod [" +
                                  Thumb(kPhoto, "XL") + "], Operation not permitted"));
}

}  // namespace
}  // namespace vela_test
