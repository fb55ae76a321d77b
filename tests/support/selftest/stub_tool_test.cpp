// The recording stubs: what they record and how they follow their plans.
#include "support/stub_tool.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <iterator>
#include <optional>
#include <sstream>

#include "support/descriptor.h"
#include "support/files.h"
#include "support/image_checks.h"
#include "support/images.h"
#include "support/mounts.h"
#include "support/program.h"
#include "support/sandbox.h"

namespace vela_test {
namespace {

using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;

constexpr const char* kPhoto = "/tmp/photos/a.jpg";

/// A converter's command line with three outputs, as the program writes it.
std::vector<std::string> ThreeOutputs() {
  std::istringstream line(
      "-define registry:temporary-path=/tmp/out /tmp/photos/a.jpg "
      "( -clone 0 -define jpeg:size=1280x1280 -thumbnail 1280x1280>^ -write /tmp/out/xl.jpg ) "
      "-delete 0 ( +clone -thumbnail 640x640> -write /tmp/out/50%%.jpg +delete ) "
      "-thumbnail 120x120> /tmp/out/s.jpg");
  return {std::istream_iterator<std::string>(line), {}};
}

class StubToolTest : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    MakeDirectories("/tmp/out");
    WriteFileOfSize(kPhoto, 5000);
  }

  static ProgramResult Convert() { return RunProgram(kConverterPath, ThreeOutputs()); }

  /// The result of a converter with this plan.
  static ProgramResult Convert(const StubPlan& plan) {
    StubTool(kConverterPath).Plan(plan);
    return Convert();
  }

  /// Starts a converter with this plan, whose first steps make /tmp/started.
  static Program Start(const StubPlan& plan) {
    StubTool(kConverterPath).Plan(plan);
    Program program = StartProgram(kConverterPath, {});
    EXPECT_TRUE(WaitUntilExists("/tmp/started"));
    return program;
  }
};

TEST_F(StubToolTest, WorksLikeAConverterByDefault) {
  const StubTool stub(kConverterPath);
  EXPECT_EQ(Convert().exitCode, 0);
  EXPECT_THAT(ListDirectory("/tmp/out"), ElementsAre("50%.jpg", "s.jpg", "xl.jpg"));
  const auto largest = DecodeJpeg("/tmp/out/xl.jpg");
  ASSERT_TRUE(largest.has_value());
  EXPECT_EQ(largest->Width(), 1280);
  EXPECT_EQ(largest->Height(), 1280);
  const auto smallest = DecodeJpeg("/tmp/out/s.jpg");
  ASSERT_TRUE(smallest.has_value());
  EXPECT_EQ(smallest->Width(), 120);
}

TEST_F(StubToolTest, RecordsTheCallByteExact) {
  const StubTool stub(kConverterPath);
  const std::vector<std::string> arguments = {"", "a b", "1:2\n", "\xff%", "/tmp/out/o.jpg"};
  ProgramOptions options;
  options.argumentZero = "zero";
  options.workingDirectory = "/tmp/out";
  options.umask = 027;
  options.beforeExec = {IgnoreSignal(SIGPIPE), BlockSignal(SIGUSR2)};
  const Descriptor leak(open("/tmp/photos", O_RDONLY | O_CLOEXEC));
  options.keptDescriptors = {leak.Get()};
  RunProgram(kConverterPath, arguments, options);

  ASSERT_EQ(stub.Calls().size(), 1U);
  const StubCall call = stub.Calls()[0];
  EXPECT_EQ(call.tool, "convert-thumb");
  EXPECT_EQ(call.path, kConverterPath);
  EXPECT_EQ(call.number, 1);
  EXPECT_EQ(call.arguments[0], "zero");
  EXPECT_EQ(call.Parameters(), arguments);
  EXPECT_EQ(call.workingDirectory, "/tmp/out");
  EXPECT_EQ(call.umask, 027U);
  EXPECT_THAT(call.ignoredSignals, ElementsAre(SIGPIPE));
  EXPECT_THAT(call.blockedSignals, ElementsAre(SIGUSR2));
  EXPECT_EQ(call.parentPid, getpid());
  ASSERT_EQ(call.descriptors.size(), 4U);
  EXPECT_EQ(call.descriptors[0].number, 0);
  EXPECT_EQ(call.descriptors[0].target, "/dev/null");
  EXPECT_EQ(call.descriptors[3].number, leak.Get());
  EXPECT_EQ(call.descriptors[3].target, "/tmp/photos");
  EXPECT_LT(call.startSequence, call.endSequence);
  EXPECT_LE(call.startNanoseconds, call.endNanoseconds);
}

