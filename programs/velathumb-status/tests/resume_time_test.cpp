// The time until which conversion is paused.
#include <ctime>

#include "status_fixture.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using namespace ::testing;

class ResumeTimeTest : public SandboxTest {
 protected:
  static void Store(long time) {
    WriteFile("/etc/velainfo.conf", "thumb_conv_resume_time=\"" + std::to_string(time) + "\"\n");
  }

  static ProgramResult QueryIn(const std::string& timeZone) {
    ProgramOptions options;
    options.addedEnvironment = {"TZ=" + timeZone};
    return RunStatus({"--resume-time"}, options);
  }

  static void ExpectNotPaused() {
    const ProgramResult result = RunStatus({"--resume-time"});
    EXPECT_EQ(result.exitCode, 0);
    EXPECT_EQ(result.out, "conversion is not paused\n");
  }
};

TEST_F(ResumeTimeTest, ReportsThatConversionIsNotPaused) {
  ExpectNotPaused();
  EXPECT_EQ(QueryJson({"--resume-time"})["resume"]["reached"], Json::Value(true));
  EXPECT_THAT(ErrorLines(), IsEmpty());
  for (const long time : {0L, 1700000000L}) {
    Store(time);
    ExpectNotPaused();
  }
}

TEST_F(ResumeTimeTest, ShowsTheTimeInTheUsersZone) {
  Store(4102444800);  // 2100-01-01 00:00:00 UTC
  EXPECT_THAT(QueryIn("UTC0").out, MatchesRegex("conversion is paused until "
                                                "2100-01-01 00:00:00 \\+0000, for [0-9]+ s\n"));
  EXPECT_THAT(QueryIn("XYZ-2").out, HasSubstr("until 2100-01-01 02:00:00 +0200, for "));
}

TEST_F(ResumeTimeTest, IsNotWork) {
  Store(4102444800);
  EXPECT_EQ(RunStatus({"--resume-time"}).exitCode, 0);
  EXPECT_EQ(RunStatus({"--resume-time", "--json"}).exitCode, 0);
}

TEST_F(ResumeTimeTest, ReportsAnIndefinitePause) {
  Store(-1);
  EXPECT_EQ(RunStatus({"--resume-time"}).out,
            "conversion is paused indefinitely (resume time -1)\n");
}

TEST_F(ResumeTimeTest, JsonHasTheDocumentedMembers) {
  const long before = std::time(nullptr);
  Store(before + 1000);
  const Json::Value answer = QueryJson({"--resume-time"});
  const long after = std::time(nullptr);
  EXPECT_THAT(answer.getMemberNames(), UnorderedElementsAre("format", "resume", "errors"));
  const Json::Value resume = answer["resume"];
  EXPECT_THAT(resume.getMemberNames(),
              UnorderedElementsAre("resume_time", "reached", "wait_seconds"));
  EXPECT_EQ(resume["resume_time"].asInt64(), before + 1000);
  EXPECT_EQ(resume["reached"], Json::Value(false));
  EXPECT_THAT(resume["wait_seconds"].asInt64(), AllOf(Le(1000), Ge(1000 - (after - before))));
}

TEST_F(ResumeTimeTest, JsonOfAReachedOrNegativeTimeWaitsForNothing) {
  Store(1700000000);
  EXPECT_EQ(QueryJson({"--resume-time"})["resume"],
            ReadJson(R"({"resume_time": 1700000000, "reached": true, "wait_seconds": 0})"));
  Store(-5);
  EXPECT_EQ(QueryJson({"--resume-time"})["resume"],
            ReadJson(R"({"resume_time": -5, "reached": false, "wait_seconds": 0})"));
}

}  // namespace
}  // namespace vela_test
