// What the converter is started with, whatever the program was started with.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <unistd.h>

#include <string>
#include <vector>

#include "program/stub_program_test.h"
#include "support/files.h"
#include "support/system_log.h"

namespace vela_test {
namespace {

using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;

constexpr const char* kPhoto = "/tmp/photos/a.jpg";

/// "<number> <target>" of each descriptor, in the order of the numbers.
std::vector<std::string> DescriptorsOf(const StubCall& call) {
  std::vector<std::string> descriptors;
  for (const OpenDescriptor& descriptor : call.descriptors) {
    descriptors.push_back(std::to_string(descriptor.number) + " " + descriptor.target);
  }
  return descriptors;
}

class ConverterEnvironment : public StubProgramTest {
 protected:
  void SetUp() override {
    StubProgramTest::SetUp();
    MakePhoto(kPhoto);
  }

  /// Runs it; returns the converter's calls, of which there have to be two.
  std::vector<StubCall> RunAndGetCalls(const ProgramOptions& options = ProgramOptions()) const {
    EXPECT_EQ(0, Run({kPhotos}, options).exitCode);
    const auto calls = Converter().Calls();
    EXPECT_THAT(calls, SizeIs(2));
    EXPECT_TRUE(Exists(Thumb(kPhoto, "XL")));
    EXPECT_TRUE(Exists(Thumb(kPhoto, "B")));
    return calls;
  }
};

TEST_F(ConverterEnvironment, NoOutputReachesTheCaller) {
  Converter().Plan(StubPlan().Print("out").PrintError("error").WriteOutputs());
  EXPECT_GOOD_END(Run());
  EXPECT_TRUE(Exists(Thumb(kPhoto, "XL")));
}

TEST_F(ConverterEnvironment, MuchOutputBlocksNobody) {
  Converter().Plan(StubPlan()
                       .PrintRepeated("0123456789abcdef", 100000)
                       .PrintErrorRepeated("0123456789abcdef", 100000)
                       .WriteOutputs());
  EXPECT_GOOD_END(Run());
  EXPECT_TRUE(Exists(Thumb(kPhoto, "XL")));
}

TEST_F(ConverterEnvironment, HasStandardDescriptorsOnly) {
  for (const StubCall& call : RunAndGetCalls()) {
    EXPECT_THAT(DescriptorsOf(call), ElementsAre("0 /dev/null", "1 /dev/null", "2 /dev/null"));
  }
}

TEST_F(ConverterEnvironment, HasStandardDescriptorsOnlyWhateverTheCallerLeaks) {
  const int leaked = open("/tmp", O_RDONLY);
  ASSERT_EQ(9, dup2(leaked, 9));
  ProgramOptions options;
  options.keptDescriptors = {9};
  const auto calls = RunAndGetCalls(options);
  close(9);
  close(leaked);
  for (const StubCall& call : calls) {
    EXPECT_THAT(DescriptorsOf(call), ElementsAre("0 /dev/null", "1 /dev/null", "2 /dev/null"));
  }
}

/// Which standard descriptors are closed at the start: bit 0 input, 1 output, 2 error.
class ClosedDescriptors : public ConverterEnvironment, public ::testing::WithParamInterface<int> {};

TEST_P(ClosedDescriptors, NothingElseTakesTheirPlace) {
  ProgramOptions options;
  options.closeInput = (GetParam() & 1) != 0;
  options.closeOutput = (GetParam() & 2) != 0;
  options.closeError = (GetParam() & 4) != 0;
  for (const StubCall& call : RunAndGetCalls(options)) {
    EXPECT_THAT(DescriptorsOf(call), ElementsAre("0 /dev/null", "1 /dev/null", "2 /dev/null"));
  }
}

INSTANTIATE_TEST_SUITE_P(Sets, ClosedDescriptors, ::testing::Range(1, 8));

TEST_F(ConverterEnvironment, HasNoSignalsBlocked) {
  ProgramOptions options;
  options.beforeExec = {BlockSignal(SIGUSR1), BlockSignal(SIGPIPE)};
  for (const StubCall& call : RunAndGetCalls(options)) {
    EXPECT_THAT(call.blockedSignals, IsEmpty());
  }
}

TEST_F(ConverterEnvironment, HasNoSignalsIgnored) {
  ProgramOptions options;
  options.beforeExec = {IgnoreSignal(SIGCHLD), IgnoreSignal(SIGPIPE), IgnoreSignal(SIGHUP),
                        IgnoreSignal(SIGTERM)};
  for (const StubCall& call : RunAndGetCalls(options)) {
    EXPECT_THAT(call.ignoredSignals, IsEmpty());
  }
}

TEST_F(ConverterEnvironment, FailureIsNoticedWhenTheCallerIgnoresTheEndOfItsChildren) {
  Converter().Plan(StubPlan().WriteOutputs().Exit(1));
  ProgramOptions options;
  options.beforeExec = {IgnoreSignal(SIGCHLD)};
  EXPECT_GOOD_END(Run({kPhotos}, options));
  EXPECT_TRUE(Exists(Marker(kPhoto, "XL")));
}

TEST_F(ConverterEnvironment, HasNoMask) {
  ProgramOptions options;
  options.umask = 0077;
  for (const StubCall& call : RunAndGetCalls(options)) {
    EXPECT_EQ(0U, call.umask);
  }
}

TEST_F(ConverterEnvironment, HasTheCallersWorkingDirectory) {
  MakeDirectories("/tmp/here");
  ProgramOptions options;
  options.workingDirectory = "/tmp/here";
  for (const StubCall& call : RunAndGetCalls(options)) {
    EXPECT_EQ("/tmp/here", call.workingDirectory);
  }
}

TEST_F(ConverterEnvironment, IsStartedByItsFullNameWithoutShell) {
  Program program = Start();
  const pid_t pid = program.Pid();
  EXPECT_GOOD_END(*program.Wait());
  for (const StubCall& call : Converter().Calls()) {
    EXPECT_EQ(kConverterPath, call.path);
    EXPECT_EQ(kConverterPath, call.arguments.at(0));
    EXPECT_EQ(pid, call.parentPid);
  }
}

TEST_F(ConverterEnvironment, NoNameIsTakenForAnythingElse) {
  // What a shell would act on, and what the converter would expand in an output's name.
  const std::string photo = MakePhoto("/tmp/ph $(touch x);'\" %d/a %s b`.jpg");
  const DaemonPeer daemon;
  EXPECT_GOOD_END(Run({"/tmp/ph $(touch x);'\" %d"}));
  EXPECT_THAT(ConvertedSources(), ElementsAre(photo, Thumb(photo, "XL")));
  EXPECT_THAT(MetadataOf(photo), ElementsAre("VELAPHOTO_THUMB_B.jpg", "VELAPHOTO_THUMB_M.jpg",
                                             "VELAPHOTO_THUMB_XL.jpg"));
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(ConverterEnvironment, OneRunsAtATime) {
  MakePhoto("/tmp/photos/b.jpg");
  EXPECT_GOOD_END(Run());
  const auto calls = Converter().Calls();
  ASSERT_THAT(calls, SizeIs(4));
  for (size_t i = 1; i < calls.size(); ++i) {
    EXPECT_LT(calls[i - 1].endSequence, calls[i].startSequence);
  }
}

TEST_F(ConverterEnvironment, NoChildIsLeftBehind) {
  EXPECT_GOOD_END(Run());
  for (const StubCall& call : Converter().Calls()) {
    EXPECT_FALSE(Exists("/proc/" + std::to_string(call.pid)));
  }
}

}  // namespace
}  // namespace vela_test
