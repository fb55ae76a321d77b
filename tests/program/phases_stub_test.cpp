// A fresh photo on its way through three phases and two runs: every effect, in its order.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <mutex>
#include <string>
#include <vector>

#include "program/callback_daemon.h"
#include "program/stub_program_test.h"
#include "support/files.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr const char* kPhoto = "/tmp/photos/a.jpg";
constexpr const char* kMetadata = "/tmp/photos/@eaDir/a.jpg";
constexpr const char* kReference = "/tmp/photos/@eaDir/a.jpg/VELAPHOTO_THUMB_XL.jpg";
constexpr const char* kTemporary = "/tmp/photos/@eaDir/a.jpg/VELAPHOTO.tmp.??????.jpg";

/// What one run was seen to do, in order: requests, conversions, and at each the progress so far.
class RunDiary {
 public:
  void Add(const std::string& what) {
    const std::string seen = what + ", completed " + std::to_string(Progress("completed")) + ", " +
                             std::to_string(Progress("completed_thumb")) +
                             (Exists(kQueue) ? ", queued" : "");
    const std::lock_guard<std::mutex> lock(mutex_);
    lines_.push_back(seen);
  }

  std::vector<std::string> Lines() const {
    const std::lock_guard<std::mutex> lock(mutex_);
    return lines_;
  }

 private:
  mutable std::mutex mutex_;
  std::vector<std::string> lines_;
};

class Phases : public StubProgramTest {
 protected:
  void SetUp() override {
    StubProgramTest::SetUp();
    MakePhoto(kPhoto);
  }

  /// Runs the program; returns what the daemon saw at each of its requests.
  static std::vector<std::string> RunAndWatch() {
    RunDiary diary;
    CallbackDaemon daemon([&](const std::string& command, const std::string& path) {
      diary.Add(command + " " + path);
      return kDone;
    });
    EXPECT_GOOD_END(Run());
    daemon.Stop();
    return diary.Lines();
  }

  std::vector<std::string> Command(size_t call) const {
    const std::vector<StubCall> calls = Converter().Calls();
    return call < calls.size() ? WithoutRandomNames(calls[call].arguments)
                               : std::vector<std::string>();
  }
};

