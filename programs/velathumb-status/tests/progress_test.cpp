// The counters of conversion progress.
#include <gmock/gmock.h>
#include <json/value.h>

#include <string>
#include <vector>

#include "platform/velaindex.h"
#include "progress/velamk_progress.h"
#include "running_conversion.h"
#include "status_program.h"
#include "support/files.h"
#include "support/sandbox.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::EndsWith;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::UnorderedElementsAre;

constexpr const char* kPhotoFile = "/var/spool/conv_progress_photo";
constexpr const char* kNobody = "no velathumb is running\n";

/// What LogConvProgress logs, without the places in front.
std::string LoggedSummary() {
  ClearLog();
  LogConvProgress();
  std::string text;
  for (const std::string& line : ErrorLines()) {
    text += line.substr(line.find(' ') + 1) + '\n';
  }
  return text;
}

void MakePidFile(pid_t pid) {
  WriteFile("/var/run/velathumb." + std::to_string(pid) + ".pid", "");
}

class ProgressAnswer : public SandboxTest {
 protected:
  static std::string Ask() {
    const ProgramResult result = RunStatus({"--progress"});
    EXPECT_EQ(result.err, "");
    return result.out;
  }
};

TEST_F(ProgressAnswer, IsTheSummaryOfTheLog) {
  AddConvProgress(THUMB_TYPE_PHOTO, "total", 40);
  AddConvProgress(THUMB_TYPE_PHOTO, "completed", 10);
  AddConvProgress(THUMB_TYPE_PHOTO, "total_thumb", 300);
  AddConvProgress(THUMB_TYPE_PHOTO, "completed_thumb", 100);
  AddConvProgress(THUMB_TYPE_VIDEO, "total", 3);
  AddConvProgress(THUMB_TYPE_VIDEO, "completed", 3);
  const std::string answer = Ask();
  EXPECT_EQ(answer, LoggedSummary() + kNobody);
  EXPECT_THAT(answer, HasSubstr("total_photo: 40, complete_photo: 10, progress: 0.25\n"));
  EXPECT_THAT(answer, HasSubstr("total_thumb: 300, complete_thumb: 100, progress: 0.33\n"));
  EXPECT_THAT(answer, HasSubstr("total_video: 3, complete_video: 3, progress: 1.00\n"));
}

TEST_F(ProgressAnswer, WithoutTotalsTheShareIsNothing) {
  AddConvProgress(THUMB_TYPE_PHOTO, "completed", 7);
  const std::string answer = Ask();
  EXPECT_EQ(answer, LoggedSummary() + kNobody);
  EXPECT_THAT(answer, HasSubstr("total_photo: 0, complete_photo: 7, progress: 0.00\n"));
}

TEST_F(ProgressAnswer, DoesNotMakeTheFiles) {
  EXPECT_EQ(Ask(), LoggedSummary() + kNobody);
  EXPECT_THAT(ListDirectory("/var/spool"), IsEmpty());
}

TEST_F(ProgressAnswer, IsWorkUntilEachCounterReachesItsTotal) {
  EXPECT_EQ(RunStatus({"--progress"}).exitCode, 0);
  const struct {
    int kind;
    const char* total;
    const char* completed;
  } counters[] = {{THUMB_TYPE_PHOTO, "total", "completed"},
                  {THUMB_TYPE_PHOTO, "total_thumb", "completed_thumb"},
                  {THUMB_TYPE_VIDEO, "total", "completed"}};
  for (const auto& counter : counters) {
    AddConvProgress(counter.kind, counter.total, 2);
    AddConvProgress(counter.kind, counter.completed, 1);
    EXPECT_EQ(RunStatus({"--progress"}).exitCode, 1) << counter.total;
    AddConvProgress(counter.kind, counter.completed, 1);
    EXPECT_EQ(RunStatus({"--progress"}).exitCode, 0) << counter.total;
    AddConvProgress(counter.kind, counter.completed, 5);
    EXPECT_EQ(RunStatus({"--progress"}).exitCode, 0) << counter.total;
  }
}

TEST_F(ProgressAnswer, NamesTheRunningInstance) {
  RunningConversion conversion;
  EXPECT_THAT(Ask(), EndsWith("\nvelathumb is running, process " +
                              std::to_string(conversion.Pid()) + "\n"));
  conversion.Finish();
  EXPECT_THAT(Ask(), EndsWith(kNobody));
}

TEST_F(ProgressAnswer, DoesNotTakeWhatWasLeftBehindForAnInstance) {
  const Program stranger = StartProgram("/usr/bin/sleep", {"60"});
  MakePidFile(stranger.Pid());
  MakePidFile(4000000);
  WriteFile("/var/run/velathumb.word.pid", "");
  WriteFile("/var/run/other.1.pid", "");
  EXPECT_THAT(Ask(), EndsWith(kNobody));
  EXPECT_EQ(ListDirectory("/run").size(), 4U);
}

TEST_F(ProgressAnswer, JsonHasTheDocumentedMembers) {
  AddConvProgress(THUMB_TYPE_PHOTO, "total", 40);
  AddConvProgress(THUMB_TYPE_PHOTO, "completed", 10);
  AddConvProgress(THUMB_TYPE_PHOTO, "total_thumb", 300);
  AddConvProgress(THUMB_TYPE_VIDEO, "completed", 2);
  const Json::Value answer = AskForJson({"--progress"});
  EXPECT_THAT(answer.getMemberNames(), UnorderedElementsAre("format", "progress", "errors"));
  const Json::Value progress = answer["progress"];
  EXPECT_THAT(progress.getMemberNames(),
              UnorderedElementsAre("photo", "thumb", "video", "instances"));
  for (const char* kind : {"photo", "thumb", "video"}) {
    EXPECT_THAT(progress[kind].getMemberNames(),
                UnorderedElementsAre("total", "completed", "ratio"));
  }
  EXPECT_EQ(progress["photo"]["total"], Json::Value(40));
  EXPECT_EQ(progress["photo"]["completed"], Json::Value(10));
  EXPECT_EQ(progress["photo"]["ratio"].asDouble(), 0.25);
  EXPECT_EQ(progress["thumb"]["total"], Json::Value(300));
  EXPECT_EQ(progress["thumb"]["completed"], Json::Value(0));
  EXPECT_EQ(progress["thumb"]["ratio"].asDouble(), 0);
  EXPECT_EQ(progress["video"]["total"], Json::Value(0));
  EXPECT_EQ(progress["video"]["completed"], Json::Value(2));
  EXPECT_EQ(progress["video"]["ratio"].asDouble(), 0);
  EXPECT_EQ(progress["instances"], Json::Value(Json::arrayValue));
}

TEST_F(ProgressAnswer, JsonNamesTheRunningInstance) {
  RunningConversion conversion;
  MakePidFile(4000000);
  const Json::Value instances = AskForJson({"--progress"})["progress"]["instances"];
  ASSERT_EQ(instances.size(), 1U);
  EXPECT_EQ(instances[0].asInt(), conversion.Pid());
}

TEST_F(ProgressAnswer, WhatIsNoNumberCountsAsNothing) {
  WriteFile(kPhotoFile, "total=\"many\"\ncompleted=\"99999999999999\"\n");
  const Json::Value photo = AskForJson({"--progress"})["progress"]["photo"];
  EXPECT_EQ(photo["total"], Json::Value(0));
  EXPECT_EQ(photo["completed"], Json::Value(2147483647));
  EXPECT_EQ(photo["ratio"].asDouble(), 0);
}

}  // namespace
}  // namespace vela_test
