// A new photo in three phases and two runs: every effect, in order.
#include <algorithm>
#include <mutex>
#include <regex>

#include "program/stub_program_test.h"

namespace vela_test {
namespace {

constexpr const char* kReference = "/tmp/photos/@eaDir/a.jpg/VELAPHOTO_THUMB_XL.jpg";
constexpr const char* kTemporary = "/tmp/photos/@eaDir/a.jpg/VELAPHOTO.tmp.??????.jpg";

class Phases : public OnePhotoTest {
 protected:
  /// Runs the program. Returns each request with the progress and the queue at that moment.
  static Strings RunAndWatch() {
    std::mutex mutex;
    Strings seen;
    RunAndObserve([&](const std::string& request) {
      const std::lock_guard<std::mutex> lock(mutex);
      seen.push_back(request + ", completed " + std::to_string(Progress("completed")) + ", " +
                     std::to_string(Progress("completed_thumb")) +
                     (Exists(kQueue) ? ", queued" : ""));
    });
    return seen;
  }

  /// The arguments of a call, with the random part of temporary names replaced by "??????".
  Strings Command(size_t call) const {
    Strings arguments = Converter().Calls().at(call).arguments;
    for (std::string& argument : arguments) {
      argument =
          std::regex_replace(argument, std::regex("/VELAPHOTO\\.tmp\\.[A-Za-z0-9]{6}\\.jpg$"),
                             "/VELAPHOTO.tmp.??????.jpg");
    }
    return arguments;
  }
};

TEST_F(Phases, FirstRunMakesPhase0FromThePhotoAndPhase1FromItsLargest) {
  EXPECT_THAT(RunAndWatch(), ElementsAre("GET_INDEX_VERSION /tmp/photos/a.jpg, completed 0, 0",
                                         "POST_PHOTO_CONVERT /tmp/photos/a.jpg, completed 0, 3"));
  ASSERT_THAT(Converter().Calls(), SizeIs(2));
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
  EXPECT_EQ(MetadataOf(kPhoto), kThumbsOfFirstRun);
  EXPECT_THAT(ProgressKeys(), ElementsAre("completed_thumb"));
  EXPECT_EQ(ReadFile(kQueue), "/tmp/photos\n");
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Phases, SecondRunMakesPhase2) {
  RunAndWatch();
  EXPECT_THAT(RunAndWatch(),
              ElementsAre("GET_INDEX_VERSION /tmp/photos/a.jpg, completed 0, 3, queued",
                          "POST_PHOTO_CONVERT /tmp/photos/a.jpg, completed 1, 4, queued"));
  ASSERT_THAT(Converter().Calls(), SizeIs(3));
  EXPECT_THAT(Command(2),
              ElementsAre(kConverterPath, "-define",
                          "registry:temporary-path=/tmp/photos/@eaDir/a.jpg", kReference,  //
                          "-define", "jpeg:size=120x120",                                  //
                          "-thumbnail", "120x120>", "-quality", "70",                      //
                          "-flatten", "-auto-orient", "-colorspace", "sRGB", kTemporary));
  EXPECT_EQ(MetadataOf(kPhoto), kAllThumbs);
  EXPECT_EQ(ReadFile(kQueue), "/tmp/photos\n");
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Phases, ThirdRunFindsNothingLeft) {
  RunAndWatch();
  RunAndWatch();
  EXPECT_THAT(RunAndWatch(),
              ElementsAre("POST_PHOTO_CONVERT /tmp/photos/a.jpg, completed 1, 4, queued"));
  EXPECT_THAT(Converter().Calls(), SizeIs(3));
  EXPECT_EQ(ReadFile(kQueue), "/tmp/photos\n");
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(Phases, ProgressIsCountedBetweenThePhases) {
  // The converter copies the progress file during phase 1.
  Converter().PlanCall(
      2, StubPlan().WriteOutputs().Run("/bin/cp", {kPhotoProgress, "/tmp/progress"}).Exit(0));
  RunAndWatch();
  EXPECT_EQ(ReadFile("/tmp/progress"), "completed_thumb=\"2\"\n");
}

TEST_F(Phases, RequestsConversionsAndQueueAreInOrder) {
  const DaemonPeer daemon;
  EXPECT_SUCCESS(Run());
  EXPECT_SUCCESS(Run());
  const auto requests = daemon.Requests();
  const auto calls = Converter().Calls();
  ASSERT_EQ(requests.size(), 4U);
  ASSERT_EQ(calls.size(), 3U);
  const std::vector<uint64_t> order = {
      requests[0].sequence, calls[0].startSequence, calls[0].endSequence, calls[1].startSequence,
      calls[1].endSequence, requests[1].sequence,   requests[2].sequence, calls[2].startSequence,
      calls[2].endSequence, requests[3].sequence};
  EXPECT_TRUE(std::is_sorted(order.begin(), order.end())) << ::testing::PrintToString(order);
}

TEST_F(Phases, RequestsAreExact) {
  const DaemonPeer daemon;
  EXPECT_SUCCESS(Run());
  ASSERT_EQ(daemon.Requests().size(), 2U);
  EXPECT_EQ(daemon.Requests()[0].bytes,
            "{\"command\":\"GET_INDEX_VERSION\",\"path\":\"/tmp/photos/a.jpg\"}\n");
  EXPECT_EQ(daemon.Requests()[1].bytes,
            "{\"command\":\"POST_PHOTO_CONVERT\",\"path\":\"/tmp/photos/a.jpg\"}\n");
}

TEST_F(Phases, WithoutDaemonEachExchangeIsLoggedAndAllIsMade) {
  const Strings bothFail = {"velamk_ipc:57 fail", "velamk_ipc:137 fail"};
  for (const Strings& lines : {bothFail, bothFail, {"velamk_ipc:137 fail"}}) {
    ClearLog();
    EXPECT_SUCCESS(Run());
    EXPECT_EQ(ErrorLines(), lines);
  }
  EXPECT_THAT(Converter().Calls(), SizeIs(3));
  ExpectProgress(1, 4);
}

TEST_F(Phases, ProgressIsAddedToExistingCounts) {
  WriteFile(kPhotoProgress, "total=\"9\"\ncompleted=\"5\"\ncompleted_thumb=\"100\"\n");
  RunAndWatch();
  EXPECT_EQ(ReadFile(kPhotoProgress), "total=\"9\"\ncompleted=\"5\"\ncompleted_thumb=\"103\"\n");
  RunAndWatch();
  EXPECT_EQ(ReadFile(kPhotoProgress), "total=\"9\"\ncompleted=\"6\"\ncompleted_thumb=\"104\"\n");
  EXPECT_FALSE(Exists("/var/spool/conv_progress_video"));
}

TEST_F(Phases, PhotoIsCompletedBeforeItsThumbnailsAreCounted) {
  RunAndWatch();
  ASSERT_EQ(remove(kPhotoProgress), 0);
  RunAndWatch();
  EXPECT_THAT(ProgressKeys(), ElementsAre("completed", "completed_thumb"));
}

TEST_F(Phases, Phase1WithoutProfilesStillQueues) {
  WriteProfileFile(kProfiles, {Profile("XL", 1280, 0), Profile("S", 120, 2)});
  EXPECT_THAT(RunAndWatch(), ElementsAre("GET_INDEX_VERSION /tmp/photos/a.jpg, completed 0, 0",
                                         "POST_PHOTO_CONVERT /tmp/photos/a.jpg, completed 0, 1"));
  EXPECT_THAT(Converter().Calls(), SizeIs(1));
  EXPECT_EQ(ReadFile(kQueue), "/tmp/photos\n");
  EXPECT_THAT(RunAndWatch(),
              ElementsAre("GET_INDEX_VERSION /tmp/photos/a.jpg, completed 0, 1, queued",
                          "POST_PHOTO_CONVERT /tmp/photos/a.jpg, completed 1, 2, queued"));
  EXPECT_THAT(Converter().Calls(), SizeIs(2));
}

TEST_F(Phases, Phase2IsNeverMadeInTheRunOfPhase1) {
  PutThumbs(kPhoto, {"XL", "M"});
  RunAndWatch();
  EXPECT_THAT(ConvertedSources(), ElementsAre(kReference));
  EXPECT_FALSE(Exists(Thumb(kPhoto, "S")));
}

TEST_F(Phases, ReferenceIsTheLargestOfPhase0) {
  WriteProfileFile(kProfiles,
                   {Profile("M", 320, 0), Profile("SM", 240, 0), Profile("XL", 1280, 1)});
  RunAndWatch();
  EXPECT_THAT(ConvertedSources(), ElementsAre(kPhoto, Thumb(kPhoto, "M")));
}

TEST_F(Phases, AnyOtherPhaseNumberIsPhase0) {
  WriteProfileFile(kProfiles, {Profile("M", 320, 7), Profile("XL", 1280, -1)});
  RunAndWatch();
  EXPECT_THAT(ConvertedSources(), ElementsAre(kPhoto));
  EXPECT_EQ(Progress("completed_thumb"), 2);
}

TEST_F(Phases, FirstPageOfAPhotoWithSeveralPagesIsConverted) {
  MakePhoto("/tmp/tiffs/b.tif");
  EXPECT_THAT(RunWithDaemon({"/tmp/tiffs"}), ElementsAre("GET_INDEX_VERSION /tmp/tiffs/b.tif",
                                                         "POST_PHOTO_CONVERT /tmp/tiffs/b.tif"));
  EXPECT_THAT(ConvertedSources(),
              ElementsAre("/tmp/tiffs/b.tif[0]", Thumb("/tmp/tiffs/b.tif", "XL")));
}

}  // namespace
}  // namespace vela_test