TEST_F(Phases, FirstRunMakesPhase0FromThePhotoAndPhase1FromItsLargest) {
  EXPECT_THAT(RunAndWatch(), ElementsAre("GET_INDEX_VERSION /tmp/photos/a.jpg, completed 0, 0",
                                         "POST_PHOTO_CONVERT /tmp/photos/a.jpg, completed 0, 3"));
  ASSERT_EQ(2U, Converter().Calls().size());
  EXPECT_THAT(Command(0),
              ElementsAre(kConverterPath, "-define",
                          "registry:temporary-path=/tmp/photos/@eaDir/a.jpg", kPhoto,  //
                          "(", "-clone", "0",                                          //
                          "-define", "jpeg:size=1280x1280",                            //
                          "-thumbnail", "1280x1280>^", "-quality", "90",               //
                          "+profile", "!icc,*", "-flatten", "-auto-orient",            //
                          "-unsharp", "0.5x0.5+1.25+0.0", "-colorspace", "sRGB",       //
                          "-write", kTemporary, ")", "-delete", "0",                   //
                          "-define", "jpeg:size=320x320",                              //
                          "-thumbnail", "320x320>^", "-quality", "75",                 //
                          "+profile", "!icc,*", "-flatten", "-auto-orient",            //
                          "-colorspace", "sRGB", kTemporary));
  EXPECT_THAT(Command(1),
              ElementsAre(kConverterPath, "-define",
                          "registry:temporary-path=/tmp/photos/@eaDir/a.jpg", kReference,  //
                          "-define", "jpeg:size=640x640",                                  //
                          "-thumbnail", "640x640>", "-quality", "85",                      //
                          "-flatten", "-auto-orient",                                      //
                          "-unsharp", "0.6x0.6+1.0+0.0", "-colorspace", "sRGB", kTemporary));
  EXPECT_THAT(
      ListDirectory(kMetadata),
      ElementsAre("VELAPHOTO_THUMB_B.jpg", "VELAPHOTO_THUMB_M.jpg", "VELAPHOTO_THUMB_XL.jpg"));
  EXPECT_THAT(ProgressKeys(), ElementsAre("completed_thumb"));
  EXPECT_EQ("/tmp/photos\n", ReadFile(kQueue));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Phases, SecondRunMakesPhase2) {
  RunAndWatch();
  EXPECT_THAT(RunAndWatch(),
              ElementsAre("GET_INDEX_VERSION /tmp/photos/a.jpg, completed 0, 3, queued",
                          "POST_PHOTO_CONVERT /tmp/photos/a.jpg, completed 1, 4, queued"));
  ASSERT_EQ(3U, Converter().Calls().size());
  EXPECT_THAT(Command(2),
              ElementsAre(kConverterPath, "-define",
                          "registry:temporary-path=/tmp/photos/@eaDir/a.jpg", kReference,  //
                          "-define", "jpeg:size=120x120",                                  //
                          "-thumbnail", "120x120>", "-quality", "70",                      //
                          "-flatten", "-auto-orient", "-colorspace", "sRGB", kTemporary));
  EXPECT_THAT(ListDirectory(kMetadata),
              ElementsAre("VELAPHOTO_THUMB_B.jpg", "VELAPHOTO_THUMB_M.jpg", "VELAPHOTO_THUMB_S.jpg",
                          "VELAPHOTO_THUMB_XL.jpg"));
  EXPECT_EQ("/tmp/photos\n", ReadFile(kQueue));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Phases, ThirdRunFindsNothingLeft) {
  RunAndWatch();
  RunAndWatch();
  EXPECT_THAT(RunAndWatch(),
              ElementsAre("POST_PHOTO_CONVERT /tmp/photos/a.jpg, completed 1, 4, queued"));
  EXPECT_EQ(3U, Converter().Calls().size());
  EXPECT_EQ("/tmp/photos\n", ReadFile(kQueue));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Phases, ProgressIsCountedBetweenThePhases) {
  // The converter itself takes down the progress file that it finds.
  Converter().PlanCall(
      2, StubPlan().WriteOutputs().Run("/bin/cp", {kPhotoProgress, "/tmp/progress"}).Exit(0));
  RunAndWatch();
  EXPECT_EQ("completed_thumb=\"2\"\n", ReadFile("/tmp/progress"));
}

TEST_F(Phases, RequestsConversionsAndQueueComeInOrder) {
  const DaemonPeer daemon;
  EXPECT_GOOD_END(Run());
  EXPECT_GOOD_END(Run());
  const auto requests = daemon.Requests();
  const auto calls = Converter().Calls();
  ASSERT_EQ(4U, requests.size());
  ASSERT_EQ(3U, calls.size());
  const std::vector<uint64_t> order = {
      requests[0].sequence, calls[0].startSequence, calls[0].endSequence, calls[1].startSequence,
      calls[1].endSequence, requests[1].sequence,   requests[2].sequence, calls[2].startSequence,
      calls[2].endSequence, requests[3].sequence};
  EXPECT_TRUE(std::is_sorted(order.begin(), order.end())) << ::testing::PrintToString(order);
}

TEST_F(Phases, RequestsAreExact) {
  const DaemonPeer daemon;
  EXPECT_GOOD_END(Run());
  ASSERT_EQ(2U, daemon.Requests().size());
  EXPECT_EQ("{\"command\":\"GET_INDEX_VERSION\",\"path\":\"/tmp/photos/a.jpg\"}\n",
            daemon.Requests()[0].bytes);
  EXPECT_EQ("{\"command\":\"POST_PHOTO_CONVERT\",\"path\":\"/tmp/photos/a.jpg\"}\n",
            daemon.Requests()[1].bytes);
}

TEST_F(Phases, WithoutDaemonEachExchangeIsLoggedAndAllIsMade) {
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(ErrorLines(), ElementsAre("velamk_ipc:57 fail", "velamk_ipc:137 fail"));
  ClearLog();
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(ErrorLines(), ElementsAre("velamk_ipc:57 fail", "velamk_ipc:137 fail"));
  ClearLog();
  EXPECT_GOOD_END(Run());
  EXPECT_THAT(ErrorLines(), ElementsAre("velamk_ipc:137 fail"));
  EXPECT_EQ(3U, Converter().Calls().size());
  EXPECT_EQ(1, Progress("completed"));
  EXPECT_EQ(4, Progress("completed_thumb"));
}

