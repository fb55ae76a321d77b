// The environment of the converter, whatever that of the program is.
#include <fcntl.h>
#include <signal.h>
#include <unistd.h>

#include "program/stub_program_test.h"

namespace vela_test {
namespace {

/// Input, output and error are /dev/null, and nothing else is open.
void ExpectStandardDescriptorsOnly(const std::vector<StubCall>& calls) {
  for (const StubCall& call : calls) {
    Strings descriptors;
    for (const OpenDescriptor& descriptor : call.descriptors) {
      descriptors.push_back(std::to_string(descriptor.number) + " " + descriptor.target);
    }
    EXPECT_THAT(descriptors, ElementsAre("0 /dev/null", "1 /dev/null", "2 /dev/null"));
  }
}

class ConverterEnvironment : public OnePhotoTest {
 protected:
  /// Runs the program. Returns the converter's calls, which must be two.
  std::vector<StubCall> RunAndGetCalls(const ProgramOptions& options = ProgramOptions()) const {
    EXPECT_EQ(Run({kPhotos}, options).exitCode, 0);
    const auto calls = Converter().Calls();
    EXPECT_THAT(calls, SizeIs(2));
    EXPECT_TRUE(Exists(Thumb(kPhoto, "XL")));
    EXPECT_TRUE(Exists(Thumb(kPhoto, "B")));
    return calls;
  }
};

TEST_F(ConverterEnvironment, NoOutputReachesTheCaller) {
  Converter().Plan(StubPlan().Print("out").PrintError("error").WriteOutputs());
  EXPECT_SUCCESS(Run());
  EXPECT_TRUE(Exists(Thumb(kPhoto, "XL")));
}

TEST_F(ConverterEnvironment, MuchOutputDoesNotBlock) {
  Converter().Plan(StubPlan()
                       .PrintRepeated("0123456789abcdef", 100000)
                       .PrintErrorRepeated("0123456789abcdef", 100000)
                       .WriteOutputs());
  EXPECT_SUCCESS(Run());
  EXPECT_TRUE(Exists(Thumb(kPhoto, "XL")));
}

TEST_F(ConverterEnvironment, HasStandardDescriptorsOnlyWhateverTheCallerLeaks) {
  const int leaked = open("/tmp", O_RDONLY);
  ASSERT_EQ(dup2(leaked, 9), 9);
  ProgramOptions options;
  options.keptDescriptors = {9};
  const auto calls = RunAndGetCalls(options);
  close(9);
  close(leaked);
  ExpectStandardDescriptorsOnly(calls);
}

/// Which standard descriptors are closed at the start: bit 0 input, 1 output, 2 error.
class ClosedDescriptors : public ConverterEnvironment, public ::testing::WithParamInterface<int> {};

TEST_P(ClosedDescriptors, NothingElseTakesTheirPlace) {
  ProgramOptions options;
  options.closeInput = (GetParam() & 1) != 0;
  options.closeOutput = (GetParam() & 2) != 0;
  options.closeError = (GetParam() & 4) != 0;
  ExpectStandardDescriptorsOnly(RunAndGetCalls(options));
}

INSTANTIATE_TEST_SUITE_P(Sets, ClosedDescriptors, ::testing::Range(0, 8));

TEST_F(ConverterEnvironment, HasNoSignalsBlockedOrIgnored) {
  const ProgramOptions options =
      WithSteps({BlockSignal(SIGUSR1), BlockSignal(SIGPIPE), IgnoreSignal(SIGCHLD),
                 IgnoreSignal(SIGPIPE), IgnoreSignal(SIGHUP), IgnoreSignal(SIGTERM)});
  for (const StubCall& call : RunAndGetCalls(options)) {
    EXPECT_THAT(call.blockedSignals, IsEmpty());
    EXPECT_THAT(call.ignoredSignals, IsEmpty());
  }
}

TEST_F(ConverterEnvironment, FailureIsNoticedWhenTheCallerIgnoresTheEndOfItsChildren) {
  Converter().Plan(StubPlan().WriteOutputs().Exit(1));
  EXPECT_SUCCESS(Run({kPhotos}, WithSteps({IgnoreSignal(SIGCHLD)})));
  EXPECT_TRUE(Exists(Marker(kPhoto, "XL")));
}

TEST_F(ConverterEnvironment, HasNoUmaskButTheCallersWorkingDirectory) {
  MakeDirectories("/tmp/here");
  ProgramOptions options = InDirectory("/tmp/here");
  options.umask = 0077;
  for (const StubCall& call : RunAndGetCalls(options)) {
    EXPECT_EQ(call.umask, 0U);
    EXPECT_EQ(call.workingDirectory, "/tmp/here");
  }
}

TEST_F(ConverterEnvironment, IsStartedByItsFullNameWithoutShell) {
  Program program = Start();
  const pid_t pid = program.Pid();
  EXPECT_SUCCESS(*program.Wait());
  for (const StubCall& call : Converter().Calls()) {
    EXPECT_EQ(call.path, kConverterPath);
    EXPECT_EQ(call.arguments.at(0), kConverterPath);
    EXPECT_EQ(call.parentPid, pid);
  }
}

TEST_F(ConverterEnvironment, NamesAreNotInterpreted) {
  // Characters that a shell would interpret, and that the converter would expand in an output's
  // name.
  const std::string photo = MakePhoto("/tmp/ph $(touch x);'\" %d/a %s b`.jpg");
  RunWithDaemon({"/tmp/ph $(touch x);'\" %d"});
  EXPECT_THAT(ConvertedSources(), ElementsAre(photo, Thumb(photo, "XL")));
  EXPECT_EQ(MetadataOf(photo), kThumbsOfFirstRun);
  EXPECT_THAT(ErrorLines(), IsEmpty());
}

TEST_F(ConverterEnvironment, OneRunsAtATime) {
  MakePhoto("/tmp/photos/b.jpg");
  EXPECT_SUCCESS(Run());
  const auto calls = Converter().Calls();
  ASSERT_THAT(calls, SizeIs(4));
  for (size_t i = 1; i < calls.size(); ++i) {
    EXPECT_LT(calls[i - 1].endSequence, calls[i].startSequence);
  }
}

TEST_F(ConverterEnvironment, NoChildIsLeftBehind) {
  EXPECT_SUCCESS(Run());
  for (const StubCall& call : Converter().Calls()) {
    EXPECT_FALSE(Exists("/proc/" + std::to_string(call.pid)));
  }
}

}  // namespace
}  // namespace vela_test
