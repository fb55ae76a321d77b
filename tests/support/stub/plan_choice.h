// Chooses the plan for this call from those of the test.
#pragma once

#include <cstdint>
#include <optional>
#include <vector>

#include "support/stub/command_line.h"

namespace vela_test {

/// A step's word and operands, as one list.
using PlannedStep = std::vector<std::string>;

/// The steps of the tool's call with this number; empty when there is no plan at all.
std::optional<std::vector<PlannedStep>> PlanFor(const StubCommandLine& line, uint64_t number);

}  // namespace vela_test
