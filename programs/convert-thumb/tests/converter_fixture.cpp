#include "converter_fixture.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <optional>
#include <sstream>
#include <utility>

#include "support/stub_tool.h"

namespace vela_test {
namespace {

constexpr char kHiddenImageMagick[] = "/usr/bin/away";

/// Returns the root mean square error of two pictures of the same size, 1 for black and white. What
/// the program prints for "PSNR" depends on its version.
double RelativeError(const std::string& one, const std::string& other) {
  const ProgramResult result =
      RunProgram("/usr/bin/compare", {"-metric", "RMSE", one, other, "null:"});
  const size_t parenthesis = result.err.find('(');
  if (parenthesis == std::string::npos) {
    ADD_FAILURE() << result.err;
    return 1;
  }
  return std::strtod(result.err.c_str() + parenthesis + 1, nullptr);
}

double Decibels(double error) {
  constexpr double kSame = 1000;
  return error > 0 ? -20 * std::log10(error) : kSame;
}

struct PixelCounts {
  int width = 0;
  int height = 0;
};

/// A source as ImageMagick sees it.
struct SourcePicture {
  PixelCounts size;
  bool isTurned = false;  ///< by a quarter, to be upright
};

std::optional<SourcePicture> LookAt(const std::string& source) {
  const ProgramResult result =
      RunProgram("/usr/bin/identify", {"-format", "%w %h %[orientation]\n", source});
  std::istringstream fields(result.out);
  SourcePicture picture;
  std::string orientation;
  if (result.exitCode != 0 || !(fields >> picture.size.width >> picture.size.height)) {
    return std::nullopt;
  }
  fields >> orientation;
  picture.isTurned = orientation == "LeftTop" || orientation == "RightTop" ||
                     orientation == "RightBottom" || orientation == "LeftBottom";
  return picture;
}

/// The size of a thumbnail: the scale is that of one side, and nothing is enlarged.
PixelCounts Scaled(const PixelCounts& from, const ThumbOptions& options) {
  const double horizontal = static_cast<double>(options.width) / from.width;
  const double vertical = static_cast<double>(options.height) / from.height;
  const double scale =
      options.fill ? std::max(horizontal, vertical) : std::min(horizontal, vertical);
  if (scale >= 1) {
    return from;
  }
  const auto side = [scale](int pixels) {
    return std::max(1, static_cast<int>(std::floor(pixels * scale + 0.5)));
  };
  return {side(from.width), side(from.height)};
}

std::string SizeText(int width, int height) {
  return std::to_string(width) + "x" + std::to_string(height);
}

std::string ExactSize(int width, int height) {
  return SizeText(width, height) + "!";
}

/// "-thumbnail" of ImageMagick 6 in other words; it leaves an opaque alpha channel behind.
std::vector<std::string> ScalingTo(const PixelCounts& to, const PixelCounts& from) {
  constexpr double kMuchSmaller = 0.1;
  constexpr int kGrid = 5;
  constexpr int kLeastSide = 26;
  const double area = static_cast<double>(to.width) * to.height / from.width / from.height;
  std::vector<std::string> words;
  if (area <= kMuchSmaller && to.width >= kLeastSide && to.height >= kLeastSide) {
    words = {"-sample", ExactSize(kGrid * to.width, kGrid * to.height)};
  }
  for (const std::string& word : {std::string("-resize"), ExactSize(to.width, to.height),
                                  std::string("-alpha"), std::string("set"), std::string("+repage"),
                                  std::string("+profile"), std::string("!icc,!icm,*")}) {
    words.push_back(word);
  }
  return words;
}

/// ImageMagick's drawing of one picture takes longer than its conversion. A larger one repeats it.
constexpr int kLargestDrawing = 2000;
constexpr int kRepetitions = 4;  // in each direction

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
  likeness.decibels = Decibels(RelativeError(one, other));
  return likeness;
}

std::vector<std::string> ReferenceArguments(const CommandLine& line) {
  const std::optional<SourcePicture> source =
      vela::kImageMagickVersion > 6 ? LookAt(line.source) : std::nullopt;
  if (!source) {
    return line.Arguments();
  }
  PixelCounts from = source->size;
  std::vector<std::vector<std::string>> scaling;
  for (const ThumbOutput& output : line.outputs) {
    const ThumbOptions& options = output.options;
    PixelCounts to = Scaled(from, options);
    scaling.push_back(ScalingTo(to, from));
    if (scaling.size() == 1) {  // the others are made from the first one
      if ((options.autoOrient && source->isTurned) != (options.rotate % 180 != 0)) {
        std::swap(to.width, to.height);
      }
      from = to;
    }
  }
  return line.Arguments(scaling);
}

ProgramResult RunReference(const CommandLine& line, const std::string& lastOutputOfConverter) {
  ProgramResult result = RunProgram(kImageMagick, line.Arguments());
  const std::string& last = line.outputs.back().path;
  const bool isSame = Exists(last) && Exists(lastOutputOfConverter) &&
                      ReadFile(last) == ReadFile(lastOutputOfConverter);
  if (vela::kImageMagickVersion > 6 && !isSame) {
    result = RunProgram(kImageMagick, ReferenceArguments(line));
  }
  return result;
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
  ExpectSuccess(RunReference(Line(source, outputs, "theirs"),
                             OutputPath(directory_ + "/ours", outputs.size() - 1)));
  CompareOutputs(source, outputs, leastMean, least);
}

void ConverterTest::ExpectOwnPictures(const std::string& source,
                                      const std::vector<ThumbOptions>& outputs, double leastMean,
                                      double least) const {
  ExpectSuccess(RunProgram(kImageMagick, ReferenceArguments(Line(source, outputs, "theirs"))));
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
      RunProgram(kImageMagick, ReferenceArguments(Line(source, outputs, "theirs")));
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
