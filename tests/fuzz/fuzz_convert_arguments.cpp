// The converter's command line: arguments, each but the first behind a zero byte.

#include <cstdlib>
#include <string>
#include <vector>

#include "command_line/plan_parser.h"
#include "confinement/writable_places.h"

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

bool CanBeWritten(const std::string& path, const WritablePlaces& places) {
  for (const std::string& file : places.files) {
    if (file == path) {
      return true;
    }
  }
  return false;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const std::vector<std::string> arguments = Split(data, size);
  const WritablePlaces places = FindWritablePlaces(arguments);
  if (FindSourceArgument(arguments) > arguments.size()) {
    std::abort();
  }
  const std::optional<TurnPlan> turn = ParseTurn(arguments);
  if (turn && (turn->quarterTurns < 1 || turn->quarterTurns > 3)) {
    std::abort();
  }
  const std::optional<ConversionPlan> plan = ParseConversion(arguments);
  if (plan && plan->outputs.empty()) {
    std::abort();
  }
  for (const OutputPlan& output : plan ? plan->outputs : std::vector<OutputPlan>()) {
    if (!IsWhole(output) || !CanBeWritten(output.path, places)) {
      std::abort();
    }
  }
  return 0;
}
