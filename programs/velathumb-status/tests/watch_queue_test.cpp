// Following the conversion while no velathumb is running: its queue, its runner and its pauses.
#include <chrono>
#include <ctime>
#include <sstream>
#include <thread>

#include "platform/velaindex.h"
#include "posix/file_lock.h"
#include "progress/velamk_progress.h"
#include "progress_watch.h"
#include "running_conversion.h"
#include "status_fixture.h"
#include "support/daemon_peer.h"

namespace vela_test {
namespace {

using namespace ::testing;
using std::chrono::milliseconds;

constexpr const char* kSettings = "/etc/velainfo.conf";
constexpr const char* kDonePhotos = "/var/spool/thumb_create.queue.done";
constexpr const char* kRunnerLock = "/var/run/velathumb-queue.lock";
constexpr const char* kWaiting = "the queue has entries, waiting for velathumb-queue\n";

constexpr const char* kSwitch = "IS_DISABLE_CONVERT_PHOTO";
constexpr const char* kSwitchedOff =
    "conversion is paused: the index service has switched it off\n";

DaemonReply SwitchedOff(bool isOff) {
  return DaemonReply::Line(isOff ? R"({"success":true,"result":true})"
                                 : R"({"success":true,"result":false})");
}

/// An unattended queue is given up soon.
constexpr vela::WatchLimits kSoon = {milliseconds(50), std::chrono::seconds(60)};

class WatchingTheQueue : public SandboxTest {
 protected:
  static Program Start(const std::vector<std::string>& arguments = {"--watch"}) {
    return StartProgram(StatusProgramPath(), arguments);
  }

  static bool WaitForOutput(const Program& program, const std::string& text) {
    for (int i = 0; i < 2000; ++i) {
      if (program.Output().find(text) != std::string::npos) {
        return true;
      }
      std::this_thread::sleep_for(milliseconds(10));
    }
    return false;
  }

  /// Fails the test unless the program shows a change of the counters, and thus is still running,
  /// after it has had the time to notice that no velathumb is.
  static void ExpectToFollow(const Program& watch) {
    AddConvProgress(THUMB_TYPE_PHOTO, "total_thumb", 10);
    AddConvProgress(THUMB_TYPE_PHOTO, "completed_thumb", 1);
    EXPECT_TRUE(WaitForOutput(watch, "10%  1 of 10 thumbnails"));
    AddConvProgress(THUMB_TYPE_PHOTO, "completed_thumb", 1);
    EXPECT_TRUE(WaitForOutput(watch, "20%  2 of 10 thumbnails"));
  }

