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
  return {"-define",
          "registry:temporary-path=/tmp/out",
          kPhoto,
          "(",
          "-clone",
          "0",
          "-define",
          "jpeg:size=1280x1280",
          "-thumbnail",
          "1280x1280>^",
          "-write",
          "/tmp/out/xl.jpg",
          ")",
          "-delete",
          "0",
          "(",
          "+clone",
          "-thumbnail",
          "640x640>",
          "-write",
          "/tmp/out/50%%.jpg",
          "+delete",
          ")",
          "-thumbnail",
          "120x120>",
          "/tmp/out/s.jpg"};
}

class StubToolTest : public SandboxTest {
 protected:
  void SetUp() override {
    SandboxTest::SetUp();
    MakeDirectories("/tmp/out");
    WriteFileOfSize(kPhoto, 5000);
  }

  ProgramResult Convert(const ProgramOptions& options = ProgramOptions()) {
    return RunProgram(kConverterPath, ThreeOutputs(), options);
  }
};

TEST_F(StubToolTest, WorksLikeAConverterByDefault) {
  const StubTool stub(kConverterPath);
  EXPECT_EQ(0, Convert().exitCode);
  EXPECT_THAT(ListDirectory("/tmp/out"), ElementsAre("50%.jpg", "s.jpg", "xl.jpg"));
  const auto largest = DecodeJpeg("/tmp/out/xl.jpg");
  ASSERT_TRUE(largest.has_value());
  EXPECT_EQ(1280, largest->Width());
  EXPECT_EQ(1280, largest->Height());
  const auto smallest = DecodeJpeg("/tmp/out/s.jpg");
  ASSERT_TRUE(smallest.has_value());
  EXPECT_EQ(120, smallest->Width());
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

  ASSERT_EQ(1U, stub.Calls().size());
  const StubCall call = stub.Calls()[0];
  EXPECT_EQ("convert-thumb", call.tool);
  EXPECT_EQ(kConverterPath, call.path);
  EXPECT_EQ(1, call.number);
  EXPECT_EQ("zero", call.arguments[0]);
  EXPECT_EQ(arguments, call.Parameters());
  EXPECT_EQ("/tmp/out", call.workingDirectory);
  EXPECT_EQ(027U, call.umask);
  EXPECT_THAT(call.ignoredSignals, ElementsAre(SIGPIPE));
  EXPECT_THAT(call.blockedSignals, ElementsAre(SIGUSR2));
  EXPECT_EQ(getpid(), call.parentPid);
  ASSERT_EQ(4U, call.descriptors.size());
  EXPECT_EQ(0, call.descriptors[0].number);
  EXPECT_EQ("/dev/null", call.descriptors[0].target);
  EXPECT_EQ(leak.Get(), call.descriptors[3].number);
  EXPECT_EQ("/tmp/photos", call.descriptors[3].target);
  EXPECT_LT(call.startSequence, call.endSequence);
  EXPECT_LE(call.startNanoseconds, call.endNanoseconds);
}

TEST_F(StubToolTest, KernelNamesTheProcessAfterTheTool) {
  const StubTool stub(kConverterPath);
  stub.Plan(StubPlan().CreateFile("/tmp/started").WaitForFile("/tmp/go"));
  Program program = StartProgram(kConverterPath, {});
  ASSERT_TRUE(WaitUntilExists("/tmp/started"));
  EXPECT_EQ("convert-thumb\n", ReadFile("/proc/" + std::to_string(program.Pid()) + "/comm"));
  WriteFile("/tmp/go", "");
  EXPECT_EQ(0, program.Wait()->exitCode);
}

TEST_F(StubToolTest, FailsBeforeBetweenAndAfterItsOutputs) {
  const StubTool stub(kConverterPath);
  stub.PlanCall(1, StubPlan().Exit(3));
  stub.PlanCall(2, StubPlan().WriteOutputs(2).Exit(4));
  stub.PlanCall(3, StubPlan().WriteOutputs().Exit(5));
  EXPECT_EQ(3, Convert().exitCode);
  EXPECT_THAT(ListDirectory("/tmp/out"), IsEmpty());
  EXPECT_EQ(4, Convert().exitCode);
  EXPECT_THAT(ListDirectory("/tmp/out"), ElementsAre("50%.jpg", "xl.jpg"));
  EXPECT_EQ(5, Convert().exitCode);
  EXPECT_THAT(ListDirectory("/tmp/out"), ElementsAre("50%.jpg", "s.jpg", "xl.jpg"));
  EXPECT_EQ(0, Convert().exitCode);
  EXPECT_EQ(4U, stub.Calls().size());
}