TEST_F(StubToolTest, KernelNamesTheProcessAfterTheTool) {
  Program program = Start(StubPlan().CreateFile("/tmp/started").WaitForFile("/tmp/go"));
  EXPECT_EQ(ReadFile("/proc/" + std::to_string(program.Pid()) + "/comm"), "convert-thumb\n");
  WriteFile("/tmp/go", "");
  EXPECT_EQ(program.Wait()->exitCode, 0);
}

TEST_F(StubToolTest, FailsBeforeBetweenAndAfterItsOutputs) {
  const StubTool stub(kConverterPath);
  stub.PlanCall(1, StubPlan().Exit(3));
  stub.PlanCall(2, StubPlan().WriteOutputs(2).Exit(4));
  stub.PlanCall(3, StubPlan().WriteOutputs().Exit(5));
  EXPECT_EQ(Convert().exitCode, 3);
  EXPECT_THAT(ListDirectory("/tmp/out"), IsEmpty());
  EXPECT_EQ(Convert().exitCode, 4);
  EXPECT_THAT(ListDirectory("/tmp/out"), ElementsAre("50%.jpg", "xl.jpg"));
  EXPECT_EQ(Convert().exitCode, 5);
  EXPECT_THAT(ListDirectory("/tmp/out"), ElementsAre("50%.jpg", "s.jpg", "xl.jpg"));
  EXPECT_EQ(Convert().exitCode, 0);
  EXPECT_EQ(stub.Calls().size(), 4U);
}

TEST_F(StubToolTest, WritesOutputsOfAnySize) {
  EXPECT_EQ(
      Convert(StubPlan().WriteOutputsOfSize(1, 0).WriteOutputsOfSize(1, 1).WriteOutput("mine"))
          .exitCode,
      0);
  EXPECT_EQ(FileSize("/tmp/out/xl.jpg"), 0);
  EXPECT_EQ(FileSize("/tmp/out/50%.jpg"), 1);
  EXPECT_EQ(ReadFile("/tmp/out/s.jpg"), "mine");
  EXPECT_EQ(Convert(StubPlan().WriteOutputsOfSize(StubPlan::kAll, 100000)).exitCode, 0);
  EXPECT_EQ(FileSize("/tmp/out/s.jpg"), 100000);
}

TEST_F(StubToolTest, SkipsOutputs) {
  Convert(StubPlan().SkipOutputs().WriteOutputs(1));
  EXPECT_THAT(ListDirectory("/tmp/out"), ElementsAre("50%.jpg"));
}

TEST_F(StubToolTest, OutputThatCannotBeWrittenGivesStatusOne) {
  const StubTool stub(kConverterPath);
  RemoveTree("/tmp/out");
  const ProgramResult result = Convert();
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_THAT(result.err, HasSubstr("/tmp/out/xl.jpg"));
}

