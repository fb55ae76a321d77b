// What a failed conversion leaves: markers, counts and reports.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <mutex>
#include <string>
#include <vector>

#include "program/callback_daemon.h"
#include "program/stub_program_test.h"
#include "support/files.h"
#include "support/images.h"
#include "support/mounts.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr const char* kPhoto = "/tmp/photos/a.jpg";
constexpr const char* kReport = "POST_PHOTO_CONVERT /tmp/photos/a.jpg";
constexpr const char* kQuestion = "GET_INDEX_VERSION /tmp/photos/a.jpg";

class Failure : public StubProgramTest {
 protected:
  void SetUp() override {
    StubProgramTest::SetUp();
    MakePhoto(kPhoto);
  }

  /// Runs it; returns the requests.
  static std::vector<std::string> RunAndGetRequests() {
    const DaemonPeer daemon;
    EXPECT_GOOD_END(Run());
    return RequestsOf(daemon);
  }

  static void ExpectProgress(int completed, int completedThumb) {
    EXPECT_EQ(completed, Progress("completed"));
    EXPECT_EQ(completedThumb, Progress("completed_thumb"));
  }

  /// Everything of the photo failed, and was counted and reported once.
  static void ExpectAllFailed() {
    EXPECT_THAT(MetadataOf(kPhoto),
                ElementsAre("VELAPHOTO_THUMB_B.fail", "VELAPHOTO_THUMB_M.fail",
                            "VELAPHOTO_THUMB_S.fail", "VELAPHOTO_THUMB_XL.fail"));
    ExpectProgress(1, 4);
    EXPECT_THAT(ProgressKeys(), ElementsAre("completed", "completed_thumb"));
    EXPECT_FALSE(Exists(kQueue));
  }
};

TEST_F(Failure, Phase0TakesTheLaterPhasesWithIt) {
  Converter().Plan(StubPlan().Exit(1));
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kQuestion, kReport));
  EXPECT_EQ(1U, Converter().Calls().size());
  ExpectAllFailed();
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Failure, Phase0TakesAwayTheThumbnailsOfAllPhases) {
  PutThumbs(kPhoto, {"XL", "B", "S"});
  Converter().Plan(StubPlan().Exit(1));
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kQuestion, kReport));
  ExpectAllFailed();
}

TEST_F(Failure, Phase0IsCountedBeforeItIsReported) {
  Converter().Plan(StubPlan().Exit(1));
  std::string seen;
  CallbackDaemon daemon([&](const std::string& command, const std::string&) {
    if (command == "POST_PHOTO_CONVERT") {
      seen = ReadFile(kPhotoProgress);
    }
    return kDone;
  });
  EXPECT_GOOD_END(Run());
  daemon.Stop();
  EXPECT_EQ("completed=\"1\"\ncompleted_thumb=\"4\"\n", seen);
}

TEST_F(Failure, Phase0AfterItsOwnSuccessIsNotUndoneByPhase1) {
  Converter().PlanCall(2, StubPlan().Exit(1));
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kQuestion, kReport));
  EXPECT_EQ(2U, Converter().Calls().size());
  EXPECT_THAT(MetadataOf(kPhoto), ElementsAre("VELAPHOTO_THUMB_B.fail", "VELAPHOTO_THUMB_M.jpg",
                                              "VELAPHOTO_THUMB_S.fail", "VELAPHOTO_THUMB_XL.jpg"));
  ExpectProgress(1, 4);
  EXPECT_FALSE(Exists(kQueue));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Failure, Phase1AloneCountsTheLaterPhases) {
  PutThumbs(kPhoto, {"XL", "M", "S"});
  Converter().Plan(StubPlan().Exit(1));
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kQuestion, kReport));
  EXPECT_THAT(MetadataOf(kPhoto), ElementsAre("VELAPHOTO_THUMB_B.fail", "VELAPHOTO_THUMB_M.jpg",
                                              "VELAPHOTO_THUMB_S.fail", "VELAPHOTO_THUMB_XL.jpg"));
  ExpectProgress(1, 2);
  EXPECT_THAT(ProgressKeys(), ElementsAre("completed", "completed_thumb"));
  EXPECT_FALSE(Exists(kQueue));
}