TEST_F(StubToolTest, WritesOutputsOfAnySize) {
  const StubTool stub(kConverterPath);
  stub.Plan(StubPlan().WriteOutputsOfSize(1, 0).WriteOutputsOfSize(1, 1).WriteOutput("mine"));
  EXPECT_EQ(0, Convert().exitCode);
  EXPECT_EQ(0, FileSize("/tmp/out/xl.jpg"));
  EXPECT_EQ(1, FileSize("/tmp/out/50%.jpg"));
  EXPECT_EQ("mine", ReadFile("/tmp/out/s.jpg"));
  stub.Plan(StubPlan().WriteOutputsOfSize(StubPlan::kAll, 100000));
  EXPECT_EQ(0, Convert().exitCode);
  EXPECT_EQ(100000, FileSize("/tmp/out/s.jpg"));
}

TEST_F(StubToolTest, SkipsOutputs) {
  const StubTool stub(kConverterPath);
  stub.Plan(StubPlan().SkipOutputs().WriteOutputs(1));
  Convert();
  EXPECT_THAT(ListDirectory("/tmp/out"), ElementsAre("50%.jpg"));
}

TEST_F(StubToolTest, OutputThatCannotBeWrittenGivesStatusOne) {
  const StubTool stub(kConverterPath);
  RemoveTree("/tmp/out");
  const ProgramResult result = Convert();
  EXPECT_EQ(1, result.exitCode);
  EXPECT_THAT(result.err, HasSubstr("/tmp/out/xl.jpg"));
}

TEST_F(StubToolTest, ConditionsChooseThePlan) {
  StubTool stub(kDcrawPath);
  stub.PlanWhen("-e", StubPlan().Print("preview"));
  stub.PlanWhen("-w", StubPlan().Print("picture"));
  stub.Plan(StubPlan().Print("else"));
  EXPECT_EQ("preview", RunProgram(kDcrawPath, {"-e", "-c", "/a.crw"}).out);
  EXPECT_EQ("picture", RunProgram(kDcrawPath, {"-w", "-c", "/a.crw"}).out);
  EXPECT_EQ("else", RunProgram(kDcrawPath, {"-i", "-v", "/a.crw"}).out);
  stub.PlanWhen("-c", StubPlan().Print("latest"));
  EXPECT_EQ("latest", RunProgram(kDcrawPath, {"-e", "-c", "/a.crw"}).out);
  stub.PlanCall(5, StubPlan().Print("fifth"));
  EXPECT_EQ("fifth", RunProgram(kDcrawPath, {"-e", "-c", "/a.crw"}).out);
}

TEST_F(StubToolTest, PrintsMegabytesAndStops) {
  const StubTool stub(kDcrawPath);
  stub.Plan(StubPlan().PrintRepeated(std::string(1000, 'x'), 3000).PrintError("why").Exit(1));
  const ProgramResult result = RunProgram(kDcrawPath, {"-e", "-c", "/a.crw"});
  EXPECT_EQ(3000000U, result.out.size());
  EXPECT_EQ("why", result.err);
  EXPECT_EQ(1, result.exitCode);
}

TEST_F(StubToolTest, DiesBySignal) {
  const StubTool stub(kConverterPath);
  stub.Plan(StubPlan().WriteOutputs(1).DieBySignal(SIGSEGV));
  EXPECT_EQ(SIGSEGV, Convert().signal);
  EXPECT_THAT(ListDirectory("/tmp/out"), ElementsAre("xl.jpg"));
}

TEST_F(StubToolTest, KilledFromOutsideHasNoEnd) {
  const StubTool stub(kConverterPath);
  stub.Plan(StubPlan().CreateFile("/tmp/started").Sleep(100000));
  Program program = StartProgram(kConverterPath, {});
  ASSERT_TRUE(WaitUntilExists("/tmp/started"));
  program.Kill(SIGTERM);
  EXPECT_EQ(SIGTERM, program.Wait()->signal);
  ASSERT_EQ(1U, stub.Calls().size());
  EXPECT_EQ(0U, stub.Calls()[0].endSequence);
  EXPECT_EQ(0, stub.Calls()[0].endNanoseconds);
}

