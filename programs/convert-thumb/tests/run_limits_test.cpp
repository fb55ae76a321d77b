// The limits of a run, and how it ends when it reaches them.

#include <fcntl.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <csignal>
#include <functional>
#include <thread>
#include <vector>

#include "converter_fixture.h"
#include "imagemagick/image_magick_limits.h"
#include "posix/file_descriptor.h"
#include "process/output_file.h"
#include "process/resource_limits.h"
#include "process/unfinished_outputs.h"
#include "support/stub_tool.h"

using namespace vela;

namespace vela_test {
namespace {

using namespace ::testing;

constexpr size_t kMebibyte = size_t{1} << 20;

/// The exit status of a separate process that does `work`; -1 when a signal ended it.
int StatusOf(const std::function<int()>& work) {
  const pid_t child = fork();
  if (child == 0) {
    _exit(work());
  }
  int status = 0;
  EXPECT_EQ(waitpid(child, &status, 0), child);
  return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

rlimit LimitOf(int resource) {
  rlimit limit = {};
  getrlimit(static_cast<__rlimit_resource>(resource), &limit);
  return limit;
}

class RunLimits : public ConverterTest {};

TEST_F(RunLimits, AreReadFromTheSystemSettings) {
  SetMemoryLimit("100000000");
  EXPECT_EQ(ConversionMemoryLimit(), 100000000U);
  for (const char* text : {"300M", "300m", "307200K", "307200k"}) {
    SetMemoryLimit(text);
    EXPECT_EQ(ConversionMemoryLimit(), 300 * kMebibyte) << text;
  }
  SetMemoryLimit("2G");
  EXPECT_EQ(ConversionMemoryLimit(), 2048 * kMebibyte);
}

TEST_F(RunLimits, HaveADefault) {
  ::testing::internal::CaptureStderr();
  EXPECT_EQ(ConversionMemoryLimit(), 512 * kMebibyte);
  SetMemoryLimit("");
  EXPECT_EQ(ConversionMemoryLimit(), 512 * kMebibyte);
  EXPECT_EQ(::testing::internal::GetCapturedStderr(), "");
}

TEST_F(RunLimits, AreReportedWhenInvalid) {
  for (const char* text : {"0", "0M", "-1", "many", "M", "1e9", "512MiB", "512 M", "1.5G", "10T",
                           "99999999999999999999", "99999999999G"}) {
    SetMemoryLimit(text);
    ::testing::internal::CaptureStderr();
    EXPECT_EQ(ConversionMemoryLimit(), 512 * kMebibyte) << text;
    EXPECT_EQ(::testing::internal::GetCapturedStderr(),
              "convert-thumb: /etc/velainfo.conf: convert_memory_limit is not a number of bytes, "
              "using 536870912\n")
        << text;
  }
}

#ifndef __SANITIZE_ADDRESS__
TEST_F(RunLimits, HoldForTheWholeProcess) {
  EXPECT_EQ(StatusOf([] {
              LimitResources(100 * kMebibyte);
              const rlim_t limit = LimitOf(RLIMIT_DATA).rlim_max;
              return limit == LimitOf(RLIMIT_DATA).rlim_cur && limit > 100 * kMebibyte + kBaseMemory
                         ? static_cast<int>((limit - 100 * kMebibyte - kBaseMemory) % kStackMemory)
                         : 1;
            }),
            0);
  EXPECT_EQ(StatusOf([] {
              LimitResources(100 * kMebibyte);
              std::vector<char> fits(90 * kMebibyte);
              try {
                std::vector<char> tooMuch(4000 * kMebibyte);
              } catch (const std::bad_alloc&) {
                return 0;
              }
              return 1;
            }),
            0);
}

TEST_F(RunLimits, DoNotWrapAround) {
  EXPECT_EQ(StatusOf([] {
              LimitResources(static_cast<size_t>(-1));
              return LimitOf(RLIMIT_DATA).rlim_cur > 4000 * kMebibyte ? 0 : 1;
            }),
            0);
}
#endif

TEST_F(RunLimits, AreNeverRaised) {
  EXPECT_EQ(StatusOf([] {
              const rlimit low = {20, 30};
              setrlimit(RLIMIT_CPU, &low);
              LimitResources(100 * kMebibyte);
              const rlimit limit = LimitOf(RLIMIT_CPU);
              return limit.rlim_cur == 20 && limit.rlim_max == 30 ? 0 : 1;
            }),
            0);
}

TEST_F(RunLimits, EndAnEndlessRun) {
  EXPECT_EQ(StatusOf([] {
              LimitResources(100 * kMebibyte);
              const rlimit limit = LimitOf(RLIMIT_CPU);
              return limit.rlim_cur == kMaxProcessorSeconds && limit.rlim_max > limit.rlim_cur &&
                             limit.rlim_max < 2 * kMaxProcessorSeconds
                         ? 0
                         : 1;
            }),
            0);
}

TEST_F(RunLimits, EndCleanly) {
  for (const int signal : {SIGABRT, SIGTRAP, SIGBUS, SIGXCPU}) {
    const std::string one = directory_ + "/one.jpg";
    const std::string two = directory_ + "/two.jpg";
    const std::string other = directory_ + "/other.jpg";
    WriteFile(other, "part");
    EXPECT_EQ(StatusOf([&] {
                CleanUpOnFatalSignals();
                std::thread([&] { OpenForWriting(one); }).join();
                OpenForWriting(two);
                raise(signal);
                return 0;
              }),
              1)
        << signal;
    EXPECT_EQ(ListDirectory(directory_), std::vector<std::string>{"other.jpg"}) << signal;
  }
}

TEST_F(RunLimits, LeaveNoOutputsOfAFailedRun) {
  ProgramOptions withoutReader;
  withoutReader.beforeExec = {SetSignals({SIGPIPE}, SIG_DFL), BreakErrorPipe()};
  CommandLine line = Line(MakePhoto("a.jpg", 700, 500), UsualOutputs(), "ours");
  line.outputs.back().path = directory_ + "/missing/a.jpg";
  for (const ProgramOptions& options : {ProgramOptions(), withoutReader}) {
    EXPECT_EQ(RunConverter(line.Arguments(), options).exitCode, 1);
    EXPECT_EQ(ListDirectory(directory_), std::vector<std::string>{"a.jpg"});
  }
}

TEST_F(RunLimits, LeaveNoOutputsBeyondTheLargestFile) {
  const std::string photo = MakePhoto("a.jpg", 700, 500);
  ProgramOptions options;
  // The smallest thumbnail fits.
  options.beforeExec = {SetSignals({SIGXFSZ}, SIG_DFL), LimitResource(RLIMIT_FSIZE, 20000)};
  const ProgramResult result = Convert(photo, UsualOutputs(), options);
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(ListDirectory(directory_), std::vector<std::string>{"a.jpg"});
}

TEST_F(RunLimits, AllowNoNewOutputOnceTheRunIsEnding) {
  const std::string path = directory_ + "/late.jpg";
  const unsigned char byte = 0;
  EXPECT_EQ(StatusOf([&] {
              RemoveOutputs();
              return WriteOutputFile(path, &byte, 1) ? 1 : 0;
            }),
            0);
  EXPECT_FALSE(Exists(path));
}

TEST_F(RunLimits, RemoveOnlyFilesOfTheRun) {
  const std::string refused = directory_ + "/refused.jpg";
  const std::string device = directory_ + "/device.jpg";
  const std::string exchanged = directory_ + "/exchanged.jpg";
  const std::string pipe = directory_ + "/pipe.jpg";
  WriteFile(directory_ + "/other.jpg", "content");
  ASSERT_EQ(link((directory_ + "/other.jpg").c_str(), refused.c_str()), 0);
  ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
  ASSERT_EQ(symlink("/dev/null", device.c_str()), 0);
  EXPECT_EQ(StatusOf([&] {
              for (const std::string& path : {refused, pipe, device, exchanged}) {
                OpenForWriting(path);
              }
              WriteFile(directory_ + "/new.jpg", "content");
              if (rename((directory_ + "/new.jpg").c_str(), exchanged.c_str()) != 0) {
                return 1;
              }
              RemoveOutputs();
              return 0;
            }),
            0);
  EXPECT_EQ(ListDirectory(directory_),
            (std::vector<std::string>{"device.jpg", "exchanged.jpg", "other.jpg", "pipe.jpg",
                                      "refused.jpg"}));
  EXPECT_EQ(ReadFile(exchanged), "content");
}

TEST_F(RunLimits, DoNotLetAPipeBlockTheRun) {
  const std::string photo = MakePhoto("a.jpg", 300, 200);
  const CommandLine line = Line(photo, {ThumbOptions()}, "pipe");
  const std::string pipe = line.outputs.front().path;
  ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
  ProgramOptions options;
  options.timeLimit = std::chrono::seconds(20);
  EXPECT_EQ(RunConverter(line.Arguments(), options).exitCode, 1);
  const FileDescriptor reader(open(pipe.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC));
  ASSERT_TRUE(reader.IsOpen());
  const ProgramResult result = RunConverter(line.Arguments(), options);
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.err, "convert-thumb: cannot write " + pipe + "\n");
  EXPECT_TRUE(Exists(pipe));
}

TEST_F(RunLimits, AllowOutputsToDevices) {
  const std::string photo = MakePhoto("a.jpg", 300, 200);
  const CommandLine line = Line(photo, {ThumbOptions()}, "device");
  const std::string device = line.outputs.front().path;
  ASSERT_EQ(symlink("/dev/null", device.c_str()), 0);
  ExpectSuccess(RunConverter(line.Arguments()));
  EXPECT_TRUE(Exists(device));
}

class ImageMagickLimits : public ConverterTest {
 protected:
  /// The limits in ImageMagick's environment, on memory and on mapped files, when `given` is added
  /// to the converter's. Nothing but ImageMagick can be run, so a program that prints variables has
  /// to take its place.
  static std::string Limits(const std::vector<std::string>& given) {
    return Variables({"MAGICK_MEMORY_LIMIT", "MAGICK_MAP_LIMIT"}, given).out;
  }