TEST_F(StubToolTest, ConditionsChooseThePlan) {
  const auto output = [](const char* option) {
    return RunProgram(kDcrawPath, {option, "-c", "/a.crw"}).out;
  };
  StubTool stub(kDcrawPath);
  stub.PlanWhen("-e", StubPlan().Print("preview"));
  stub.PlanWhen("-w", StubPlan().Print("picture"));
  stub.Plan(StubPlan().Print("else"));
  EXPECT_EQ(output("-e"), "preview");
  EXPECT_EQ(output("-w"), "picture");
  EXPECT_EQ(RunProgram(kDcrawPath, {"-i", "-v", "/a.crw"}).out, "else");
  stub.PlanWhen("-c", StubPlan().Print("latest"));
  EXPECT_EQ(output("-e"), "latest");
  stub.PlanCall(5, StubPlan().Print("fifth"));
  EXPECT_EQ(output("-e"), "fifth");
}

TEST_F(StubToolTest, PrintsMegabytesAndStops) {
  const StubTool stub(kDcrawPath);
  stub.Plan(StubPlan().PrintRepeated(std::string(1000, 'x'), 3000).PrintError("why").Exit(1));
  const ProgramResult result = RunProgram(kDcrawPath, {"-e", "-c", "/a.crw"});
  EXPECT_EQ(result.out.size(), 3000000U);
  EXPECT_EQ(result.err, "why");
  EXPECT_EQ(result.exitCode, 1);
}

TEST_F(StubToolTest, DiesBySignal) {
  EXPECT_EQ(Convert(StubPlan().WriteOutputs(1).DieBySignal(SIGSEGV)).signal, SIGSEGV);
  EXPECT_THAT(ListDirectory("/tmp/out"), ElementsAre("xl.jpg"));
}

TEST_F(StubToolTest, KilledFromOutsideHasNoEnd) {
  Program program = Start(StubPlan().CreateFile("/tmp/started").Sleep(100000));
  program.Kill(SIGTERM);
  EXPECT_EQ(program.Wait()->signal, SIGTERM);
  const std::vector<StubCall> calls = AllStubCalls();
  ASSERT_EQ(calls.size(), 1U);
  EXPECT_EQ(calls[0].endSequence, 0U);
  EXPECT_EQ(calls[0].endNanoseconds, 0);
}

TEST_F(StubToolTest, CanIgnoreSignals) {
  Program program =
      Start(StubPlan().IgnoreSignal(SIGTERM).CreateFile("/tmp/started").WaitForFile("/tmp/go"));
  program.Kill(SIGTERM);
  EXPECT_FALSE(program.Wait(std::chrono::milliseconds(50)).has_value());
  WriteFile("/tmp/go", "");
  EXPECT_EQ(program.Wait()->exitCode, 0);
}

TEST_F(StubToolTest, SignalsItsParent) {
  const StubTool stub(kConverterPath);
  stub.Plan(StubPlan().SignalParent(SIGTERM).Sleep(100));
  const std::string script = std::string("trap 'echo got' TERM; ") + kConverterPath + " a; exit 0";
  EXPECT_EQ(RunProgram("/bin/sh", {"-c", script}).out, "got\n");
}

TEST_F(StubToolTest, SleepsForItsTime) {
  EXPECT_GE(Convert(StubPlan().Sleep(50)).wallTime, std::chrono::milliseconds(50));
}

TEST_F(StubToolTest, ChangesSizeAndBlocksOfTheSourceSeparately) {
  const auto statusAfter = [](const StubPlan& plan) {
    WriteFileOfSize(kPhoto, 5000);
    Convert(plan);
    struct stat status {};
    EXPECT_EQ(stat(kPhoto, &status), 0);
    return status;
  };
  const struct stat before = statusAfter(StubPlan());
  const struct stat larger = statusAfter(StubPlan().GrowSizeOnly(StubPlan::kSource, 100000));
  EXPECT_EQ(larger.st_size, before.st_size + 100000);
  EXPECT_EQ(larger.st_blocks, before.st_blocks);
  const struct stat longer = statusAfter(StubPlan().GrowBlocksOnly(StubPlan::kSource, 65536));
  EXPECT_EQ(longer.st_size, before.st_size);
  EXPECT_LT(before.st_blocks, longer.st_blocks);
  const struct stat appended = statusAfter(StubPlan().AppendToSource(100000));
  EXPECT_EQ(appended.st_size, before.st_size + 100000);
  EXPECT_LT(before.st_blocks, appended.st_blocks);
}

