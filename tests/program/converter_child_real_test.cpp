// What the converter inherits from the program.
#include <fcntl.h>
#include <unistd.h>
#include <algorithm>

#include <climits>
#include <thread>

#include "program/real_program_test.h"

namespace vela_test::real {

namespace {

using ConverterChild = RealProgramTest;

/// The target of a link in /proc; empty when it no longer exists.
std::string LinkTarget(const std::string& path) {
  char target[PATH_MAX];
  const ssize_t length = readlink(path.c_str(), target, sizeof target);
  return length > 0 ? std::string(target, static_cast<size_t>(length)) : std::string();
}

std::string ExecutableOf(pid_t pid) {
  return LinkTarget("/proc/" + std::to_string(pid) + "/exe");
}

/// The targets of the descriptors of a process; empty when it has ended.
Strings DescriptorTargets(pid_t pid) {
  Strings targets;
  const std::string directory = "/proc/" + std::to_string(pid) + "/fd";
  for (const std::string& number : ListDirectory(directory)) {
    const std::string target = LinkTarget(directory + "/" + number);
    if (!target.empty()) {
      targets.push_back(target);
    }
  }
  return targets;
}

/// The running converters. A child that has not called exec yet still is the program; the pause
/// allows for a child that is just calling it.
std::vector<pid_t> RunningConverters(const Program& program) {
  std::vector<pid_t> converters;
  for (const pid_t pid : ProcessesNamed("convert-thumb")) {
    const std::string executable = ExecutableOf(pid);
    if (!executable.empty() && executable != ExecutableOf(program.Pid())) {
      converters.push_back(pid);
    }
  }
  std::this_thread::sleep_for(std::chrono::milliseconds(1));
  return converters;
}

/// Whether a converter opens this file itself: the photo and its outputs, libraries, settings and
/// files that all processes open, its connection to the system log, and the pipes of a converter
/// that is a script.
bool IsTheConvertersOwn(const std::string& target, const Strings& ofTheProgram) {
  if (target.compare(0, 5, "pipe:") == 0 || target.compare(0, 7, "socket:") == 0) {
    return std::find(ofTheProgram.begin(), ofTheProgram.end(), target) == ofTheProgram.end();
  }
  if (target.compare(0, 1, "/") != 0) {
    return target == "anon_inode:[landlock-ruleset]";  // while it sets up its own sandbox
  }
  const std::string end = "/@eaDir";
  const bool isLock = target.size() >= end.size() &&
                      target.compare(target.size() - end.size(), end.size(), end) == 0;
  return !isLock && target.compare(0, 4, "/var") != 0 && target != kProfiles;
}

}  // namespace

TEST_F(ConverterChild, HasTheStandardDescriptorsOnly) {
  DaemonPeer daemon;
  const StubTool converter(kConverterPath);
  converter.Plan(StubPlan().PassThrough(RealConverterPath()));
  MakeJpeg(InPhotos("a.jpg"));
  WriteFile(InPhotos("b.jpg"), "no photo");
  MakeJpeg(InPhotos("c.jpg"));
  Make({"R:" + std::string(kPhotos)});
  Make();
  const std::vector<StubCall> calls = converter.Calls();
  ASSERT_EQ(calls.size(), 2U + 1U + 2U + 1U + 1U + 1U);
  for (const StubCall& call : calls) {
    ASSERT_EQ(call.descriptors.size(), 3U) << "call " << call.number;
    for (int i = 0; i < 3; ++i) {
      const OpenDescriptor& descriptor = call.descriptors[static_cast<size_t>(i)];
      EXPECT_EQ(descriptor.number, i);
      EXPECT_EQ(descriptor.target, "/dev/null");
    }
    EXPECT_EQ(call.blockedSignals, std::vector<int>());
    EXPECT_EQ(call.ignoredSignals, std::vector<int>());
  }
}

// Descriptors that the program itself inherited are not passed on.
TEST_F(ConverterChild, HasNoneOfTheCallersDescriptors) {
  const StubTool converter(kConverterPath);
  converter.Plan(StubPlan().PassThrough(RealConverterPath()));
  const std::string photo = MakeJpeg(InPhotos("a.jpg"));
  const int file = open(photo.c_str(), O_RDONLY);
  ASSERT_GE(file, 3);
  ProgramOptions options;
  options.keptDescriptors = {file};
  Make({kPhotos}, options);
  close(file);
  for (const StubCall& call : converter.Calls()) {
    EXPECT_EQ(call.descriptors.size(), 3U);
  }
  EXPECT_TRUE(HasThumbs(photo, OfPhase(kinds_, 1)));
}

TEST_F(ConverterChild, StandardDescriptorsAreOpenWhenTheCallerClosedThem) {
  const StubTool converter(kConverterPath);
  converter.Plan(StubPlan().PassThrough(RealConverterPath()));
  const std::string photo = MakeJpeg(InPhotos("a.jpg"));
  ProgramOptions options;
  options.closeInput = true;
  options.closeOutput = true;
  options.closeError = true;
  Make({kPhotos}, options);
  ASSERT_FALSE(converter.Calls().empty());
  for (const StubCall& call : converter.Calls()) {
    EXPECT_EQ(call.descriptors.size(), 3U);
  }
  EXPECT_TRUE(HasThumbs(photo, OfPhase(kinds_, 1)));
}

// The real converter, inspected from outside while it is running.
TEST_F(ConverterChild, RealConverterInheritsNoDescriptorOfTheProgram) {
  JpegRecipe recipe = RecipeOf(2400, 1800);
  for (int i = 0; i < 3; ++i) {
    MakeJpeg(InPhotos(std::to_string(i) + ".jpg"), recipe);
  }
  Program program = StartProgram(VelathumbPath(), {kProfiles, kPhotos});
  int looks = 0;
  while (!program.Wait(std::chrono::milliseconds(0))) {
    for (const pid_t pid : RunningConverters(program)) {
      const Strings ofTheProgram = DescriptorTargets(program.Pid());
      const Strings targets = DescriptorTargets(pid);
      looks += targets.empty() ? 0 : 1;
      for (const std::string& target : targets) {
        EXPECT_TRUE(IsTheConvertersOwn(target, ofTheProgram)) << target;
      }
    }
  }
  EXPECT_EQ(program.Wait()->exitCode, 0);
  EXPECT_GT(looks, 3);
}

}  // namespace vela_test::real
