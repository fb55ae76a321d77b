// The command line, and what the exit status tells of it.
#include <fcntl.h>
#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "status_program.h"
#include "storage/photo_tree.h"
#include "support/descriptor.h"
#include "support/files.h"
#include "support/sandbox.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::AllOf;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::MatchesRegex;

constexpr const char* kTop = "/tmp/photos";

class CommandLine : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    MakeDirectories(kTop);
  }

  /// Wrong use: told on standard error, nothing answered.
  static void ExpectWrong(const std::vector<std::string>& arguments, const std::string& message) {
    const ProgramResult result = RunStatus(arguments);
    EXPECT_EQ(result.exitCode, 2) << message;
    EXPECT_EQ(result.out, "") << message;
    EXPECT_THAT(result.err, HasSubstr(message));
    EXPECT_THAT(result.err, HasSubstr("--help")) << message;
  }
};

TEST_F(CommandLine, HelpNamesEveryOptionAndTheExitStatus) {
  const ProgramResult result = RunStatus({"--help"});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.err, "");
  for (const char* text :
       {"-p,--photos", "-r,--recursive", "--check-videos", "--html", "-q,--queue", "--progress",
        "--resume-time", "-w,--watch", "-j,--json", "--version", "-h,--help", "DIR", "REMOVES",
        "Exit status: 0 nothing to do, 1 work outstanding, 2 error."}) {
    EXPECT_THAT(result.out, HasSubstr(text));
  }
  EXPECT_EQ(RunStatus({"-h"}).out, result.out);
}

TEST_F(CommandLine, TellsItsVersion) {
  const ProgramResult result = RunStatus({"--version"});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.err, "");
  EXPECT_THAT(result.out, MatchesRegex("velathumb-status [0-9]+\\.[0-9]+\\.[0-9]+\n"));
}

TEST_F(CommandLine, HelpLooksAtNothing) {
  EXPECT_EQ(RunStatus({"--help", "/tmp/none"}).exitCode, 0);
}

TEST_F(CommandLine, WithoutAQuestionIsWrong) {
  ExpectWrong({}, "give a directory, --queue, --progress, --watch or --resume-time");
  ExpectWrong({"--json"}, "give a directory");
}

TEST_F(CommandLine, UnknownOptionsAreWrong) {
  ExpectWrong({"--unknown", kTop}, "--unknown");
  ExpectWrong({"-x", kTop}, "-x");
}

TEST_F(CommandLine, OptionsAboutDirectoriesNeedOne) {
  ExpectWrong({"--photos", "--queue"}, "--photos requires DIR");
  ExpectWrong({"--recursive", "--queue"}, "--recursive requires DIR");
  ExpectWrong({"--html", "/tmp/page.html", "--queue"}, "--html requires DIR");
  ExpectWrong({"--check-videos", "--progress"}, "--check-videos needs a directory or --queue");
  ExpectWrong({"--check-videos"}, "--queue");
}

TEST_F(CommandLine, ThePageNeedsAName) {
  ExpectWrong({kTop, "--html"}, "--html");
  ExpectWrong({kTop, "--html", ""}, "--html");
}

TEST_F(CommandLine, WatchingExcludesTheOtherQuestions) {
  ExpectWrong({"--watch", kTop}, "DIR excludes --watch");
  ExpectWrong({"--watch", "--queue"}, "--queue excludes --watch");
  ExpectWrong({"--watch", "--resume-time"}, "--resume-time excludes --watch");
  ExpectWrong({"--watch", "--check-videos"}, "--check-videos");
}