TEST_F(StubToolTest, RemovesAndReplacesTheSource) {
  Convert(StubPlan().ReplaceByDirectory(StubPlan::kSource));
  EXPECT_TRUE(IsDirectory(kPhoto));
  Convert(StubPlan().Remove(StubPlan::kSource));
  EXPECT_FALSE(Exists(kPhoto));
}

TEST_F(StubToolTest, KnowsTheSourceBehindAPageNumber) {
  const StubTool stub(kConverterPath);
  stub.Plan(StubPlan().Remove(StubPlan::kSource));
  RunProgram(kConverterPath, {std::string(kPhoto) + "[0]", "-quality", "80", "/tmp/out/s.jpg"});
  EXPECT_FALSE(Exists(kPhoto));
}

TEST_F(StubToolTest, KnowsTheSourceOfARotationInPlace) {
  const StubTool stub(kConverterPath);
  EXPECT_EQ(RunProgram(kConverterPath, {"-rotate", "90", kPhoto, kPhoto}).exitCode, 0);
  EXPECT_TRUE(IsWholeJpeg(kPhoto));
}

TEST_F(StubToolTest, ChangesTheOutputDirectory) {
  Convert(StubPlan().WriteOutputs().SetMode(StubPlan::kOutputDirectory, 0555));
  EXPECT_EQ(ModeOf("/tmp/out"), 0555);
  Convert(StubPlan().WriteOutputs().Remove(StubPlan::kOutputDirectory));
  EXPECT_FALSE(Exists("/tmp/out"));
}

TEST_F(StubToolTest, SetsFileTimesAndWritesFiles) {
  Convert(StubPlan().WriteFile("/tmp/new", "content").SetFileTime("/tmp/new", 4000000000));
  EXPECT_EQ(ReadFile("/tmp/new"), "content");
  EXPECT_EQ(ModificationTime("/tmp/new"), (FileTime{4000000000, 0}));
}

TEST_F(StubToolTest, FillsAVolume) {
  const SmallVolume volume("/tmp/out", 1 << 20);
  const ProgramResult result =
      Convert(StubPlan().WriteOutputs(1).FillVolume("/tmp/out").WriteOutputs());
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_THAT(result.err, HasSubstr("No space left"));
  EXPECT_GT(FileSize("/tmp/out/xl.jpg"), 1000);
  EXPECT_EQ(FileSize("/tmp/out/s.jpg"), 0);
  EXPECT_EQ(volume.Available(), 0U);
}

TEST_F(StubToolTest, PassesThroughToTheRealTool) {
  const StubTool stub(kConverterPath);
  stub.Plan(StubPlan().PassThrough("/usr/bin/convert"));
  JpegRecipe recipe;
  recipe.width = 400;
  recipe.height = 300;
  MakeJpeg(kPhoto, recipe);
  const ProgramResult result =
      RunProgram(kConverterPath, {kPhoto, "-thumbnail", "120x120>", "/tmp/out/s.jpg"});
  EXPECT_EQ(result.exitCode, 0) << result.err;
  EXPECT_EQ(QuadrantLetters("/tmp/out/s.jpg"), "RGBY");
  EXPECT_EQ(stub.Calls().size(), 1U);
  EXPECT_NE(RunProgram(kConverterPath, {"/tmp/missing.jpg", "/tmp/out/s.jpg"}).exitCode, 0);
}

TEST_F(StubToolTest, RunsAnotherProgram) {
  const StubTool stub(kConverterPath);
  stub.Plan(StubPlan().Run("/bin/sh", {"-c", "echo ran; exit 6"}));
  const ProgramResult result = Convert();
  EXPECT_EQ(result.out, "ran\n");
  EXPECT_EQ(result.exitCode, 6);
}

