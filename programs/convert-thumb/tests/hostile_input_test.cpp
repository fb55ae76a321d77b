// Malicious files: every run ends by itself, within its memory limit, with either complete outputs
// or none.

#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <chrono>
#include <cstring>
#include <thread>

#include "converter_fixture.h"
#include "hostile_pictures.h"
#include "measured_run.h"
#include "process/resource_limits.h"

using namespace vela;

namespace vela_test {
namespace {

using namespace ::testing;

constexpr size_t kMemoryLimit = size_t{128} << 20;
constexpr uint32_t kHuge = 100000;

class HostileInput : public ConverterTest {
 protected:
  const std::string outputs_ = directory_ + "/outputs";

  void SetUp() override {
    ConverterTest::SetUp();
    MakeDirectories(outputs_);
    SetMemoryLimit(std::to_string(kMemoryLimit));
  }

  std::string MakeFile(const std::string& name, const std::string& content) const {
    WriteFile(directory_ + "/" + name, content);
    return directory_ + "/" + name;
  }

  CommandLine LineFor(const std::string& source) const {
    CommandLine line = Line(source, UsualOutputs(), "outputs/o");
    line.scratchDirectory = outputs_;
    return line;
  }

  static void ExpectWithinLimits(const std::string& source, const MeasuredRun& run) {
    EXPECT_FALSE(run.timedOut) << source;
// A sanitizer uses many times the limit for itself.
#ifndef __SANITIZE_ADDRESS__
    // The programs' code, and ImageMagick's picture files, which count as well while they are
    // mapped.
    constexpr size_t kFiles = (size_t{64} << 20) + kMemoryLimit;
    EXPECT_LT(run.peakMemory, kMemoryLimit + kBaseMemory + kFiles) << source;
#endif
  }

  /// Expects success with complete outputs, or status 1 without any.
  MeasuredRun ExpectHarmless(const std::string& source) const {
    ProgramOptions options;
    options.timeLimit = std::chrono::minutes(1);
    const CommandLine line = LineFor(source);
    const MeasuredRun run = RunMeasured(ConvertThumbPath(), line.Arguments(), options);
    ExpectWithinLimits(source, run);
    if (run.exitCode == 0) {
      for (const ThumbOutput& output : line.outputs) {
        EXPECT_TRUE(IsWholeJpeg(output.path)) << output.path;
      }
    } else {
      EXPECT_EQ(run.exitCode, 1) << source << ": " << run.error;
      EXPECT_NE(run.error, "") << source;
      EXPECT_THAT(ListDirectory(outputs_), IsEmpty()) << source;
    }
    RemoveTree(outputs_);
    MakeDirectories(outputs_);
    return run;
  }