TEST_F(Failure, Phase2StandsForItself) {
  PutThumbs(kPhoto, {"XL", "M", "B"});
  Converter().Plan(StubPlan().Exit(1));
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kQuestion, kReport));
  EXPECT_THAT(MetadataOf(kPhoto), ElementsAre("VELAPHOTO_THUMB_B.jpg", "VELAPHOTO_THUMB_M.jpg",
                                              "VELAPHOTO_THUMB_S.fail", "VELAPHOTO_THUMB_XL.jpg"));
  ExpectProgress(1, 1);
  EXPECT_FALSE(Exists(kQueue));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Failure, IsCountedByTheProfilesOfEachPhase) {
  WriteProfileFile(kProfiles, {{"thumb_xl", 1280, 90, std::nullopt, "VELAPHOTO_THUMB_XL.jpg", 0},
                               {"thumb_l", 800, 90, std::nullopt, "VELAPHOTO_THUMB_L.jpg", 1},
                               {"thumb_b", 640, 90, std::nullopt, "VELAPHOTO_THUMB_B.jpg", 1},
                               {"thumb_m", 320, 90, std::nullopt, "VELAPHOTO_THUMB_M.jpg", 2},
                               {"thumb_sm", 240, 90, std::nullopt, "VELAPHOTO_THUMB_SM.jpg", 2},
                               {"thumb_s", 120, 90, std::nullopt, "VELAPHOTO_THUMB_S.jpg", 2}});
  Converter().PlanCall(2, StubPlan().Exit(1));
  RunAndGetRequests();
  ExpectProgress(1, 6);
  Converter().PlanCall(3, StubPlan().Exit(1));
  RunAndGetRequests();  // phase 1 again
  ExpectProgress(2, 11);
  Converter().PlanCall(5, StubPlan().Exit(1));
  RunAndGetRequests();  // phase 1 succeeds
  ExpectProgress(2, 13);
  RunAndGetRequests();  // phase 2
  ExpectProgress(3, 16);
}

TEST_F(Failure, DoesNotStopTheOtherPhotos) {
  MakePhoto("/tmp/photos/b.jpg");
  MakePhoto("/tmp/photos/c.jpg");
  Converter().PlanWhen("/tmp/photos/b.jpg", StubPlan().Exit(1));
  const DaemonPeer daemon;
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(ReportedPhotos(daemon),
              ElementsAre(kPhoto, "/tmp/photos/b.jpg", "/tmp/photos/c.jpg"));
  EXPECT_TRUE(Exists(Thumb(kPhoto, "B")));
  EXPECT_TRUE(Exists(Marker("/tmp/photos/b.jpg", "B")));
  EXPECT_TRUE(Exists(Thumb("/tmp/photos/c.jpg", "B")));
  ExpectProgress(1, 10);
  EXPECT_EQ("/tmp/photos\n", ReadFile(kQueue));
}

TEST_F(Failure, ConverterThatCannotBeStarted) {
  RemoveTool(kConverterPath);
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kQuestion, kReport));
  ExpectAllFailed();
}

TEST_F(Failure, ConverterThatIsKilled) {
  Converter().Plan(StubPlan().WriteOutputs(1).DieBySignal(SIGKILL));
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kQuestion, kReport));
  ExpectProgress(1, 4);
  EXPECT_TRUE(Exists(Marker(kPhoto, "XL")));
  EXPECT_FALSE(Exists(Thumb(kPhoto, "XL")));
}

TEST_F(Failure, ConverterThatIsEndedByHandDoesNotEndTheRun) {
  Converter().PlanCall(1, StubPlan().DieBySignal(SIGTERM));
  MakePhoto("/tmp/photos/b.jpg");
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kQuestion, kReport,                     //
                                               "GET_INDEX_VERSION /tmp/photos/b.jpg",  //
                                               "POST_PHOTO_CONVERT /tmp/photos/b.jpg"));
  EXPECT_TRUE(Exists(Thumb("/tmp/photos/b.jpg", "B")));
}

TEST_F(Failure, ConverterThatLeavesOutOneThumbnail) {
  Converter().Plan(StubPlan().WriteOutputs(1));
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kQuestion, kReport));
  ExpectAllFailed();
  EXPECT_EQ(1U, ErrorLines().size());
}

TEST_F(Failure, ConverterThatMakesAUselessThumbnail) {
  Converter().Plan(StubPlan().WriteOutputs(1).WriteOutputsOfSize(1, 1));
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kQuestion, kReport));
  ExpectAllFailed();
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velamk_photo_thumb:441 [Error] file size of dest path: 1, " +
                          Thumb(kPhoto, "M")));
}

TEST_F(Failure, PhotoThatGrowsWhileItIsConverted) {
  Converter().PlanCall(1, StubPlan().WriteOutputs().AppendToSource(1 << 20));
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kQuestion, kReport));
  ExpectAllFailed();
}

TEST_F(Failure, MetadataThatCannotBeWritten) {
  MakeDirectories(MetadataDirOf(kPhoto));
  const ReadOnlyMount mount(MetadataDirOf(kPhoto));
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kQuestion, kReport));
  EXPECT_THAT(MetadataOf(kPhoto), IsEmpty());
  ExpectProgress(1, 4);
}

TEST_F(Failure, FileInPlaceOfThePhotosMetadataDirectory) {
  WriteFile(MetadataDirOf(kPhoto), "mine");
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kQuestion, kReport));
  EXPECT_EQ("mine", ReadFile(MetadataDirOf(kPhoto)));
  ExpectProgress(1, 4);
}