TEST_F(StubToolTest, ClosesItsOutputBeforeItsEnd) {
  const StubTool stub(kDcrawPath);
  stub.Plan(StubPlan().Print("x").CloseOutput().Print("y"));
  EXPECT_EQ(RunProgram(kDcrawPath, {}).out, "x");
}

TEST_F(StubToolTest, EventsOfAllToolsAreInOneOrder) {
  const StubTool converter(kConverterPath);
  const StubTool comparer(kComparePath);
  RunProgram(kComparePath, {"a"});
  const uint64_t between = NextSequence();
  Convert();
  RunProgram(kComparePath, {"b"});
  const std::vector<StubCall> calls = AllStubCalls();
  ASSERT_EQ(calls.size(), 3U);
  EXPECT_EQ(calls[0].tool, "compare");
  EXPECT_LT(calls[0].endSequence, between);
  EXPECT_EQ(calls[1].tool, "convert-thumb");
  EXPECT_GT(calls[1].startSequence, between);
  EXPECT_EQ(calls[2].number, 2);
  EXPECT_EQ(comparer.Calls().size(), 2U);
}

TEST_F(StubToolTest, CallsAtTheSameTimeAreAllRecorded) {
  const StubTool stub(kConverterPath);
  stub.Plan(StubPlan());
  constexpr int kPrograms = 20;
  std::vector<Program> programs;
  programs.reserve(kPrograms);
  for (int i = 0; i < kPrograms; ++i) {
    programs.push_back(StartProgram(kConverterPath, {std::to_string(i)}));
  }
  for (Program& program : programs) {
    EXPECT_EQ(program.Wait()->exitCode, 0);
  }
  std::vector<int> numbers;
  for (const StubCall& call : stub.Calls()) {
    numbers.push_back(call.number);
    EXPECT_NE(call.endSequence, 0U);
  }
  std::sort(numbers.begin(), numbers.end());
  ASSERT_EQ(numbers.size(), static_cast<size_t>(kPrograms));
  EXPECT_EQ(numbers.front(), 1);
  EXPECT_EQ(numbers.back(), kPrograms);
}

TEST_F(StubToolTest, PlanThatCannotBeFollowedIsReported) {
  EXPECT_EQ(Convert(StubPlan().Remove("/tmp/missing")).exitCode, 125);
  const std::string record = ReadFile("/usr/vela/stub/record");
  EXPECT_THAT(record, HasSubstr("remove /tmp/missing: No such file"));
}

TEST_F(StubToolTest, RealToolsAreInstalled) {
  InstallRealTools();
  JpegRecipe recipe;
  recipe.orientation = 6;
  MakeJpeg(kPhoto, recipe);
  EXPECT_EQ(RunProgram(kConverterPath, {kPhoto, "/tmp/out/a.png"}).exitCode, 0);
  EXPECT_EQ(Identify("/tmp/out/a.png").format, "PNG");
  EXPECT_EQ(RunProgram(kExiftoolPath, {"-S", "-Orientation", kPhoto}).out,
            "Orientation: Rotate 90 CW\n");
  EXPECT_THAT(RunProgram(kComparePath, {"-metric", "MAE", kPhoto, kPhoto, "null:"}).err,
              HasSubstr("0 (0)"));
  EXPECT_THAT(RunProgram(kDcrawPath, {}).out, HasSubstr("dcraw"));
  EXPECT_EQ(RunProgram("/usr/bin/ffmpeg", {"-version"}).exitCode, 0);
}

TEST_F(StubToolTest, ToolsCanBeRemoved) {
  RemoveTool(kDcrawPath);
  EXPECT_EQ(RunProgram(kDcrawPath, {}).startError, ENOENT);
}

}  // namespace
}  // namespace vela_test
