// Runs the converter and ImageMagick with the same command lines and compares their pictures.
#pragma once

#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "command_line.h"
#include "platform/installed_names.h"
#include "support/files.h"
#include "support/image_checks.h"
#include "support/images.h"
#include "support/program.h"
#include "support/sandbox.h"

namespace vela_test {

/// The converter under test.
std::string ConvertThumbPath();

/// ImageMagick's own program.
constexpr const char* kImageMagick = vela::kImageMagickProgram;

/// The arguments with which ImageMagick makes the pictures that the converter should make.
/// "-thumbnail" of version 7 samples, averages and scales in three steps; version 6 scales in one,
/// after sampling when the picture becomes much smaller, and so does the converter. Version 7 gets
/// the arguments for that.
std::vector<std::string> ReferenceArguments(const CommandLine& line);

/// Runs ImageMagick with those arguments. Where the converter has left the work to ImageMagick,
/// which shows in its last output, runs it with the line itself.
ProgramResult RunReference(const CommandLine& line, const std::string& lastOutputOfConverter);

/// Starts a program with these signals at their default (SIG_DFL) or ignored (SIG_IGN), regardless
/// of the test's own.
BeforeExec SetSignals(const std::vector<int>& signals, void (*action)(int));

/// Makes standard error a pipe without a reader.
BeforeExec BreakErrorPipe();

/// How similar two pictures are.
struct Likeness {
  bool sameSize = false;
  double decibels = 0;  ///< peak signal-to-noise ratio; 1000 for the same pixels
};
Likeness Compare(const std::string& one, const std::string& other);

/// Hides ImageMagick during its lifetime.
class WithoutImageMagick {
 public:
  WithoutImageMagick();
  ~WithoutImageMagick();
  WithoutImageMagick(const WithoutImageMagick&) = delete;
  WithoutImageMagick& operator=(const WithoutImageMagick&) = delete;
};

/// Sets the converter's memory limit, in the syntax of the setting.
void SetMemoryLimit(const std::string& limit);

/// Runs the converter with these arguments.
ProgramResult RunConverter(const std::vector<std::string>& arguments,
                           const ProgramOptions& options = ProgramOptions());

/// Fails the test unless the run ended with status 0.
void ExpectSuccess(const ProgramResult& result);

class ConverterTest : public SandboxTest {
 protected:
  /// Directory of sources and outputs. Nobody else can change it.
  const std::string directory_ = "/tmp/converter";
  void SetUp() override;

  /// Makes a photo-like JPEG: detail at every scale, the same for the same `options` and size.
  /// `options`: additional options of ImageMagick. Returns its path.
  std::string MakePhoto(const std::string& name, int width, int height,
                        const std::vector<std::string>& options = {}) const;

  /// The same picture in the format of the name's extension, or of `name`'s prefix ("png8:a.png").
  std::string MakePicture(const std::string& name, int width, int height,
                          const std::vector<std::string>& options = {}) const;

  /// Runs the converter with the line whose outputs are directory_/ours0.jpg and so on.
  ProgramResult Convert(const std::string& source,
                        const std::vector<ThumbOptions>& outputs = {ThumbOptions()},
                        const ProgramOptions& options = ProgramOptions()) const;

  /// The command line with its outputs in the given directory.
  CommandLine Line(const std::string& source, const std::vector<ThumbOptions>& outputs,
                   const std::string& prefix) const;

  /// Runs both with these outputs; expects success of both, the same sizes, and at least this
  /// similarity, on average and of each output.
  void ExpectSamePictures(const std::string& source, const std::vector<ThumbOptions>& outputs,
                          double leastMean = 40, double least = 36) const;

  /// The same while ImageMagick is unavailable to the converter, which has to do everything itself.
  void ExpectOwnPictures(const std::string& source, const std::vector<ThumbOptions>& outputs,
                         double leastMean = 40, double least = 36) const;

  /// Runs the converter with and without ImageMagick; expects success only with it.
  void ExpectHandedOver(const std::string& source, const std::vector<ThumbOptions>& outputs) const;

  /// Runs both; expects the same exit status.
  void ExpectSameVerdict(const std::string& source, const std::vector<ThumbOptions>& outputs) const;

 private:
  void CompareOutputs(const std::string& source, const std::vector<ThumbOptions>& outputs,
                      double leastMean, double least) const;
};

/// A thumbnail in a square box.
ThumbOptions Square(int side);

/// The usual thumbnails of a photo, largest first.
std::vector<ThumbOptions> UsualOutputs();

/// The same after `change` to each.
template <typename Change>
std::vector<ThumbOptions> UsualOutputs(Change change) {
  std::vector<ThumbOptions> outputs = UsualOutputs();
  for (ThumbOptions& options : outputs) {
    change(options);
  }
  return outputs;
}

}  // namespace vela_test