/// Something happens to the photo's files while the daemon is asked for the index version.
class WhileTheDaemonIsAsked : public Failure {
 protected:
  /// Runs it, with `happening` at the question; returns the requests.
  template <typename Happening>
  static std::vector<std::string> RunWith(const Happening& happening) {
    std::mutex mutex;
    std::vector<std::string> requests;
    CallbackDaemon daemon([&](const std::string& command, const std::string& path) {
      const std::lock_guard<std::mutex> lock(mutex);
      requests.push_back(command + " " + path);
      if (command == "GET_INDEX_VERSION") {
        happening();
      }
      return kDone;
    });
    EXPECT_GOOD_END(Run());
    daemon.Stop();
    return requests;
  }
};

TEST_F(WhileTheDaemonIsAsked, PhotoVanishes) {
  // There is nothing to convert; what would be made of its thumbnails is given up.
  EXPECT_THAT(RunWith([] { ASSERT_EQ(0, unlink(kPhoto)); }), ElementsAre(kQuestion, kReport));
  EXPECT_THAT(Converter().Calls(), IsEmpty());
  EXPECT_THAT(MetadataOf(kPhoto), ElementsAre("VELAPHOTO_THUMB_B.fail", "VELAPHOTO_THUMB_S.fail"));
  ExpectProgress(1, 4);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(WhileTheDaemonIsAsked, PhotoBecomesADirectory) {
  EXPECT_THAT(RunWith([] {
                ASSERT_EQ(0, unlink(kPhoto));
                ASSERT_EQ(0, mkdir(kPhoto, 0777));
              }),
              ElementsAre(kQuestion, kReport));
  EXPECT_THAT(Converter().Calls(), IsEmpty());
  ExpectAllFailed();
  EXPECT_THAT(ErrorLines(),
              ElementsAre("velamk_photo_thumb:121 [Error] not a regular file: /tmp/photos/a.jpg"));
}

TEST_F(WhileTheDaemonIsAsked, ReferenceVanishesBeforePhase1) {
  PutThumbs(kPhoto, {"XL", "M"});
  EXPECT_THAT(RunWith([] { ASSERT_EQ(0, unlink(Thumb(kPhoto, "XL").c_str())); }),
              ElementsAre(kQuestion));
  EXPECT_THAT(Converter().Calls(), IsEmpty());
  EXPECT_THAT(MetadataOf(kPhoto), ElementsAre("VELAPHOTO_THUMB_M.jpg"));
  EXPECT_FALSE(Exists(kPhotoProgress));
  EXPECT_FALSE(Exists(kQueue));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(WhileTheDaemonIsAsked, ReferenceVanishesBeforePhase2) {
  PutThumbs(kPhoto, {"XL", "M", "B"});
  EXPECT_THAT(RunWith([] { ASSERT_EQ(0, unlink(Thumb(kPhoto, "XL").c_str())); }),
              ElementsAre(kQuestion));
  EXPECT_THAT(Converter().Calls(), IsEmpty());
  EXPECT_FALSE(Exists(kPhotoProgress));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(WhileTheDaemonIsAsked, OtherThumbnailsVanishingDoNotMatter) {
  PutThumbs(kPhoto, {"XL", "M"});
  EXPECT_THAT(RunWith([] { ASSERT_EQ(0, unlink(Thumb(kPhoto, "M").c_str())); }),
              ElementsAre(kQuestion, kReport));
  EXPECT_THAT(ConvertedSources(), ElementsAre(Thumb(kPhoto, "XL")));
}

class NoReference : public Failure {
 protected:
  void SetUp() override {
    Failure::SetUp();
    WriteProfileFile(kProfiles, {{"thumb_b", 640, 90, std::nullopt, "VELAPHOTO_THUMB_B.jpg", 1},
                                 {"thumb_s", 120, 90, std::nullopt, "VELAPHOTO_THUMB_S.jpg", 2}});
  }
};

TEST_F(NoReference, PhotoIsPassedOverInPhase1) {
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kQuestion));
  EXPECT_THAT(Converter().Calls(), IsEmpty());
  EXPECT_THAT(MetadataOf(kPhoto), IsEmpty());
  EXPECT_FALSE(Exists(kPhotoProgress));
  EXPECT_FALSE(Exists(kQueue));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(NoReference, PhotoIsPassedOverInPhase2) {
  PutThumbs(kPhoto, {"B"});
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kQuestion));
  EXPECT_THAT(Converter().Calls(), IsEmpty());
  EXPECT_FALSE(Exists(kPhotoProgress));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(NoReference, OtherThumbnailsDoNotTakeItsPlace) {
  PutThumbs(kPhoto, {"XL", "M"});
  EXPECT_THAT(RunAndGetRequests(), ElementsAre(kQuestion));
  EXPECT_THAT(Converter().Calls(), IsEmpty());
}

}  // namespace
}  // namespace vela_test
