// What each external tool may do.
#pragma once

#include <chrono>

#include "posix/confinement.h"

namespace vela {

/// The tools that are not confined: a file that only root can change, with an absolute path of a
/// program on each line; lines that begin with # are comments. It exists only if an administrator
/// has made it.
inline constexpr char kUnconfinedToolsFile[] = "/usr/vela/etc/unconfined-tools";

/// The limits that apply to every tool.
inline constexpr uint64_t kToolFileSize = uint64_t{4} << 30;
inline constexpr uint64_t kToolMemory = uint64_t{2} << 30;

/// Returns the confinement of `program` with these arguments, argument zero first, ended by a null
/// pointer. The converter, dcraw, exiftool and compare, which are recognised by the base name of
/// the program, can open only parts of the system, their input files and, to write, the directories
/// of their output files; other programs can open all files. A tool that is listed in
/// kUnconfinedToolsFile gets only the limits. `timeLimit` is that of the run, 0 for none.
Confinement ConfinementOfTool(const char* program, char* const arguments[],
                              std::chrono::seconds timeLimit);

}  // namespace vela
