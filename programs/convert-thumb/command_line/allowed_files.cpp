#include "command_line/allowed_files.h"

#include <algorithm>
#include <iterator>
#include <string>
#include <variant>
#include <vector>

#include "command_line/file_name.h"
#include "platform/installed_names.h"
#include "process/output_file.h"

namespace vela {

namespace {

constexpr const char* kImageMagick[] = {"/usr/vela/lib/convert-thumb", kImageMagickProgram};
constexpr const char* kImageMagickData[] = {kImageMagickConfiguration, kImageMagickShared,
                                            "/usr/share/color", "/usr/vela/share/imagemagick"};

void AddUnique(std::vector<std::string>& list, const std::string& text) {
  if (std::find(list.begin(), list.end(), text) == list.end()) {
    list.push_back(text);
  }
}

void AddOutput(AllowedFiles& files, const std::string& path) {
  if (path.empty()) {
    return;
  }
  if (IsDevice(path)) {
    AddUnique(files.devices, path);
  } else {
    AddUnique(files.outputs, DirectoryOf(path));
  }
}

/// Returns the file that ImageMagick, which alone understands the line, writes for this argument;
/// empty when it names none.
std::string UnknownOutput(const CommandLine& line, const std::string& argument) {
  return argument == line.sourceFile ? argument
                                     : WithoutDoubledPercents(SplitOutputArgument(argument).name);
}

/// Returns the files that the line names as outputs. In a line that this program understands, the
/// beginning of "jpg:/tmp/a.jpg" is part of a relative path.
std::vector<std::string> FindOutputFiles(const CommandLine& line) {
  std::vector<std::string> files;
  if (const auto* const conversion = std::get_if<ConversionPlan>(&line.task)) {
    for (const OutputPlan& output : conversion->outputs) {
      files.push_back(output.path);
    }
  } else if (const auto* const turn = std::get_if<TurnPlan>(&line.task)) {
    files.push_back(turn->path);
  } else {
    for (const size_t index : line.outputIndices) {
      files.push_back(UnknownOutput(line, line.arguments[index]));
    }
  }
  return files;
}

}  // namespace

AllowedFiles FindAllowedFiles(const CommandLine& line) {
  AllowedFiles files = FilesOfEveryProgram();
  files.programs.insert(files.programs.end(), std::begin(kImageMagick), std::end(kImageMagick));
  files.data.insert(files.data.end(), std::begin(kImageMagickData), std::end(kImageMagickData));
  files.inputs = {line.sourceFile};
  files.outputs = {line.scratchDirectory};
  for (const std::string& path : FindOutputFiles(line)) {
    AddOutput(files, path);
  }
  return files;
}

}  // namespace vela
