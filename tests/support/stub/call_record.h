// What a stub records about its call.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "support/stub/command_line.h"

namespace vela_test {

/// The surroundings the stub was started in, as alternating fields: name, value.
std::vector<std::string> Surroundings();

/// Appends the start of the call to the record; returns its sequence number, 0 on failure.
uint64_t RecordStart(const StubCommandLine& line, uint64_t number,
                     const std::vector<std::string>& surroundings);

/// Appends the end of the call that started with this sequence number.
void RecordEnd(uint64_t startSequence);

/// Appends what kept the stub from doing what its plan says; the test fails with it.
void RecordProblem(const std::string& tool, const std::string& problem);

}  // namespace vela_test