TEST_F(Phases, ProgressIsAddedToWhatIsThere) {
  WriteFile(kPhotoProgress, "total=\"9\"\ncompleted=\"5\"\ncompleted_thumb=\"100\"\n");
  RunAndWatch();
  EXPECT_EQ("total=\"9\"\ncompleted=\"5\"\ncompleted_thumb=\"103\"\n", ReadFile(kPhotoProgress));
  RunAndWatch();
  EXPECT_EQ("total=\"9\"\ncompleted=\"6\"\ncompleted_thumb=\"104\"\n", ReadFile(kPhotoProgress));
  EXPECT_FALSE(Exists("/var/spool/conv_progress_video"));
}

TEST_F(Phases, PhotoIsCompletedBeforeItsThumbnailsAreCounted) {
  RunAndWatch();
  ASSERT_EQ(0, remove(kPhotoProgress));
  RunAndWatch();
  EXPECT_THAT(ProgressKeys(), ElementsAre("completed", "completed_thumb"));
}

TEST_F(Phases, Phase1WithoutProfilesStillQueues) {
  WriteProfileFile(kProfiles, {{"thumb_xl", 1280, 90, std::nullopt, "VELAPHOTO_THUMB_XL.jpg", 0},
                               {"thumb_s", 120, 70, std::nullopt, "VELAPHOTO_THUMB_S.jpg", 2}});
  EXPECT_THAT(RunAndWatch(), ElementsAre("GET_INDEX_VERSION /tmp/photos/a.jpg, completed 0, 0",
                                         "POST_PHOTO_CONVERT /tmp/photos/a.jpg, completed 0, 1"));
  EXPECT_EQ(1U, Converter().Calls().size());
  EXPECT_EQ("/tmp/photos\n", ReadFile(kQueue));
  EXPECT_THAT(RunAndWatch(),
              ElementsAre("GET_INDEX_VERSION /tmp/photos/a.jpg, completed 0, 1, queued",
                          "POST_PHOTO_CONVERT /tmp/photos/a.jpg, completed 1, 2, queued"));
  EXPECT_EQ(2U, Converter().Calls().size());
}

TEST_F(Phases, Phase2IsNeverMadeInTheRunOfPhase1) {
  PutThumbs(kPhoto, {"XL", "M"});
  RunAndWatch();
  EXPECT_THAT(ConvertedSources(), ElementsAre(kReference));
  EXPECT_FALSE(Exists(Thumb(kPhoto, "S")));
}

TEST_F(Phases, ReferenceIsTheLargestOfPhase0) {
  WriteProfileFile(kProfiles, {{"thumb_m", 320, 80, std::nullopt, "VELAPHOTO_THUMB_M.jpg", 0},
                               {"thumb_sm", 240, 80, std::nullopt, "VELAPHOTO_THUMB_SM.jpg", 0},
                               {"thumb_xl", 1280, 80, std::nullopt, "VELAPHOTO_THUMB_XL.jpg", 1}});
  RunAndWatch();
  EXPECT_THAT(ConvertedSources(), ElementsAre(kPhoto, Thumb(kPhoto, "M")));
}

TEST_F(Phases, AnyOtherPhaseNumberIsPhase0) {
  WriteProfileFile(kProfiles, {{"thumb_m", 320, 80, std::nullopt, "VELAPHOTO_THUMB_M.jpg", 7},
                               {"thumb_xl", 1280, 80, std::nullopt, "VELAPHOTO_THUMB_XL.jpg", -1}});
  RunAndWatch();
  EXPECT_THAT(ConvertedSources(), ElementsAre(kPhoto));
  EXPECT_EQ(2, Progress("completed_thumb"));
}

TEST_F(Phases, FirstPageOfAPhotoWithSeveralIsTaken) {
  MakePhoto("/tmp/tiffs/b.tif");
  const DaemonPeer daemon;
  EXPECT_GOOD_END(Run({"/tmp/tiffs"}));
  EXPECT_THAT(ConvertedSources(),
              ElementsAre("/tmp/tiffs/b.tif[0]", Thumb("/tmp/tiffs/b.tif", "XL")));
  EXPECT_THAT(RequestsOf(daemon), ElementsAre("GET_INDEX_VERSION /tmp/tiffs/b.tif",
                                              "POST_PHOTO_CONVERT /tmp/tiffs/b.tif"));
}

}  // namespace
}  // namespace vela_test
