// The converter's command line: arguments separated by zero bytes.

#include <algorithm>
#include <cstdlib>
#include <string>
#include <variant>
#include <vector>

#include "command_line/allowed_files.h"
#include "command_line/command_line.h"
#include "command_line/file_name.h"

using namespace vela;

namespace {

std::vector<std::string> Split(const uint8_t* data, size_t size) {
  std::vector<std::string> arguments(1);
  for (size_t i = 0; i < size; ++i) {
    if (data[i] == '\0') {
      arguments.emplace_back();
    } else {
      arguments.back() += static_cast<char>(data[i]);
    }
  }
  return arguments;
}

bool IsWhole(const OutputPlan& output) {
  const bool hasBox = output.box.width >= 1 && output.box.height >= 1;
  const bool hasQuality = output.quality >= 1 && output.quality <= 100;
  return hasBox && hasQuality && !output.path.empty();
}

bool Contains(const std::vector<std::string>& list, const std::string& text) {
  return std::find(list.begin(), list.end(), text) != list.end();
}

bool CanBeWritten(const std::string& path, const AllowedFiles& files) {
  return Contains(files.outputs, DirectoryOf(path)) || Contains(files.devices, path);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const CommandLine line = ParseCommandLine(Split(data, size));
  const AllowedFiles files = FindAllowedFiles(line);
  if (line.sourceIndex > line.arguments.size()) {
    std::abort();
  }
  const auto* const turn = std::get_if<TurnPlan>(&line.task);
  if (turn != nullptr && (turn->quarterTurns < 1 || turn->quarterTurns > 3)) {
    std::abort();
  }
  const auto* const conversion = std::get_if<ConversionPlan>(&line.task);
  if (conversion == nullptr) {
    return 0;
  }
  if (conversion->outputs.empty()) {
    std::abort();
  }
  for (const OutputPlan& output : conversion->outputs) {
    if (!IsWhole(output) || !CanBeWritten(output.path, files)) {
      std::abort();
    }
  }
  return 0;
}
