// The counters of conversion progress.
#include "platform/velaindex.h"
#include "progress/velamk_progress.h"
#include "running_conversion.h"
#include "status_fixture.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using namespace ::testing;

constexpr const char* kPhotoFile = "/var/spool/conv_progress_photo";
constexpr const char* kNotRunning = "no velathumb is running\n";

/// What LogConvProgress logs, without the source positions.
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

class ProgressCountersTest : public SandboxTest {
 protected:
  static std::string Query() {
    const ProgramResult result = RunStatus({"--progress"});
    EXPECT_EQ(result.err, "");
    return result.out;
  }
};

TEST_F(ProgressCountersTest, IsTheSummaryOfTheLog) {
  AddConvProgress(THUMB_TYPE_PHOTO, "total", 40);
  AddConvProgress(THUMB_TYPE_PHOTO, "completed", 10);
  AddConvProgress(THUMB_TYPE_PHOTO, "total_thumb", 300);
  AddConvProgress(THUMB_TYPE_PHOTO, "completed_thumb", 100);
  AddConvProgress(THUMB_TYPE_VIDEO, "total", 3);
  AddConvProgress(THUMB_TYPE_VIDEO, "completed", 3);
  const std::string answer = Query();
  EXPECT_EQ(answer, LoggedSummary() + kNotRunning);
  EXPECT_THAT(answer, AllOf(HasSubstr("total_photo: 40, complete_photo: 10, progress: 0.25\n"),
                            HasSubstr("total_thumb: 300, complete_thumb: 100, progress: 0.33\n"),
                            HasSubstr("total_video: 3, complete_video: 3, progress: 1.00\n")));
}

TEST_F(ProgressCountersTest, WithoutTotalsTheShareIsZero) {
  AddConvProgress(THUMB_TYPE_PHOTO, "completed", 7);
  const std::string answer = Query();
  EXPECT_EQ(answer, LoggedSummary() + kNotRunning);
  EXPECT_THAT(answer, HasSubstr("total_photo: 0, complete_photo: 7, progress: 0.00\n"));
}

TEST_F(ProgressCountersTest, DoesNotMakeTheFiles) {
  EXPECT_EQ(Query(), LoggedSummary() + kNotRunning);
  EXPECT_THAT(ListDirectory("/var/spool"), IsEmpty());
}

TEST_F(ProgressCountersTest, IsWorkUntilEachCounterReachesItsTotal) {
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

TEST_F(ProgressCountersTest, NamesTheRunningInstance) {
  RunningConversion conversion;
  EXPECT_THAT(Query(), EndsWith("\nvelathumb is running, process " +
                                std::to_string(conversion.Pid()) + "\n"));
  conversion.Finish();
  EXPECT_THAT(Query(), EndsWith(kNotRunning));
}

TEST_F(ProgressCountersTest, IgnoresStalePidFiles) {
  const Program stranger = StartProgram("/usr/bin/sleep", {"60"});
  MakePidFile(stranger.Pid());
  MakePidFile(4000000);
  WriteFile("/var/run/velathumb.word.pid", "");
  WriteFile("/var/run/other.1.pid", "");
  EXPECT_THAT(Query(), EndsWith(kNotRunning));
  EXPECT_EQ(ListDirectory("/run").size(), 4U);
}

TEST_F(ProgressCountersTest, JsonHasTheDocumentedMembers) {
  AddConvProgress(THUMB_TYPE_PHOTO, "total", 40);
  AddConvProgress(THUMB_TYPE_PHOTO, "completed", 10);
  AddConvProgress(THUMB_TYPE_PHOTO, "total_thumb", 300);
  AddConvProgress(THUMB_TYPE_VIDEO, "completed", 2);
  const Json::Value answer = QueryJson({"--progress"});
  EXPECT_THAT(answer.getMemberNames(), UnorderedElementsAre("format", "progress", "errors"));
  const Json::Value progress = answer["progress"];
  EXPECT_THAT(progress.getMemberNames(),
              UnorderedElementsAre("photo", "thumb", "video", "instances"));
  const struct {
    const char* kind;
    int total;
    int completed;
    double ratio;
  } counters[] = {{"photo", 40, 10, 0.25}, {"thumb", 300, 0, 0}, {"video", 0, 2, 0}};
  for (const auto& [kind, total, completed, ratio] : counters) {
    SCOPED_TRACE(kind);
    const Json::Value counter = progress[kind];
    EXPECT_THAT(counter.getMemberNames(), UnorderedElementsAre("total", "completed", "ratio"));
    EXPECT_EQ(counter["total"], Json::Value(total));
    EXPECT_EQ(counter["completed"], Json::Value(completed));
    EXPECT_EQ(counter["ratio"].asDouble(), ratio);
  }
  EXPECT_EQ(progress["instances"], Json::Value(Json::arrayValue));
}

TEST_F(ProgressCountersTest, JsonNamesTheRunningInstance) {
  RunningConversion conversion;
  MakePidFile(4000000);
  const Json::Value instances = QueryJson({"--progress"})["progress"]["instances"];
  ASSERT_EQ(instances.size(), 1U);
  EXPECT_EQ(instances[0].asInt(), conversion.Pid());
}

TEST_F(ProgressCountersTest, AnInvalidNumberCountsAsZero) {
  WriteFile(kPhotoFile, "total=\"many\"\ncompleted=\"99999999999999\"\n");
  const Json::Value photo = QueryJson({"--progress"})["progress"]["photo"];
  ExpectMembers(photo, R"({"total": 0, "completed": 2147483647})");
  EXPECT_EQ(photo["ratio"].asDouble(), 0);
}

}  // namespace
}  // namespace vela_test