TEST_F(CommandLine, WrongUseLooksAtNothing) {
  RunStatus({"--html", "/tmp/page.html", "--queue"});
  EXPECT_FALSE(Exists("/tmp/page.html"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(CommandLine, ShortOptionsCanBeJoined) {
  MakePhoto(std::string(kTop) + "/below/a.jpg");
  const Json::Value answer = ReadJson(RunStatus({"-prj", kTop}).out);
  EXPECT_EQ(answer["directories"].size(), 2U);
  EXPECT_EQ(answer["directories"][1]["photo_list"].size(), 1U);
}

TEST_F(CommandLine, OptionsMayStandBehindTheDirectories) {
  MakeDirectories("/tmp/other");
  EXPECT_EQ(ReadJson(RunStatus({kTop, "--json", "/tmp/other"}).out)["directories"].size(), 2U);
}

TEST_F(CommandLine, ADirectoryThatLooksLikeAnOptionStandsBehindTwoDashes) {
  MakeDirectories("/tmp/-r");
  ProgramOptions options;
  options.workingDirectory = "/tmp";
  const Json::Value answer = ReadJson(RunStatus({"--json", "--", "-r"}, options).out);
  EXPECT_EQ(answer["directories"][0]["path"], Json::Value("/tmp/-r"));
}

TEST_F(CommandLine, ADirectoryMayBeCalledAnything) {
  ProgramOptions options;
  options.workingDirectory = "/tmp/odd";
  for (const std::string name : {"[x]", "[a,b]", "[]", "{}", "{a}", "%%", "%%[", "\"a\"", "'a'"}) {
    MakePhoto("/tmp/odd/" + name + "/a.jpg");
    for (const std::vector<std::string>& before : {std::vector<std::string>{}, {"--"}}) {
      std::vector<std::string> arguments = {"--json"};
      arguments.insert(arguments.end(), before.begin(), before.end());
      arguments.push_back(name);
      const Json::Value answer = ReadJson(RunStatus(arguments, options).out);
      ASSERT_EQ(answer["directories"].size(), 1U) << name;
      EXPECT_EQ(answer["directories"][0]["path"], Json::Value("/tmp/odd/" + name));
      EXPECT_EQ(answer["directories"][0]["photos"], Json::Value(1)) << name;
    }
  }
  EXPECT_EQ(RunStatus({"--html", "[page]", "{}", "[x]"}, options).exitCode, 1);
  EXPECT_TRUE(IsRegularFile("/tmp/odd/[page]"));
}

TEST_F(CommandLine, SeveralQuestionsAreAllAnswered) {
  MakePhoto(std::string(kTop) + "/a.jpg");
  WriteFile("/var/spool/flv_create.queue", "/tmp/film.mp4\n");
  const ProgramResult result = RunStatus({"--queue", "--progress", "--resume-time", kTop});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_THAT(result.out,
              AllOf(HasSubstr(kTop), HasSubstr("/tmp/film.mp4"), HasSubstr("total_photo: 0"),
                    HasSubstr("conversion is not paused")));
}

TEST_F(CommandLine, WorkOfOneQuestionIsEnoughAndAnErrorGoesBeforeIt) {
  WriteFile("/var/spool/thumb_create.queue", "/tmp/a\n");
  EXPECT_EQ(RunStatus({"--queue", "--progress", kTop}).exitCode, 1);
  EXPECT_EQ(RunStatus({"--progress", kTop}).exitCode, 0);
  EXPECT_EQ(RunStatus({"--queue", "/tmp/none"}).exitCode, 2);
}

TEST_F(CommandLine, AFullOutputIsAnErrorForEveryQuestion) {
  const Descriptor full(open("/dev/full", O_WRONLY | O_CLOEXEC));
  ASSERT_TRUE(full.IsOpen());
  const std::vector<std::vector<std::string>> questions = {
      {kTop},      {"--json", kTop},     {"--queue"}, {"--progress"}, {"--resume-time"},
      {"--watch"}, {"--json", "--watch"}};
  for (const auto& question : questions) {
    const ProgramResult result = RunStatus(question, WithOutputAt(full.Get()));
    EXPECT_EQ(result.exitCode, 2) << question.back();
    EXPECT_EQ(result.err, "velathumb-status: standard output: cannot be written\n")
        << question.back();
  }
}

TEST_F(CommandLine, AClosedOutputIsAnError) {
  ProgramOptions options;
  options.closeOutput = true;
  EXPECT_EQ(RunStatus({kTop}, options).exitCode, 2);
}

}  // namespace
}  // namespace vela_test
