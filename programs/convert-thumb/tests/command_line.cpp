#include "command_line.h"

namespace vela_test {
namespace {

using Words = std::vector<std::string>;

void Append(Words& line, const Words& more) {
  line.insert(line.end(), more.begin(), more.end());
}

std::string BoxOf(const ThumbOptions& options) {
  return std::to_string(options.width) + "x" + std::to_string(options.height);
}

Words OptionArguments(const ThumbOptions& options, const Words& scaling) {
  Words line = {"-define", "jpeg:size=" + BoxOf(options)};
  Append(line, scaling);
  Append(line, {"-quality", std::to_string(options.quality)});
  if (options.stripProfiles) {
    Append(line, {"+profile", "!icc,*"});
  }
  if (options.flatten) {
    Append(line, {"-flatten"});
  }
  if (options.autoOrient) {
    Append(line, {"-auto-orient"});
  }
  if (options.rotate != 0) {
    Append(line, {"-rotate", std::to_string(options.rotate)});
  }
  if (!options.unsharp.empty()) {
    Append(line, {"-unsharp", options.unsharp});
  }
  if (options.convertToSrgb) {
    Append(line, {"-colorspace", "sRGB"});
  }
  return line;
}

void AppendFirst(Words& line, const ThumbOutput& output, const Words& scaling) {
  Append(line, {"(", "-clone", "0"});
  Append(line, OptionArguments(output.options, scaling));
  Append(line, {"-write", output.path, ")", "-delete", "0"});
}

void AppendMiddle(Words& line, const ThumbOutput& output, const Words& scaling) {
  Append(line, {"(", "+clone"});
  Append(line, OptionArguments(output.options, scaling));
  Append(line, {"-write", output.path, "+delete", ")"});
}

}  // namespace

std::vector<std::string> CommandLine::Arguments() const {
  std::vector<Words> scaling;
  for (const ThumbOutput& output : outputs) {
    const ThumbOptions& options = output.options;
    scaling.push_back({"-thumbnail", BoxOf(options) + (options.fill ? ">^" : ">")});
  }
  return Arguments(scaling);
}

std::vector<std::string> CommandLine::Arguments(
    const std::vector<std::vector<std::string>>& scaling) const {
  Words line;
  if (!scratchDirectory.empty()) {
    Append(line, {"-define", "registry:temporary-path=" + scratchDirectory});
  }
  Append(line, {source});
  for (size_t i = 0; i + 1 < outputs.size(); ++i) {
    i == 0 ? AppendFirst(line, outputs[i], scaling[i]) : AppendMiddle(line, outputs[i], scaling[i]);
  }
  Append(line, OptionArguments(outputs.back().options, scaling.back()));
  Append(line, {outputs.back().path});
  return line;
}

}  // namespace vela_test