  void ExpectRefused(const std::string& source) const {
    for (const char* page : {"", "[0]"}) {
      EXPECT_EQ(ExpectHarmless(source + page).exitCode, 1) << source + page;
    }
  }
};

struct Format {
  const char* file;
  std::string (*claim)(uint32_t width, uint32_t height);
  std::pair<uint32_t, uint32_t> huge;  ///< width and height, as large as the format allows
};

constexpr Format kFormats[] = {
    {"a.jpg", ClaimingJpeg, {65500, 65500}},  {"a.png", ClaimingPng, {kHuge, kHuge}},
    {"a.gif", ClaimingGif, {65535, 65535}},   {"a.tif", ClaimingTiff, {kHuge, kHuge}},
    {"a.webp", ClaimingWebp, {kHuge, 40000}}, {"a.ppm", ClaimingPpm, {kHuge, kHuge}},
    {"a.bmp", ClaimingBmp, {kHuge, kHuge}},   {"a.psd", ClaimingPsd, {kHuge, kHuge}},
};

TEST_F(HostileInput, ClaimsAHugePicture) {
  for (const Format& format : kFormats) {
    const auto& [width, height] = format.huge;
    ExpectRefused(MakeFile(format.file, format.claim(width, height)));
  }
}

TEST_F(HostileInput, ClaimsALargePictureThatIsAllowed) {
  constexpr uint32_t kLarge = 15000;
  for (const Format& format : kFormats) {
    ExpectHarmless(MakeFile(format.file, format.claim(kLarge, kLarge)));
  }
}

TEST_F(HostileInput, ClaimsASideOfZero) {
  for (const auto& [width, height] : {std::pair{0U, 1U}, {1U, 0U}, {0U, 0U}}) {
    for (const Format& format : kFormats) {
      ExpectHarmless(MakeFile(format.file, format.claim(width, height)));
    }
  }
}

TEST_F(HostileInput, HoldsFarMoreThanItsSize) {
  ExpectHarmless(MakeFile("a.png", BlackPng(12000, 12000)));
}

TEST_F(HostileInput, IsReadableWhenItsClaimsAreHarmless) {
  EXPECT_EQ(ExpectHarmless(MakeFile("a.png", BlackPng(300, 200))).exitCode, 0);
  EXPECT_EQ(ExpectHarmless(MakeFile("a.gif", LongGif(30, 20, 3)) + "[0]").exitCode, 0);
  EXPECT_EQ(ExpectHarmless(MakeFile("a.tif", ManyPagesTiff(1, 1)) + "[0]").exitCode, 0);
}

TEST_F(HostileInput, IsAnEndlessAnimation) {
  const std::string gif = MakeFile("a.gif", LongGif(100, 100, 2000));
  EXPECT_EQ(ExpectHarmless(gif + "[0]").exitCode, 0);
  ExpectHarmless(gif);
}

TEST_F(HostileInput, HasManyPages) {
  constexpr size_t kPages = 60000;
  ExpectHarmless(MakeFile("long.tif", ManyPagesTiff(kPages, kPages)) + "[0]");
  ExpectHarmless(MakeFile("circle.tif", ManyPagesTiff(kPages, 0)) + "[0]");
  ExpectHarmless(MakeFile("itself.tif", ManyPagesTiff(1, 0)));
  ExpectHarmless(MakeFile("two.tif", ManyPagesTiff(2, 0)));
  ExpectHarmless(MakeFile("nested.tif", NestedTiff(kPages)) + "[0]");
}

TEST_F(HostileInput, IsAVeryLongFileOfZeros) {
  constexpr off_t kSize = off_t{2000} << 20;
  for (const char* name : {"a.jpg", "a.png", "a.tif", "a.gif", "a.webp", "a.heic", "a.ppm"}) {
    const std::string path = MakeFile(name, "");
    ASSERT_EQ(truncate(path.c_str(), kSize), 0);
    ExpectRefused(path);
  }
}

TEST_F(HostileInput, IsAVeryLongFileAfterItsSignature) {
  constexpr off_t kSize = off_t{200} << 20;
  for (const std::string beginning : {"\xFF\xD8\xFF", "\x89PNG\r\n\x1a\n", "GIF89a", "II*"}) {
    const std::string path = MakeFile("a", beginning);
    ASSERT_EQ(truncate(path.c_str(), kSize), 0);
    ExpectRefused(path);
  }
}

TEST_F(HostileInput, HasTooManyScans) {
  const std::string photo = ReadFile(MakePhoto("a.jpg", 400, 300, {"-interlace", "Plane"}));
  ExpectRefused(MakeFile("many.jpg", RepeatLastScan(photo, 2000)));
  ExpectHarmless(MakeFile("some.jpg", RepeatLastScan(photo, 100)));
}

void MakeSocket(const std::string& path) {
  const int descriptor = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
  sockaddr_un address = {};
  address.sun_family = AF_UNIX;
  std::strncpy(address.sun_path, path.c_str(), sizeof address.sun_path - 1);
  EXPECT_EQ(bind(descriptor, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
  close(descriptor);
}

TEST_F(HostileInput, IsNotAFile) {
  const std::string pipe = directory_ + "/pipe.jpg";
  ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
  const std::string socket = directory_ + "/socket.jpg";
  MakeSocket(socket);
  MakeDirectories(directory_ + "/directory.jpg");
  for (const std::string& source : {pipe, socket, directory_ + "/directory.jpg",
                                    std::string("/dev/zero"), std::string("/dev/null")}) {
    ExpectRefused(source);
  }
}

TEST_F(HostileInput, IsNotAFileToBeTurned) {
  const std::string pipe = directory_ + "/pipe.jpg";
  ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
  ProgramOptions options;
  options.timeLimit = std::chrono::minutes(1);
  EXPECT_EQ(RunConverter({"-rotate", "90", pipe, pipe}, options).exitCode, 1);
}

/// Truncates the source while it is being read, later in each run.
TEST_F(HostileInput, ShrinksWhileItIsRead) {
  constexpr int kRounds = 12;
  for (const char* name : {"a.jpg", "a.png", "a.tif", "a.ppm"}) {
    const std::string original = directory_ + "/original-" + name;
    const ProgramResult made =
        RunProgram(kImageMagick, {"-seed", "20", "-size", "1600x1200", "plasma:", original});
    ASSERT_EQ(made.exitCode, 0) << made.err;
    const CommandLine line = LineFor(directory_ + "/" + name);
    for (int round = 0; round < kRounds; ++round) {
      CopyFile(original, line.source);
      Program program = StartProgram(ConvertThumbPath(), line.Arguments());
      std::this_thread::sleep_for(std::chrono::milliseconds(4 * round));
      ASSERT_EQ(truncate(line.source.c_str(), 100), 0);
      const std::optional<ProgramResult> result = program.Wait();
      ASSERT_TRUE(result) << name;
      EXPECT_EQ(result->signal, 0) << name << " " << round << ": " << result->err;
    }
  }
}

#ifndef __SANITIZE_ADDRESS__
/// Runs with different amounts of memory, from too little to start to more than enough.
class ShortOfMemory : public HostileInput {
 protected:
  /// Runs the line with that many megabytes; a failed run leaves nothing.
  ProgramResult RunWith(uint64_t megabytes, const CommandLine& line) const {
    ProgramOptions options;
    options.beforeExec = {LimitResource(RLIMIT_DATA, megabytes << 20)};
    // ImageMagick would start that many threads, on a machine with any number of processors.
    options.addedEnvironment = {"OMP_NUM_THREADS=64"};
    // Version 7 may have to be ended because it does nothing.
    options.timeLimit = std::chrono::minutes(5);
    ProgramResult result = RunConverter(line.Arguments(), options);
    if (result.exitCode != 0) {
      EXPECT_THAT(ListDirectory(outputs_), IsEmpty()) << megabytes;
    }
    RemoveTree(outputs_);
    MakeDirectories(outputs_);
    return result;
  }

  /// Runs the line with `step` megabytes and 15 multiples of that. Each failing run has status 1
  /// and one line that starts with `message`; some but not all of them fail.
  void ExpectCleanFailures(const CommandLine& line, uint64_t step,
                           const std::string& message) const {
    constexpr int kRuns = 16;
    int failures = 0;
    for (int run = 1; run <= kRuns; ++run) {
      const ProgramResult result = RunWith(step * static_cast<uint64_t>(run), line);
      SCOPED_TRACE(std::to_string(run) + ": " + result.err);
      EXPECT_EQ(result.signal, 0);
      if (result.exitCode != 0) {
        ++failures;
        EXPECT_EQ(result.exitCode, 1);
        EXPECT_THAT(result.err, StartsWith(message));
        EXPECT_EQ(result.err.find('\n'), result.err.size() - 1);
      }
    }
    EXPECT_GT(failures, 2);
    EXPECT_LT(failures, kRuns);
  }

  CommandLine LargeLine(const std::string& photo) const {
    ThumbOptions large;
    large.width = 3000;
    large.height = 2000;
    return Line(photo, {large, ThumbOptions()}, "outputs/o");
  }
};

TEST_F(ShortOfMemory, EndsWithOneLine) {
  ExpectCleanFailures(LargeLine(MakePhoto("a.jpg", 3000, 2000)), 8, "convert-thumb: ");
}

TEST_F(ShortOfMemory, EndsCleanlyInLibraries) {
  const std::string photo = directory_ + "/a.png";
  const ProgramResult made =
      RunProgram(kImageMagick, {"-size", "1500x1000", "plasma:sienna-steelblue", photo});
  ASSERT_EQ(made.exitCode, 0) << made.err;
  ExpectCleanFailures(LargeLine(photo), 6, "");
}
#endif

}  // namespace
}  // namespace vela_test
