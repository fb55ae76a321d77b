// What each external tool may do.
#pragma once

#include <chrono>

#include "posix/confinement.h"

namespace vela {

/// Returns the confinement of `program` with these arguments, argument zero first, ended by a null
/// pointer. The converter, dcraw, exiftool and compare, which are recognised by the base name of
/// the program, can open only parts of the system, their input files and, to write, the directories
/// of their output files; other programs can open all files. A tool that is listed in
/// kUnconfinedToolsFile gets only the limits. `timeLimit` is that of the run, 0 for none.
Confinement ConfinementOfTool(const char* program, char* const arguments[],
                              std::chrono::seconds timeLimit);

}  // namespace vela
