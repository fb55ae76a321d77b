#include "converter_fixture.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstdlib>

#include "support/stub_tool.h"

namespace vela_test {
namespace {

constexpr char kHiddenImageMagick[] = "/usr/bin/away";

/// ImageMagick's drawing of one picture takes longer than its conversion. A larger one repeats it.
constexpr int kLargestDrawing = 2000;
constexpr int kRepetitions = 4;  // in each direction

std::string SizeText(int width, int height) {
  return std::to_string(width) + "x" + std::to_string(height);
}

std::string OutputPath(const std::string& prefix, size_t place) {
  return prefix + std::to_string(place) + ".jpg";
}

/// ImageMagick's arguments that draw a picture.
std::vector<std::string> Drawing(int width, int height) {
  const bool isRepeated = std::max(width, height) > kLargestDrawing;
  const int parts = isRepeated ? kRepetitions : 1;
  std::vector<std::string> arguments = {
      "-seed", "20", "-size", SizeText(width / parts, height / parts), "plasma:sienna-steelblue"};
  if (isRepeated) {
    const std::string whole = SizeText(width, height);
    for (const char* argument :
         {"-write", "mpr:tile", "+delete", "-size", whole.c_str(), "tile:mpr:tile"}) {
      arguments.emplace_back(argument);
    }
  }
  return arguments;
}

}  // namespace

std::string ConvertThumbPath() {
  return BuiltPath(CONVERT_THUMB_FILE);
}

Likeness Compare(const std::string& one, const std::string& other) {
  const ImageIdentity first = Identify(one);
  const ImageIdentity second = Identify(other);
  Likeness likeness;
  likeness.sameSize =
      first.width > 0 && first.width == second.width && first.height == second.height;
  if (!likeness.sameSize) {
    return likeness;
  }
  const ProgramResult result =
      RunProgram("/usr/bin/compare-im6.q16", {"-metric", "PSNR", one, other, "null:"});
  if (result.err.compare(0, 3, "inf") == 0) {
    likeness.decibels = 1000;
  } else {
    likeness.decibels = std::strtod(result.err.c_str(), nullptr);
  }
  return likeness;
}

BeforeExec SetSignals(const std::vector<int>& signals, void (*action)(int)) {
  return [signals, action] {
    for (const int signal : signals) {
      if (std::signal(signal, action) == SIG_ERR) {
        return errno;
      }
    }
    return 0;
  };
}

BeforeExec BreakErrorPipe() {
  return [] {
    int ends[2];
    if (pipe2(ends, O_CLOEXEC) != 0 || dup2(ends[1], STDERR_FILENO) < 0) {
      return errno;
    }
    return 0;
  };
}

void SetMemoryLimit(const std::string& limit) {
  WriteFile("/etc/velainfo.conf", "convert_memory_limit=\"" + limit + "\"\n");
}

ProgramResult RunConverter(const std::vector<std::string>& arguments,
                           const ProgramOptions& options) {
  return RunProgram(ConvertThumbPath(), arguments, options);
}

void ExpectSuccess(const ProgramResult& result) {
  EXPECT_EQ(result.exitCode, 0) << result.err;
}

WithoutImageMagick::WithoutImageMagick() {
  EXPECT_EQ(std::rename(kImageMagick, kHiddenImageMagick), 0);
}

WithoutImageMagick::~WithoutImageMagick() {
  EXPECT_EQ(std::rename(kHiddenImageMagick, kImageMagick), 0);
}

void ConverterTest::SetUp() {
  SandboxTest::SetUp();
  InstallImageMagickPolicy();
  MakeDirectories(directory_);
  ASSERT_EQ(chmod(directory_.c_str(), 0755), 0);
}

std::string ConverterTest::MakePhoto(const std::string& name, int width, int height,
                                     const std::vector<std::string>& options) const {
  return MakePicture("jpg:" + name, width, height, options);
}

std::string ConverterTest::MakePicture(const std::string& name, int width, int height,
                                       const std::vector<std::string>& options) const {
  const size_t colon = name.find(':');
  const std::string prefix = colon == std::string::npos ? "" : name.substr(0, colon + 1);
  const std::string path = directory_ + "/" + name.substr(prefix.size());
  std::vector<std::string> arguments = Drawing(width, height);
  arguments.insert(arguments.end(), options.begin(), options.end());
  arguments.push_back(prefix + path);
  const ProgramResult made = RunProgram(kImageMagick, arguments);
  EXPECT_EQ(made.exitCode, 0) << made.err;
  return path;
}

ProgramResult ConverterTest::Convert(const std::string& source,
                                     const std::vector<ThumbOptions>& outputs,
                                     const ProgramOptions& options) const {
  return RunConverter(Line(source, outputs, "ours").Arguments(), options);
}

CommandLine ConverterTest::Line(const std::string& source, const std::vector<ThumbOptions>& outputs,
                                const std::string& prefix) const {
  CommandLine line;
  line.source = source;
  line.scratchDirectory = directory_;
  for (size_t i = 0; i < outputs.size(); ++i) {
    line.outputs.push_back({outputs[i], OutputPath(directory_ + "/" + prefix, i)});
  }
  return line;
}

void ConverterTest::ExpectSamePictures(const std::string& source,
                                       const std::vector<ThumbOptions>& outputs, double leastMean,
                                       double least) const {
  ExpectSuccess(Convert(source, outputs));
  ExpectSuccess(RunProgram(kImageMagick, Line(source, outputs, "theirs").Arguments()));
  CompareOutputs(source, outputs, leastMean, least);
}

void ConverterTest::ExpectOwnPictures(const std::string& source,
                                      const std::vector<ThumbOptions>& outputs, double leastMean,
                                      double least) const {
  ExpectSuccess(RunProgram(kImageMagick, Line(source, outputs, "theirs").Arguments()));
  {
    const WithoutImageMagick without;
    ExpectSuccess(Convert(source, outputs));
  }
  CompareOutputs(source, outputs, leastMean, least);
}

void ConverterTest::ExpectHandedOver(const std::string& source,
                                     const std::vector<ThumbOptions>& outputs) const {
  ExpectSuccess(Convert(source, outputs));
  const WithoutImageMagick without;
  EXPECT_EQ(Convert(source, outputs).exitCode, 1) << source;
}

void ConverterTest::CompareOutputs(const std::string& source,
                                   const std::vector<ThumbOptions>& outputs, double leastMean,
                                   double least) const {
  double sum = 0;
  for (size_t i = 0; i < outputs.size(); ++i) {
    const std::string ours = OutputPath(directory_ + "/ours", i);
    const std::string theirs = OutputPath(directory_ + "/theirs", i);
    EXPECT_TRUE(IsWholeJpeg(ours));
    const Likeness likeness = Compare(ours, theirs);
    EXPECT_TRUE(likeness.sameSize) << i;
    EXPECT_GE(likeness.decibels, least) << source << " " << outputs[i].width;
    EXPECT_EQ(ReadJpegMetadata(ours).icc, ReadJpegMetadata(theirs).icc);
    sum += likeness.decibels;
  }
  EXPECT_GE(sum / static_cast<double>(outputs.size()), leastMean) << source;
}

void ConverterTest::ExpectSameVerdict(const std::string& source,
                                      const std::vector<ThumbOptions>& outputs) const {
  const ProgramResult ours = Convert(source, outputs);
  const ProgramResult theirs =
      RunProgram(kImageMagick, Line(source, outputs, "theirs").Arguments());
  EXPECT_EQ(ours.exitCode, theirs.exitCode) << source << ": " << ours.err << theirs.err;
}

ThumbOptions Square(int side) {
  ThumbOptions options;
  options.width = side;
  options.height = side;
  return options;
}

std::vector<ThumbOptions> UsualOutputs() {
  std::vector<ThumbOptions> outputs;
  for (const int side : {1280, 640, 320, 120}) {
    ThumbOptions options = Square(side);
    options.flatten = true;
    options.unsharp = "0x0.6+0.7+0.01";
    outputs.push_back(options);
  }
  outputs.front().quality = 90;
  return outputs;
}

}  // namespace vela_test