TEST_F(StubToolTest, CanIgnoreSignals) {
  const StubTool stub(kConverterPath);
  stub.Plan(StubPlan().IgnoreSignal(SIGTERM).CreateFile("/tmp/started").WaitForFile("/tmp/go"));
  Program program = StartProgram(kConverterPath, {});
  ASSERT_TRUE(WaitUntilExists("/tmp/started"));
  program.Kill(SIGTERM);
  EXPECT_FALSE(program.Wait(std::chrono::milliseconds(50)).has_value());
  WriteFile("/tmp/go", "");
  EXPECT_EQ(0, program.Wait()->exitCode);
}

TEST_F(StubToolTest, SignalsItsParent) {
  const StubTool stub(kConverterPath);
  stub.Plan(StubPlan().SignalParent(SIGTERM).Sleep(100));
  const std::string script = std::string("trap 'echo got' TERM; ") + kConverterPath + " a; exit 0";
  EXPECT_EQ("got\n", RunProgram("/bin/sh", {"-c", script}).out);
}

TEST_F(StubToolTest, SleepsForItsTime) {
  const StubTool stub(kConverterPath);
  stub.Plan(StubPlan().Sleep(50));
  EXPECT_GE(Convert().wallTime, std::chrono::milliseconds(50));
}

TEST_F(StubToolTest, ChangesSizeAndBlocksOfTheSourceSeparately) {
  const StubTool stub(kConverterPath);
  const auto status = [] {
    struct stat now {};
    EXPECT_EQ(0, stat(kPhoto, &now));
    return now;
  };
  const struct stat before = status();
  stub.Plan(StubPlan().GrowSizeOnly(StubPlan::kSource, 100000));
  Convert();
  const struct stat larger = status();
  EXPECT_EQ(before.st_size + 100000, larger.st_size);
  EXPECT_EQ(before.st_blocks, larger.st_blocks);

  WriteFileOfSize(kPhoto, 5000);
  stub.Plan(StubPlan().GrowBlocksOnly(StubPlan::kSource, 65536));
  Convert();
  const struct stat longer = status();
  EXPECT_EQ(before.st_size, longer.st_size);
  EXPECT_LT(before.st_blocks, longer.st_blocks);

  WriteFileOfSize(kPhoto, 5000);
  stub.Plan(StubPlan().AppendToSource(100000));
  Convert();
  EXPECT_EQ(before.st_size + 100000, status().st_size);
  EXPECT_LT(before.st_blocks, status().st_blocks);
}

TEST_F(StubToolTest, RemovesAndReplacesTheSource) {
  const StubTool stub(kConverterPath);
  stub.Plan(StubPlan().ReplaceByDirectory(StubPlan::kSource));
  Convert();
  EXPECT_TRUE(IsDirectory(kPhoto));
  stub.Plan(StubPlan().Remove(StubPlan::kSource));
  Convert();
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
  EXPECT_EQ(0, RunProgram(kConverterPath, {"-rotate", "90", kPhoto, kPhoto}).exitCode);
  EXPECT_TRUE(IsWholeJpeg(kPhoto));
}

TEST_F(StubToolTest, ChangesTheOutputDirectory) {
  const StubTool stub(kConverterPath);
  stub.Plan(StubPlan().WriteOutputs().SetMode(StubPlan::kOutputDirectory, 0555));
  Convert();
  EXPECT_EQ(0555, ModeOf("/tmp/out"));
  stub.Plan(StubPlan().WriteOutputs().Remove(StubPlan::kOutputDirectory));
  Convert();
  EXPECT_FALSE(Exists("/tmp/out"));
}

TEST_F(StubToolTest, SetsFileTimesAndWritesFiles) {
  const StubTool stub(kConverterPath);
  stub.Plan(StubPlan().WriteFile("/tmp/new", "content").SetFileTime("/tmp/new", 4000000000));
  Convert();
  EXPECT_EQ("content", ReadFile("/tmp/new"));
  EXPECT_EQ((FileTime{4000000000, 0}), ModificationTime("/tmp/new"));
}

