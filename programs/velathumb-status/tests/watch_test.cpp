// Following a running instance.
#include <fcntl.h>
#include <signal.h>
#include <unistd.h>

#include <chrono>
#include <sstream>
#include <thread>

#include "platform/velaindex.h"
#include "progress/progress_summary.h"
#include "progress/velamk_progress.h"
#include "running_conversion.h"
#include "status_fixture.h"
#include "support/descriptor.h"
#include "support/terminal.h"

using namespace vela;

namespace vela_test {
namespace {

using namespace ::testing;
using std::chrono::milliseconds;

std::vector<std::string> LinesOf(const std::string& text) {
  std::vector<std::string> lines;
  std::istringstream in(text);
  for (std::string line; std::getline(in, line);) {
    lines.push_back(line);
  }
  return lines;
}

/// The current progress summary, followed by the line about instances.
std::string FinalText(const char* newline) {
  std::string text;
  for (const std::string& line : FormatProgressSummary(ReadProgressSummary())) {
    text += line + newline;
  }
  return text + "no velathumb is running" + newline;
}

bool WaitForOutput(const Program& program, const std::string& text) {
  for (int i = 0; i < 2000; ++i) {
    if (program.Output().find(text) != std::string::npos) {
      return true;
    }
    std::this_thread::sleep_for(milliseconds(10));
  }
  return false;
}

void AddThumbs(int total, int completed) {
  AddConvProgress(THUMB_TYPE_PHOTO, "total_thumb", total);
  AddConvProgress(THUMB_TYPE_PHOTO, "completed_thumb", completed);
}

class Watching : public SandboxTest {
 protected:
  static Program Start(std::vector<std::string> arguments = {"--watch"},
                       const ProgramOptions& options = ProgramOptions()) {
    return StartProgram(StatusProgramPath(), arguments, options);
  }
};

TEST_F(Watching, EndsAtOnceWithoutARunningInstance) {
  const ProgramResult result = RunStatus({"--watch"});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.err, "");
  EXPECT_EQ(result.out, "0 thumbnails\n" + FinalText("\n"));
  AddThumbs(4, 1);
  const ProgramResult unfinished = RunStatus({"-w"});
  EXPECT_EQ(unfinished.exitCode, 1);
  EXPECT_THAT(unfinished.out, EndsWith("  25%  1 of 4 thumbnails\n" + FinalText("\n")));
}

TEST_F(Watching, DoesNotMakeTheProgressFiles) {
  RunStatus({"--watch"});
  EXPECT_THAT(ListDirectory("/var/spool"), IsEmpty());
}

TEST_F(Watching, WritesALineForEachChangeUntilTheInstanceEnds) {
  AddThumbs(10, 1);
  RunningConversion conversion;
  Program watch = Start();
  ASSERT_TRUE(WaitForOutput(watch, "10%  1 of 10 thumbnails"));
  AddThumbs(0, 4);
  ASSERT_TRUE(WaitForOutput(watch, "50%  5 of 10 thumbnails"));
  std::this_thread::sleep_for(milliseconds(1200));
  EXPECT_EQ(LinesOf(watch.Output()).size(), 2U);
  EXPECT_FALSE(watch.Wait(milliseconds(0)));
  AddThumbs(0, 4);
  ASSERT_TRUE(WaitForOutput(watch, "90%  9 of 10 thumbnails"));
  conversion.Finish();
  const auto result = watch.Wait();
  ASSERT_TRUE(result);
  EXPECT_EQ(result->err, "");
  EXPECT_THAT(result->out, HasSubstr(" 100%  10 of 10 thumbnails  "));
  EXPECT_THAT(result->out, EndsWith(FinalText("\n")));
}

TEST_F(Watching, EndsWithStatus0WhenNoWorkIsLeft) {
  AddThumbs(1, 0);
  RunningConversion conversion;
  Program watch = Start();
  ASSERT_TRUE(WaitForOutput(watch, "0%  0 of 1 thumbnails"));
  conversion.Finish();
  EXPECT_EQ(watch.Wait()->exitCode, 0);
}

TEST_F(Watching, ShowsTheRate) {
  AddThumbs(1000, 0);
  RunningConversion conversion;
  Program watch = Start();
  ASSERT_TRUE(WaitForOutput(watch, "0%  0 of 1000 thumbnails\n"));
  AddThumbs(0, 100);
  ASSERT_TRUE(WaitForOutput(watch, "10%  100 of 1000 thumbnails"));
  EXPECT_THAT(LinesOf(watch.Output()).back(),
              ContainsRegex("thumbnails  [0-9]+\\.[0-9]/s  [0-9]+:[0-9][0-9] left$"));
}

TEST_F(Watching, WithoutTotalsShowsCountAndRate) {
  RunningConversion conversion;
  Program watch = Start();
  ASSERT_TRUE(WaitForOutput(watch, "0 thumbnails\n"));
  AddThumbs(0, 100);
  ASSERT_TRUE(WaitForOutput(watch, "\n100 thumbnails"));
  EXPECT_THAT(LinesOf(watch.Output()).back(), ContainsRegex("^100 thumbnails  [0-9]+\\.[0-9]/s$"));
}

TEST_F(Watching, TheRateRestartsWithAnotherUnit) {
  AddConvProgress(THUMB_TYPE_PHOTO, "total", 1000);
  RunningConversion conversion;
  Program watch = Start({"--watch", "--json"});
  ASSERT_TRUE(WaitForOutput(watch, "\"unit\":\"photos\""));
  AddConvProgress(THUMB_TYPE_PHOTO, "completed", 10);
  ASSERT_TRUE(WaitForOutput(watch, "\"completed\":10,"));
  // The total comes last: it is what makes thumbnails the unit.
  AddThumbs(0, 4000);
  AddThumbs(5000, 0);
  ASSERT_TRUE(WaitForOutput(watch, "\"unit\":\"thumbnails\""));
  AddThumbs(0, 10);
  ASSERT_TRUE(WaitForOutput(watch, "\"completed\":4010,"));
  const std::vector<std::string> lines = LinesOf(watch.Output());
  EXPECT_EQ(ReadJson(lines.front())["unit"], Json::Value("photos"));
  EXPECT_EQ(ReadJson(lines.back())["unit"], Json::Value("thumbnails"));
  Json::Value unit;
  for (const std::string& line : lines) {
    const Json::Value moment = ReadJson(line);
    EXPECT_EQ(moment["rate"].isNull(), moment["unit"] != unit) << line;
    // Ten in at least the half second between two samples.
    EXPECT_LE(moment["rate"].asDouble(), 25) << line;
    unit = moment["unit"];
  }
}

TEST_F(Watching, JsonIsOneObjectALine) {
  AddThumbs(100, 10);
  RunningConversion conversion;
  Program watch = Start({"--watch", "--json"});
  ASSERT_TRUE(WaitForOutput(watch, "\"completed\":10,"));
  AddThumbs(0, 40);
  ASSERT_TRUE(WaitForOutput(watch, "\"completed\":50,"));
  conversion.Finish();
  const auto result = watch.Wait();
  ASSERT_TRUE(result);
  EXPECT_EQ(result->exitCode, 1);
  std::vector<Json::Value> moments;
  for (const std::string& line : LinesOf(result->out)) {
    moments.push_back(ReadJson(line));
    EXPECT_THAT(moments.back().getMemberNames(),
                UnorderedElementsAre("photo", "thumb", "video", "instances", "activity", "unit",
                                     "rate", "seconds_left", "resume_time", "seconds_until_resume",
                                     "paused_by", "deferred_entries"));
    EXPECT_EQ(moments.back()["unit"], Json::Value("thumbnails"));
  }
  ASSERT_GE(moments.size(), 3U);
  ExpectMembers(moments[0], R"({"rate": null, "seconds_left": null})");
  ExpectMembers(moments[0]["thumb"], R"({"total": 100, "completed": 10})");
  EXPECT_EQ(moments[0]["instances"][0].asInt(), conversion.Pid());
  EXPECT_EQ(moments[1]["thumb"]["completed"], Json::Value(50));
  EXPECT_GT(moments[1]["rate"].asDouble(), 0);
  EXPECT_GT(moments[1]["seconds_left"].asInt64(), 0);
  EXPECT_EQ(moments.back()["thumb"]["completed"], Json::Value(51));
  EXPECT_EQ(moments.back()["instances"], Json::Value(Json::arrayValue));
  EXPECT_EQ(moments.front()["activity"], Json::Value("running"));
  EXPECT_EQ(moments.back()["activity"], Json::Value("ended"));
}

TEST_F(Watching, RedrawsABarOnATerminal) {
  AddThumbs(1000, 100);
  RunningConversion conversion;
  Terminal terminal(100);
  Program watch = Start({"--watch"}, WithOutputAt(terminal.ProgramSide()));
  ASSERT_TRUE(terminal.WaitForText("]  10%  100 of 1000 thumbnails"));
  AddThumbs(0, 100);
  ASSERT_TRUE(terminal.WaitForText("]  20%  200 of 1000 thumbnails"));
  EXPECT_THAT(terminal.Written(), Not(HasSubstr("\n")));
  conversion.Finish();
  const auto result = watch.Wait();
  ASSERT_TRUE(result);
  EXPECT_EQ(result->exitCode, 1);
  EXPECT_EQ(result->err, "");
  const std::string written = terminal.Written();
  EXPECT_THAT(written, StartsWith("\r["));
  EXPECT_THAT(written, ContainsRegex("\r\\[##*\\.\\.*\\]  20%  200 of 1000 thumbnails  "
                                     "[0-9]+\\.[0-9]/s  [0-9]+:[0-9][0-9] left\033\\[K"));
  EXPECT_THAT(written, EndsWith("\033[K\r\n" + FinalText("\r\n")));
}

TEST_F(Watching, OnANarrowTerminalTheLineDoesNotWrap) {
  AddThumbs(1000, 100);
  RunningConversion conversion;
  Terminal terminal(20);
  Program watch = Start({"--watch"}, WithOutputAt(terminal.ProgramSide()));
  ASSERT_TRUE(terminal.WaitForText("\r 10%  100 of 1000 t\033[K"));
  watch.Kill(SIGTERM);
  EXPECT_EQ(watch.Wait()->signal, SIGTERM);
}

TEST_F(Watching, OnATerminalWithoutAWidthUsesTheDefault) {
  AddThumbs(1000, 100);
  Terminal terminal(0);
  Program watch = Start({"--watch"}, WithOutputAt(terminal.ProgramSide()));
  ASSERT_TRUE(watch.Wait());
  const std::string written = terminal.Written();
  EXPECT_EQ(written.find("\033[K"), 1U + 79U);
}

TEST_F(Watching, JsonStaysJsonOnATerminal) {
  Terminal terminal(100);
  Program watch = Start({"--watch", "--json"}, WithOutputAt(terminal.ProgramSide()));
  ASSERT_TRUE(watch.Wait());
  const std::string written = terminal.Written();
  ASSERT_THAT(written, EndsWith("}\r\n"));
  ReadJson(written.substr(0, written.size() - 2));
}

/// Watches a running instance until the reader of its output has closed the pipe.
ProgramResult WatchUntilReaderCloses(const std::vector<BeforeExec>& beforeExec) {
  RunningConversion conversion;
  int ends[2];
  EXPECT_EQ(pipe2(ends, O_CLOEXEC), 0);
  Descriptor reader(ends[0]);
  Descriptor writer(ends[1]);
  ProgramOptions options = WithOutputAt(writer.Get());
  options.beforeExec.insert(options.beforeExec.end(), beforeExec.begin(), beforeExec.end());
  Program watch = StartProgram(StatusProgramPath(), {"--watch"}, options);
  writer.Close();
  char first = '\0';
  EXPECT_EQ(read(reader.Get(), &first, 1), 1);
  reader.Close();
  AddThumbs(0, 5);
  const auto result = watch.Wait(std::chrono::seconds(20));
  EXPECT_TRUE(result);
  return result.value_or(ProgramResult());
}

TEST_F(Watching, EndsWhenItsReaderHasClosedThePipe) {
  EXPECT_EQ(WatchUntilReaderCloses({}).signal, SIGPIPE);
}

TEST_F(Watching, EndsWithAnErrorWhenItsReaderHasClosedThePipeAndTheSignalIsIgnored) {
  ExpectError(WatchUntilReaderCloses({IgnoreSignal(SIGPIPE)}),
              "standard output: cannot be written");
}

}  // namespace
}  // namespace vela_test