  static std::string EndOf(Program& watch) {
    const auto result = watch.Wait();
    EXPECT_TRUE(result);
    return result ? result->out : std::string();
  }
};

TEST_F(WatchingTheQueue, DoesNotEndBetweenTwoEntriesOfARunner) {
  vela::FileDescriptor lock = vela::TakeProcessLock(kRunnerLock, false);
  ASSERT_TRUE(lock.IsOpen());
  Program watch = Start();
  ExpectToFollow(watch);
  lock.Reset();
  EXPECT_THAT(EndOf(watch), EndsWith("no velathumb is running\n"));
}

TEST_F(WatchingTheQueue, DoesNotEndBeforePendingEntriesAreTaken) {
  WriteFile(kPhotoQueue, "\n/tmp/a\n");
  Program watch = Start();
  ASSERT_TRUE(WaitForOutput(watch, kWaiting));
  vela::FileDescriptor lock = vela::TakeProcessLock(kRunnerLock, false);
  RemoveTree(kPhotoQueue);
  ExpectToFollow(watch);
  lock.Reset();
  EXPECT_THAT(EndOf(watch), EndsWith("no velathumb is running\n"));
}

TEST_F(WatchingTheQueue, DoesNotEndBeforeTakenEntriesAreDone) {
  WriteFile(kPhotosInProgress, "/tmp/a\nR:/tmp/b\n");
  WriteFile(kDonePhotos, "/tmp/a\n");
  Program watch = Start();
  ASSERT_TRUE(WaitForOutput(watch, kWaiting));
  WriteFile(kDonePhotos, "/tmp/a\nR:/tmp/b\n");
  EXPECT_THAT(EndOf(watch), EndsWith("no velathumb is running\n"));
}

TEST_F(WatchingTheQueue, EndsWhenAnotherSpellingOfTheEntryIsDone) {
  WriteFile(kPhotosInProgress, "/tmp//a/\nR:/tmp/./b\n");
  WriteFile(kDonePhotos, "/tmp/a\nR:/tmp/b/\n");
  Program watch = Start();
  EXPECT_THAT(EndOf(watch), EndsWith("no velathumb is running\n"));
}

TEST_F(WatchingTheQueue, EndsWhenOnlyDeferredEntriesAreLeft) {
  WriteFile(kDeferredPhotos, "/tmp/a\n");
  WriteFile(kPhotoQueue, "\n\n");
  const ProgramResult one = RunStatus({"--watch"});
  EXPECT_EQ(one.exitCode, 1);
  EXPECT_THAT(one.out, EndsWith("no velathumb is running\n1 entry is deferred to a later run; "
                                "velathumb-status --queue lists them\n"));
  WriteFile(kDeferredPhotos, "/tmp/a\n\nR:/tmp/b\n");
  EXPECT_THAT(RunStatus({"--watch"}).out,
              EndsWith("2 entries are deferred to a later run; velathumb-status --queue lists "
                       "them\n"));
  ExpectMembers(ReadJson(RunStatus({"--watch", "--json"}).out),
                R"({"activity": "ended", "deferred_entries": 2, "paused_by": null})");
}

TEST_F(WatchingTheQueue, ShowsAPauseInsteadOfTheCountersOfAnEarlierRun) {
  AddConvProgress(THUMB_TYPE_PHOTO, "total_thumb", 8);
  AddConvProgress(THUMB_TYPE_PHOTO, "completed_thumb", 8);
  const long resume = time(nullptr) + 3600;
  WriteFile(kSettings, "thumb_conv_resume_time=\"" + std::to_string(resume) + "\"\n");
  vela::FileDescriptor lock = vela::TakeProcessLock(kRunnerLock, false);
  Program watch = Start();
  ASSERT_TRUE(WaitForOutput(watch, "\n"));
  EXPECT_THAT(watch.Output(), ContainsRegex("^conversion is paused until [-0-9]+ [:0-9]+ "
                                            "[-+0-9]+, for 3[56][0-9][0-9] s\n$"));
  WriteFile(kSettings, "thumb_conv_resume_time=\"\"\n");
  ASSERT_TRUE(WaitForOutput(watch, "] 100%  8 of 8 thumbnails"));
  lock.Reset();
  EXPECT_THAT(EndOf(watch), EndsWith("no velathumb is running\n"));
}

TEST_F(WatchingTheQueue, ShowsAPauseWhileEntriesAreQueued) {
  WriteFile(kSettings, "thumb_conv_resume_time=\"-1\"\n");
  WriteFile(kPhotoQueue, "/tmp/a\n");
  Program watch = Start();
  ASSERT_TRUE(WaitForOutput(watch, "conversion is paused indefinitely (resume time -1)\n"));
  RemoveTree(kPhotoQueue);
  EXPECT_THAT(EndOf(watch), EndsWith("no velathumb is running\n"
                                     "conversion is paused indefinitely (resume time -1)\n"));
}

TEST_F(WatchingTheQueue, ShowsThatTheIndexServiceHasSwitchedConversionOff) {
  AddConvProgress(THUMB_TYPE_PHOTO, "total_thumb", 8);
  AddConvProgress(THUMB_TYPE_PHOTO, "completed_thumb", 8);
  DaemonPeer daemon;
  daemon.Answer(kSwitch, SwitchedOff(true));
  vela::FileDescriptor lock = vela::TakeProcessLock(kRunnerLock, false);
  Program watch = Start();
  Program json = Start({"--watch", "--json"});
  ASSERT_TRUE(WaitForOutput(watch, "\n"));
  ASSERT_TRUE(WaitForOutput(json, "\n"));
  EXPECT_EQ(watch.Output(), kSwitchedOff);
  ExpectMembers(ReadJson(json.Output()),
                R"({"activity": "paused", "paused_by": "index_service", "resume_time": null,
                    "seconds_until_resume": null})");
  daemon.Answer(kSwitch, SwitchedOff(false));
  ASSERT_TRUE(WaitForOutput(watch, "] 100%  8 of 8 thumbnails"));
  ASSERT_TRUE(WaitForOutput(json, "\"activity\":\"running\""));
  daemon.Answer(kSwitch, SwitchedOff(true));
  ASSERT_TRUE(WaitForOutput(watch, std::string("\n") + kSwitchedOff));
  lock.Reset();
  EXPECT_THAT(EndOf(watch), EndsWith(std::string("no velathumb is running\n") + kSwitchedOff));
  EXPECT_THAT(EndOf(json), HasSubstr("\"paused_by\":null"));
}

TEST_F(WatchingTheQueue, ShowsThatConversionIsSwitchedOffWhileEntriesAreQueued) {
  DaemonPeer daemon;
  daemon.Answer(kSwitch, SwitchedOff(true));
  WriteFile(kPhotoQueue, "/tmp/a\n");
  Program watch = Start();
  ASSERT_TRUE(WaitForOutput(watch, kSwitchedOff));
  daemon.Answer(kSwitch, SwitchedOff(false));
  ASSERT_TRUE(WaitForOutput(watch, kWaiting));
  RemoveTree(kPhotoQueue);
  EXPECT_THAT(EndOf(watch), EndsWith("no velathumb is running\n"));
}

TEST_F(WatchingTheQueue, ShowsTheProgressOfAVelathumbThatContinuesAlthoughConversionIsOff) {
  DaemonPeer daemon;
  AddConvProgress(THUMB_TYPE_PHOTO, "total_thumb", 4);
  AddConvProgress(THUMB_TYPE_PHOTO, "completed_thumb", 1);
  RunningConversion conversion;
  daemon.Answer(kSwitch, SwitchedOff(true));
  Program watch = Start({"--watch", "--json"});
  ASSERT_TRUE(WaitForOutput(watch, "\n"));
  ExpectMembers(ReadJson(watch.Output()), R"({"activity": "running", "paused_by": null})");
  conversion.Finish();
  EndOf(watch);
}

TEST_F(WatchingTheQueue, DoesNotWaitLongForADaemonThatDoesNotAnswer) {
  DaemonPeer daemon;
  daemon.Answer(kSwitch, DaemonReply::Silence());
  vela::FileDescriptor lock = vela::TakeProcessLock(kRunnerLock, false);
  Program watch = Start();
  ExpectToFollow(watch);
  EXPECT_EQ(daemon.Requests().size(), 1U);
  lock.Reset();
  EXPECT_THAT(EndOf(watch), EndsWith("no velathumb is running\n"));
}

TEST_F(WatchingTheQueue, ShowsThatARunnerHasNothingToDo) {
  AddConvProgress(THUMB_TYPE_PHOTO, "total_thumb", 8);
  AddConvProgress(THUMB_TYPE_PHOTO, "completed_thumb", 8);
  vela::FileDescriptor lock = vela::TakeProcessLock(kRunnerLock, false);
  Program watch = Start();
  ASSERT_TRUE(WaitForOutput(watch, "8 of 8 thumbnails\nvelathumb-queue is waiting for entries\n"));
  AddConvProgress(THUMB_TYPE_PHOTO, "total_thumb", 8);
  ASSERT_TRUE(WaitForOutput(watch, "]  50%  8 of 16 thumbnails"));
  lock.Reset();
  EndOf(watch);
}

TEST_F(WatchingTheQueue, ShowsThatARunnerHasStartedNoVelathumbForItsEntries) {
  WriteFile(kPhotosInProgress, "/tmp/a\n");
  vela::FileDescriptor lock = vela::TakeProcessLock(kRunnerLock, false);
  Program watch = Start();
  Program json = Start({"--watch", "--json"});
  EXPECT_TRUE(WaitForOutput(watch,
                            "\nvelathumb-queue is running, but no velathumb: it counts "
                            "photos, or directories are locked\n"));
  EXPECT_TRUE(WaitForOutput(json, "\"activity\":\"idle\""));
  lock.Reset();
  RemoveTree(kPhotosInProgress);
  EndOf(watch);
}

TEST_F(WatchingTheQueue, EndsWhenNothingProcessesTheQueue) {
  WriteFile(kPhotoQueue, "/tmp/a\n");
  std::ostringstream out;
  EXPECT_TRUE(vela::WatchProgress(out, false, false, kSoon));
  EXPECT_THAT(
      out.str(),
      AllOf(StartsWith(kWaiting),
            EndsWith("no velathumb is running\nthe queue has entries, but nothing processes "
                     "them; velathumb-queue would\n")));
  std::ostringstream json;
  EXPECT_TRUE(vela::WatchProgress(json, false, true, kSoon));
  EXPECT_EQ(ReadJson(json.str())["activity"], Json::Value("waiting"));
}

TEST_F(WatchingTheQueue, JsonTellsTheActivity) {
  const long resume = time(nullptr) + 3600;
  WriteFile(kSettings, "thumb_conv_resume_time=\"" + std::to_string(resume) + "\"\n");
  WriteFile(kPhotoQueue, "/tmp/a\n");
  Program watch = Start({"--watch", "--json"});
  ASSERT_TRUE(WaitForOutput(watch, "\n"));
  const Json::Value paused = ReadJson(watch.Output());
  ExpectMembers(paused,
                "{\"activity\": \"paused\", \"resume_time\": " + std::to_string(resume) + "}");
  EXPECT_GT(paused["seconds_until_resume"].asInt(), 3500);
  WriteFile(kSettings, "");
  ASSERT_TRUE(WaitForOutput(watch, "\"activity\":\"waiting\""));
  RemoveTree(kPhotoQueue);
  const std::string out = EndOf(watch);
  ExpectMembers(ReadJson(out.substr(out.rfind('\n', out.size() - 2) + 1)),
                R"({"activity": "ended", "resume_time": null, "seconds_until_resume": null})");
}

}  // namespace
}  // namespace vela_test
