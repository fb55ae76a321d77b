// The line that shows the progress on a terminal.
#include "progress_line.h"

#include <fcntl.h>
#include <signal.h>
#include <unistd.h>

#include <cerrno>

#include "queue_fixture.h"
#include "support/build_paths.h"
#include "support/named_case.h"
#include "support/terminal.h"

using namespace vela;

namespace vela_test {
namespace {

using namespace ::testing;

struct LineCase : NamedCase {
  ProgressSummary summary;
  std::string directory;
  int width;
  std::string line;
};

class ProgressLineFormat : public TestWithParam<LineCase> {};

TEST_P(ProgressLineFormat, IsAsExpected) {
  const LineCase& c = GetParam();
  const std::string line = FormatProgressLine(c.summary, c.directory, c.width);
  EXPECT_EQ(line, c.line);
  EXPECT_LT(static_cast<int>(line.size()), std::max(c.width, 1));
}

constexpr ProgressCount kNone = {0, 0};

const LineCase kLines[] = {
    {{"Thumbnails"},
     {{50, 20}, {290, 123}, kNone},
     "/srv/photos",
     80,
     "42%  123 of 290 thumbnails  /srv/photos"},
    {{"Nothing"}, {{50, 0}, {290, 0}, kNone}, "/srv", 80, "0%  0 of 290 thumbnails  /srv"},
    {{"NearlyAll"}, {kNone, {1000, 999}, kNone}, "/srv", 80, "99%  999 of 1000 thumbnails  /srv"},
    {{"All"}, {kNone, {1000, 1000}, kNone}, "/srv", 80, "100%  1000 of 1000 thumbnails  /srv"},
    {{"MoreThanAll"}, {kNone, {10, 12}, kNone}, "/srv", 80, "100%  10 of 10 thumbnails  /srv"},
    {{"Negative"}, {kNone, {10, -2}, kNone}, "/srv", 80, "0%  0 of 10 thumbnails  /srv"},
    {{"Large"},
     {kNone, {2147483647, 2147483646}, kNone},
     "/s",
     80,
     "99%  2147483646 of 2147483647 thumbnails  /s"},
    {{"OnlyPhotosHaveATotal"},
     {{50, 20}, {0, 123}, kNone},
     "/srv",
     80,
     "40%  20 of 50 photos  /srv"},
    {{"NoTotal"}, {{0, 2}, {0, 12}, kNone}, "/srv", 80, "12 thumbnails  /srv"},
    {{"LongPath"},
     {kNone, {10, 5}, kNone},
     "/srv/photos/2024/summer/beach",
     41,
     "50%  5 of 10 thumbnails  ...summer/beach"},
    {{"CharactersStayWhole"},
     {kNone, {10, 5}, kNone},
     "/srv/photos/2024/\u00fc\u00fc\u00fc/beach",
     40,
     "50%  5 of 10 thumbnails  ...\u00fc\u00fc/beach"},
    {{"NoRoomForAPath"}, {kNone, {10, 5}, kNone}, "/srv/photos", 30, "50%  5 of 10 thumbnails"},
    {{"Narrow"}, {kNone, {10, 5}, kNone}, "/srv/photos", 10, "50%  5 of"},
    {{"ControlCharacters"},
     {kNone, {10, 5}, kNone},
     "/a\n\x1b[2J",
     80,
     "50%  5 of 10 thumbnails  /a\\n\\x1b[2J"},
};
INSTANTIATE_TEST_SUITE_P(Lines, ProgressLineFormat, ValuesIn(kLines), CaseName());

class ProgressLineTest : public QueueTest {
 protected:
  /// Runs the runner for the tree /tmp/p, with its standard error on the terminal and `environment`
  /// added, and holds its converter in /tmp/p/below until `isReady` returns true.
  void RunOn(const Terminal& terminal, const std::vector<std::string>& environment,
             const std::function<void()>& whileHeld) {
    const StubTool converter(kConverterPath);
    converter.Plan(StubPlan().CreateFile("/tmp/here").WaitForFile("/tmp/go").WriteOutputs());
    MakePhoto("/tmp/p/below/a.jpg");
    ProgramOptions options;
    options.addedEnvironment = environment;
    const int side = terminal.ProgramSide();
    options.beforeExec = {[side] { return dup2(side, STDERR_FILENO) < 0 ? errno : 0; }};
    Enqueue({"R:/tmp/p"});
    Program runner = StartProgram(QueueProgramPath(), QueueArguments(kProfiles), options);
    ASSERT_TRUE(WaitUntilExists("/tmp/here"));
    whileHeld();
    Release();
    ExpectEnd(runner, 0);
  }
};

TEST_F(ProgressLineTest, ShowsTheDirectoryThatIsInProgressOfATree) {
  Terminal terminal(70);
  RunOn(terminal, {"TERM=xterm"},
        [&] { EXPECT_TRUE(terminal.WaitForText("\r\033[K0%  0 of 1 thumbnails  /tmp/p/below")); });
  // Messages replace it, and nothing is left of it in the end.
  EXPECT_THAT(terminal.Written(), StartsWith("velathumb-queue: took 1 entry\r\n"));
  EXPECT_THAT(terminal.Written(), EndsWith("\r\033[K"));
}

TEST_F(ProgressLineTest, IsNotShownOnATerminalThatCannotReplaceALine) {
  Terminal terminal(70);
  RunOn(terminal, {"TERM=dumb"}, [] { usleep(1200000); });
  EXPECT_THAT(terminal.Written(), Not(HasSubstr("thumbnails")));
}

TEST_F(ProgressLineTest, IsNotShownElsewhere) {
  Enqueue({"/tmp/a"});
  velathumb_.Stub().Plan(StubPlan().Sleep(1200));
  const std::string messages = ExpectRun({"/tmp/a"});
  EXPECT_THAT(messages, Not(HasSubstr("thumbnails")));
  EXPECT_THAT(messages, Not(HasSubstr("\033")));
}

TEST_F(ProgressLineTest, MessagesAreWrittenAboveIt) {
  velathumb_.Stub().PlanCall(1, StubPlan().WaitForFile("/tmp/go").Exit(1));
  Terminal terminal(70);
  ProgramOptions options;
  options.addedEnvironment = {"TERM=xterm"};
  const int side = terminal.ProgramSide();
  options.beforeExec = {[side] { return dup2(side, STDERR_FILENO) < 0 ? errno : 0; }};
  Enqueue({"/tmp/a"});
  Program runner = StartProgram(QueueProgramPath(), velathumb_.Arguments(), options);
  ASSERT_TRUE(terminal.WaitForText("thumbnails  /tmp/a"));
  Release();
  ExpectEnd(runner, 0);
  EXPECT_THAT(terminal.Written(),
              HasSubstr("\r\033[Kvelathumb-queue: velathumb did not complete, trying again: "
                        "/tmp/a\r\n0 thumbnails  /tmp/a"));
}

}  // namespace
}  // namespace vela_test
