// The command line, and the exit status.
#include <fcntl.h>

#include "status_fixture.h"
#include "support/descriptor.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using namespace ::testing;

using CommandLine = StatusTest;

TEST_F(CommandLine, HelpNamesEveryOptionAndTheExitStatus) {
  const ProgramResult result = RunStatus({"--help"});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.err, "");
  for (const char* text :
       {"-p,--photos", "-r,--recursive", "--check-videos", "--html", "-q,--queue", "--progress",
        "--resume-time", "--security", "--check-config", "-w,--watch", "-j,--json", "--version",
        "-h,--help", "DIR", "REMOVES",
        "Exit status: 0 nothing to do, 1 work outstanding, 2 error."}) {
    EXPECT_THAT(result.out, HasSubstr(text));
  }
  EXPECT_EQ(RunStatus({"-h"}).out, result.out);
  EXPECT_EQ(RunStatus({"--help", "/tmp/none"}).exitCode, 0);
}

TEST_F(CommandLine, PrintsItsVersion) {
  const ProgramResult result = RunStatus({"--version"});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.err, "");
  EXPECT_THAT(result.out, MatchesRegex("velathumb-status [0-9]+\\.[0-9]+\\.[0-9]+\n"));
}

TEST_F(CommandLine, InvalidArgumentsAreReportedOnStandardError) {
  const struct {
    std::vector<std::string> arguments;
    std::string message;
  } cases[] = {
      {{},
       "give a directory, --failed, --queue, --progress, --watch, --resume-time, --security or "
       "--check-config"},
      {{"--json"}, "give a directory"},
      {{"--unknown", kTop}, "--unknown"},
      {{"-x", kTop}, "-x"},
      {{"--photos", "--queue"}, "--photos requires DIR"},
      {{"--recursive", "--queue"}, "--recursive requires DIR"},
      {{"--recursive"}, "--recursive requires DIR or --failed"},
      {{"--failed", "-0", "--queue"}, "--null excludes --queue"},
      {{"--failed", "-0", "--progress"}, "--null excludes --progress"},
      {{"--failed", "-0", "--resume-time", kTop}, "--null excludes --resume-time"},
      {{"--failed", "-0", "--security"}, "--null excludes --security"},
      {{"--failed", "-0", "--check-config"}, "--null excludes --check-config"},
      {{"--html", "/tmp/page.html", "--queue"}, "--html requires DIR"},
      {{"--check-videos", "--progress"}, "--check-videos needs a directory or --queue"},
      {{"--check-videos"}, "--queue"},
      {{kTop, "--html"}, "--html"},
      {{kTop, "--html", ""}, "--html"},
      {{"--watch", kTop}, "DIR excludes --watch"},
      {{"--watch", "--queue"}, "--queue excludes --watch"},
      {{"--watch", "--resume-time"}, "--resume-time excludes --watch"},
      {{"--watch", "--security"}, "--security excludes --watch"},
      {{"--watch", "--check-config"}, "--check-config excludes --watch"},
      {{"--check-config", "/tmp/a.conf", kTop}, "DIR excludes --check-config"},
      {{"--watch", "--check-videos"}, "--check-videos"},
  };
  for (const auto& [arguments, message] : cases) {
    SCOPED_TRACE(message);
    const ProgramResult result = RunStatus(arguments);
    EXPECT_EQ(result.exitCode, 2);
    EXPECT_EQ(result.out, "");
    EXPECT_THAT(result.err, AllOf(HasSubstr(message), HasSubstr("--help")));
  }
  EXPECT_FALSE(Exists("/tmp/page.html"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(CommandLine, ShortOptionsCanBeJoined) {
  MakePhoto(In("below/a.jpg"));
  const Json::Value answer = ReadJson(RunStatus({"-prj", kTop}).out);
  EXPECT_EQ(answer["directories"].size(), 2U);
  EXPECT_EQ(answer["directories"][1]["photo_list"].size(), 1U);
}

TEST_F(CommandLine, OptionsMayFollowDirectories) {
  MakeDirectories("/tmp/other");
  EXPECT_EQ(ReadJson(RunStatus({kTop, "--json", "/tmp/other"}).out)["directories"].size(), 2U);
}

TEST_F(CommandLine, TwoDashesEndTheOptions) {
  MakeDirectories("/tmp/-r");
  ProgramOptions options;
  options.workingDirectory = "/tmp";
  const Json::Value answer = ReadJson(RunStatus({"--json", "--", "-r"}, options).out);
  EXPECT_EQ(answer["directories"][0]["path"], Json::Value("/tmp/-r"));
}

TEST_F(CommandLine, ADirectoryMayHaveAnyName) {
  ProgramOptions options;
  options.workingDirectory = "/tmp/odd";
  for (const std::string name : {"[x]", "[a,b]", "[]", "{}", "{a}", "%%", "%%[", "\"a\"", "'a'"}) {
    SCOPED_TRACE(name);
    MakePhoto("/tmp/odd/" + name + "/a.jpg");
    for (const std::vector<std::string>& arguments :
         {std::vector<std::string>{"--json", name}, {"--json", "--", name}}) {
      const Json::Value answer = ReadJson(RunStatus(arguments, options).out);
      ASSERT_EQ(answer["directories"].size(), 1U);
      EXPECT_EQ(answer["directories"][0]["path"], Json::Value("/tmp/odd/" + name));
      EXPECT_EQ(answer["directories"][0]["photos"], Json::Value(1));
    }
  }
  EXPECT_EQ(RunStatus({"--html", "[page]", "{}", "[x]"}, options).exitCode, 1);
  EXPECT_TRUE(IsRegularFile("/tmp/odd/[page]"));
}

TEST_F(CommandLine, SeveralReportsAreAllPrinted) {
  MakePhoto(In("a.jpg"));
  WriteFile(kVideoQueue, "/tmp/film.mp4\n");
  const ProgramResult result = RunStatus({"--queue", "--progress", "--resume-time", kTop});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_THAT(result.out,
              AllOf(HasSubstr(kTop), HasSubstr("/tmp/film.mp4"), HasSubstr("total_photo: 0"),
                    HasSubstr("conversion is not paused")));
}

TEST_F(CommandLine, OneReportWithWorkIsEnoughAndAnErrorTakesPrecedence) {
  WriteFile(kPhotoQueue, "/tmp/a\n");
  EXPECT_EQ(RunStatus({"--queue", "--progress", kTop}).exitCode, 1);
  EXPECT_EQ(RunStatus({"--progress", kTop}).exitCode, 0);
  EXPECT_EQ(RunStatus({"--queue", "/tmp/none"}).exitCode, 2);
}

TEST_F(CommandLine, AFullOutputIsAnErrorForEveryReport) {
  const Descriptor full(open("/dev/full", O_WRONLY | O_CLOEXEC));
  ASSERT_TRUE(full.IsOpen());
  const std::vector<std::vector<std::string>> questions = {
      {kTop},      {"--json", kTop},     {"--queue"}, {"--progress"}, {"--resume-time"},
      {"--watch"}, {"--json", "--watch"}};
  for (const auto& question : questions) {
    SCOPED_TRACE(question.back());
    ExpectError(RunStatus(question, WithOutputAt(full.Get())),
                "standard output: cannot be written");
  }
}

TEST_F(CommandLine, AClosedOutputIsAnError) {
  ProgramOptions options;
  options.closeOutput = true;
  EXPECT_EQ(RunStatus({kTop}, options).exitCode, 2);
}

}  // namespace
}  // namespace vela_test
