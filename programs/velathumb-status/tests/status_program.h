// The program as its users start it.
#pragma once

#include <json/value.h>

#include <string>
#include <vector>

#include "support/program.h"

namespace vela_test {

/// Where the sandbox shows the program.
std::string StatusProgramPath();

/// Runs the program with these arguments.
ProgramResult RunStatus(const std::vector<std::string>& arguments,
                        const ProgramOptions& options = ProgramOptions());

/// Runs it with these arguments and without capabilities, so that permission bits apply to it.
ProgramResult RunStatusAsOrdinaryUser(const std::vector<std::string>& arguments);

/// Waits until the started program has printed this text, at most 20 s; returns whether it has.
bool WaitForOutput(const Program& program, const std::string& text);

/// Starts the program with its standard output at the descriptor, which stays the caller's.
ProgramOptions WithOutputAt(int descriptor);

/// Reads one JSON object; fails the test when the text is anything else or not valid UTF-8.
Json::Value ReadJson(const std::string& text);

/// Runs it with --json and these arguments, and parses its output; fails the test when that is not
/// one JSON object.
Json::Value QueryJson(std::vector<std::string> arguments);

}  // namespace vela_test
