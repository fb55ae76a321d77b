#include "support/stub/plan_choice.h"

#include <algorithm>
#include <fstream>
#include <iterator>

#include "support/field_codec.h"
#include "support/stub_files.h"

namespace vela_test {

namespace {

std::optional<std::string> Content(const std::string& path) {
  std::ifstream file(path, std::ios::binary);
  if (!file) {
    return std::nullopt;
  }
  return std::string(std::istreambuf_iterator<char>(file), {});
}

/// The plan of the latest condition that one of the arguments meets.
std::optional<std::string> ConditionalPlan(const std::string& directory,
                                           const std::vector<std::string>& arguments) {
  std::optional<std::string> chosen;
  for (int i = 1;; ++i) {
    const auto condition = Content(directory + "/condition." + std::to_string(i));
    if (!condition) {
      return chosen;
    }
    const std::vector<std::string> fields = DecodeFields(*condition);
    const bool fits = fields.size() == 2 &&
                      std::find(arguments.begin(), arguments.end(), fields[0]) != arguments.end();
    if (fits) {
      chosen = fields[1];
    }
  }
}

}  // namespace

std::optional<std::vector<PlannedStep>> PlanFor(const StubCommandLine& line, uint64_t number) {
  const std::string directory = StubToolDirectory(line.tool);
  std::optional<std::string> plan = Content(directory + "/plan." + std::to_string(number));
  plan = plan ? plan : ConditionalPlan(directory, line.arguments);
  plan = plan ? plan : Content(directory + "/plan.default");
  if (!plan) {
    return std::nullopt;
  }
  std::vector<PlannedStep> steps;
  for (const std::string& step : DecodeFields(*plan)) {
    steps.push_back(DecodeFields(step));
  }
  return steps;
}

}  // namespace vela_test
