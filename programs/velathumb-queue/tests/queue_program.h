// The program as its users start it.
#pragma once

#include <string>
#include <vector>

#include "support/program.h"

namespace vela_test {

/// Where the sandbox shows the program.
std::string QueueProgramPath();

/// The options that make it run the velathumb that was built, with this profile file.
std::vector<std::string> QueueArguments(const std::string& profileFile,
                                        const std::vector<std::string>& more = {});

}  // namespace vela_test
