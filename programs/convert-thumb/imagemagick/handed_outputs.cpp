#include "imagemagick/handed_outputs.h"

#include <algorithm>
#include <optional>
#include <string>
#include <utility>
#include <variant>

#include "command_line/file_name.h"
#include "imagemagick/coder_names.h"
#include "process/failure_report.h"
#include "process/source_file.h"
#include "process/trusted_path.h"
#include "process/unfinished_outputs.h"

namespace vela {

namespace {

/// Creates the output and replaces the argument that names it.
bool Hand(const std::string& path, const std::string& prefix, std::string& argument,
          HandedLine& handed) {
  OpenOutput output = OpenForWriting(path);
  if (!output.file.IsOpen()) {
    if (TypeOf(path) == FileType::kPipe) {
      ReportFailure("%s: not a regular file", path.c_str());
    } else {
      ReportFailure("cannot write %s", path.c_str());
    }
    return false;
  }
  argument = prefix + NameOf(output.file);
  handed.outputs.push_back(std::move(output));
  return true;
}

bool HandThumbnails(const CommandLine& line, const ConversionPlan& plan, HandedLine& handed) {
  // A source called "-write" is followed by something else.
  const size_t excess = line.outputIndices.size() - plan.outputs.size();
  for (size_t i = 0; i < plan.outputs.size(); ++i) {
    const std::string& path = plan.outputs[i].path;
    std::string prefix = CoderPrefix(std::string(ExtensionOf(path)));
    prefix = prefix.empty() ? "jpg:" : prefix;  // the null device
    if (!Hand(path, prefix, handed.arguments[line.outputIndices[i + excess]], handed)) {
      return false;
    }
  }
  return true;
}

/// The parts of an output argument that only ImageMagick understands completely.
struct OutputArgument {
  std::string prefix;  ///< with the colon
  std::string name;    ///< a path, perhaps with special meanings
};

OutputArgument Split(const std::string& argument) {
  const size_t colon = argument.find(':');
  const bool hasPrefix =
      colon != std::string::npos && colon > 0 &&
      std::all_of(argument.begin(), argument.begin() + static_cast<std::ptrdiff_t>(colon),
                  [](char character) {
                    return (character >= '0' && character <= '9') ||
                           (character >= 'A' && character <= 'Z') ||
                           (character >= 'a' && character <= 'z');
                  });
  return hasPrefix ? OutputArgument{argument.substr(0, colon + 1), argument.substr(colon + 1)}
                   : OutputArgument{"", argument};
}

/// Returns true when ImageMagick writes to the file of exactly this name.
bool IsPlainOutput(const OutputArgument& parts) {
  const std::string format = parts.prefix.substr(0, parts.prefix.find(':'));
  return IsPlainName(parts.name) && (format.empty() || !CoderPrefix(format).empty());
}

/// Names what the administrator can change: an option, which a profile may contain, rather than the
/// name of the output.
void ReportRefusedName(const std::string& argument, const std::string& unsupportedOption) {
  if (unsupportedOption.empty()) {
    ReportFailure("%s: ImageMagick is not given this name in a directory that others can change",
                  argument.c_str());
  } else {
    ReportFailure(
        "the option %s is only known to ImageMagick, which is not given %s: others can "
        "change its directory",
        unsupportedOption.c_str(), argument.c_str());
  }
}

bool HandUnknown(std::string& argument, const std::string& unsupportedOption, HandedLine& handed) {
  const OutputArgument parts = Split(argument);
  if (parts.name.empty() || argument.front() == '-') {
    return true;  // no file
  }
  const std::string path = WithoutDoubledPercents(parts.name);
  std::optional<Place> place = FindPlace(path);
  if (place && IsPrivate(place->directory)) {
    if (IsPlainOutput(parts) && IsAbsent(*place)) {
      handed.namedOutputs.push_back(std::move(*place));
    }
    return true;
  }
  const std::string prefix =
      parts.prefix.empty() ? CoderPrefix(std::string(ExtensionOf(path))) : parts.prefix;
  if (!IsPlainName(path) || prefix.empty()) {
    ReportRefusedName(argument, unsupportedOption);
    return false;
  }
  return Hand(path, prefix, argument, handed);
}

}  // namespace

bool HandOutputs(const CommandLine& line, HandedLine& handed) {
  if (const auto* const plan = std::get_if<ConversionPlan>(&line.task)) {
    return HandThumbnails(line, *plan, handed);
  }
  if (std::holds_alternative<TurnPlan>(line.task)) {
    return true;  // the photo itself
  }
  return std::all_of(line.outputIndices.begin(), line.outputIndices.end(), [&](size_t index) {
    const bool isReplaced = handed.arguments[index] != line.arguments[index];
    return isReplaced || HandUnknown(handed.arguments[index], line.unsupportedOption, handed);
  });
}

bool AreOutputsWritten(const HandedLine& handed) {
  return std::all_of(handed.outputs.begin(), handed.outputs.end(), [](const OpenOutput& output) {
    const bool isWritten = output.isDevice || SizeOf(output.file.Get()) > 0;
    if (!isWritten) {
      ReportFailure("ImageMagick has not written all outputs");
    }
    return isWritten;
  });
}

void RemoveHandedOutputs(const HandedLine& handed) {
  RemoveOutputs();
  for (const Place& output : handed.namedOutputs) {
    RemoveRegular(output);
  }
}

}  // namespace vela
