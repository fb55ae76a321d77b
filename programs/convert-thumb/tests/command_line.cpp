#include "command_line.h"

namespace vela_test {
namespace {

using Words = std::vector<std::string>;

void Append(Words& line, const Words& more) {
  line.insert(line.end(), more.begin(), more.end());
}

Words OptionArguments(const ThumbOptions& options) {
  const std::string box = std::to_string(options.width) + "x" + std::to_string(options.height);
  Words line = {"-define",    "jpeg:size=" + box,
                "-thumbnail", box + (options.fill ? ">^" : ">"),
                "-quality",   std::to_string(options.quality)};
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

void AppendFirst(Words& line, const ThumbOutput& output) {
  Append(line, {"(", "-clone", "0"});
  Append(line, OptionArguments(output.options));
  Append(line, {"-write", output.path, ")", "-delete", "0"});
}

void AppendMiddle(Words& line, const ThumbOutput& output) {
  Append(line, {"(", "+clone"});
  Append(line, OptionArguments(output.options));
  Append(line, {"-write", output.path, "+delete", ")"});
}

}  // namespace

std::vector<std::string> CommandLine::Arguments() const {
  Words line;
  if (!scratchDirectory.empty()) {
    Append(line, {"-define", "registry:temporary-path=" + scratchDirectory});
  }
  Append(line, {source});
  for (size_t i = 0; i + 1 < outputs.size(); ++i) {
    i == 0 ? AppendFirst(line, outputs[i]) : AppendMiddle(line, outputs[i]);
  }
  Append(line, OptionArguments(outputs.back().options));
  Append(line, {outputs.back().path});
  return line;
}

}  // namespace vela_test