TEST_F(StubToolTest, FillsAVolume) {
  const SmallVolume volume("/tmp/out", 1 << 20);
  const StubTool stub(kConverterPath);
  stub.Plan(StubPlan().WriteOutputs(1).FillVolume("/tmp/out").WriteOutputs());
  const ProgramResult result = Convert();
  EXPECT_EQ(1, result.exitCode);
  EXPECT_THAT(result.err, HasSubstr("No space left"));
  EXPECT_GT(FileSize("/tmp/out/xl.jpg"), 1000);
  EXPECT_EQ(0, FileSize("/tmp/out/s.jpg"));
  EXPECT_EQ(0U, volume.Available());
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
  EXPECT_EQ(0, result.exitCode) << result.err;
  EXPECT_EQ("RGBY", QuadrantLetters("/tmp/out/s.jpg"));
  EXPECT_EQ(1U, stub.Calls().size());
  EXPECT_NE(0, RunProgram(kConverterPath, {"/tmp/missing.jpg", "/tmp/out/s.jpg"}).exitCode);
}

TEST_F(StubToolTest, RunsAnotherProgram) {
  const StubTool stub(kConverterPath);
  stub.Plan(StubPlan().Run("/bin/sh", {"-c", "echo ran; exit 6"}));
  const ProgramResult result = Convert();
  EXPECT_EQ("ran\n", result.out);
  EXPECT_EQ(6, result.exitCode);
}

TEST_F(StubToolTest, ClosesItsOutputBeforeItsEnd) {
  const StubTool stub(kDcrawPath);
  stub.Plan(StubPlan().Print("x").CloseOutput().Print("y"));
  EXPECT_EQ("x", RunProgram(kDcrawPath, {}).out);
}

TEST_F(StubToolTest, EventsOfAllToolsAreInOneOrder) {
  const StubTool converter(kConverterPath);
  const StubTool comparer(kComparePath);
  RunProgram(kComparePath, {"a"});
  const uint64_t between = NextSequence();
  Convert();
  RunProgram(kComparePath, {"b"});
  const std::vector<StubCall> calls = AllStubCalls();
  ASSERT_EQ(3U, calls.size());
  EXPECT_EQ("compare", calls[0].tool);
  EXPECT_LT(calls[0].endSequence, between);
  EXPECT_EQ("convert-thumb", calls[1].tool);
  EXPECT_GT(calls[1].startSequence, between);
  EXPECT_EQ(2, calls[2].number);
  EXPECT_EQ(2U, comparer.Calls().size());
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
    EXPECT_EQ(0, program.Wait()->exitCode);
  }
  std::vector<int> numbers;
  for (const StubCall& call : stub.Calls()) {
    numbers.push_back(call.number);
    EXPECT_NE(0U, call.endSequence);
  }
  std::sort(numbers.begin(), numbers.end());
  ASSERT_EQ(static_cast<size_t>(kPrograms), numbers.size());
  EXPECT_EQ(1, numbers.front());
  EXPECT_EQ(kPrograms, numbers.back());
}

TEST_F(StubToolTest, PlanThatCannotBeFollowedIsReported) {
  const StubTool stub(kConverterPath);
  stub.Plan(StubPlan().Remove("/tmp/missing"));
  EXPECT_EQ(125, Convert().exitCode);
  const std::string record = ReadFile("/usr/vela/stub/record");
  EXPECT_THAT(record, HasSubstr("remove /tmp/missing: No such file"));
}

TEST_F(StubToolTest, RealToolsAreInstalled) {
  InstallRealTools();
  JpegRecipe recipe;
  recipe.orientation = 6;
  MakeJpeg(kPhoto, recipe);
  EXPECT_EQ(0, RunProgram(kConverterPath, {kPhoto, "/tmp/out/a.png"}).exitCode);
  EXPECT_EQ("PNG", Identify("/tmp/out/a.png").format);
  EXPECT_EQ("Orientation: Rotate 90 CW\n",
            RunProgram(kExiftoolPath, {"-S", "-Orientation", kPhoto}).out);
  EXPECT_THAT(RunProgram(kComparePath, {"-metric", "MAE", kPhoto, kPhoto, "null:"}).err,
              HasSubstr("0 (0)"));
  EXPECT_THAT(RunProgram(kDcrawPath, {}).out, HasSubstr("dcraw"));
  EXPECT_EQ(0, RunProgram("/usr/bin/ffmpeg", {"-version"}).exitCode);
}

TEST_F(StubToolTest, ToolsCanBeRemoved) {
  RemoveTool(kDcrawPath);
  EXPECT_EQ(ENOENT, RunProgram(kDcrawPath, {}).startError);
}

}  // namespace
}  // namespace vela_test