  static ProgramResult Variables(const std::vector<std::string>& names,
                                 const std::vector<std::string>& given,
                                 const std::vector<BeforeExec>& beforeExec = {}) {
    RemoveTool(kImageMagick);
    CopyFile("/usr/bin/printenv", kImageMagick);
    EXPECT_EQ(chmod(kImageMagick, 0755), 0);
    ProgramOptions options;
    options.addedEnvironment = given;
    options.beforeExec = beforeExec;
    return RunConverter(names, options);
  }
};

TEST_F(ImageMagickLimits, FollowTheMemoryLimit) {
  EXPECT_EQ(Limits({}), "268435456\n536870912\n");
  SetMemoryLimit("100000000");
  EXPECT_EQ(Limits({}), "50000000\n100000000\n");
}

TEST_F(ImageMagickLimits, StayWhenTheyAreLower) {
  for (const std::string low : {"64MiB", "64MB", "1000", "200m", "0.1GiB", "0"}) {
    EXPECT_EQ(Limits({"MAGICK_MEMORY_LIMIT=" + low}), low + "\n536870912\n");
  }
  for (const std::string high : {"1GiB", "1TB", "unlimited", "", "-1", "268435457", "300MB"}) {
    EXPECT_EQ(Limits({"MAGICK_MEMORY_LIMIT=" + high}), "268435456\n536870912\n") << high;
  }
}

#if !defined(__SANITIZE_ADDRESS__)
// A thread has a stack of 8 MB. AddressSanitizer itself needs more memory than the limit.
TEST_F(ImageMagickLimits, PermitNoThreadsWithLessMemoryThanTheConverterAllows) {
  const std::vector<std::string> name = {"OMP_THREAD_LIMIT"};
  EXPECT_EQ(Variables(name, {}).out, "");
  EXPECT_EQ(Variables(name, {"OMP_THREAD_LIMIT=9"}).out, "9\n");
  const std::vector<BeforeExec> little = {LimitResource(RLIMIT_DATA, 100 << 20)};
  EXPECT_EQ(Variables(name, {}, little).out, "1\n");
  EXPECT_EQ(Variables(name, {"OMP_THREAD_LIMIT=9"}, little).out, "1\n");
}
#endif

}  // namespace
}  // namespace vela_test
