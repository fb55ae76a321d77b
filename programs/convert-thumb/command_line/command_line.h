// Parses the command line.
#pragma once

#include <cstddef>
#include <string>
#include <variant>
#include <vector>

#include "command_line/conversion_plan.h"

namespace vela {

/// A command line that this program does not implement.
struct UnknownTask {};

/// A parsed command line.
struct CommandLine {
  /// The arguments after the program's name.
  std::vector<std::string> arguments;

  /// A conversion or a turn only if every single argument is supported.
  std::variant<UnknownTask, ConversionPlan, TurnPlan> task;

  /// The first option of an unknown task that is not supported, with the argument after
  /// it, such as "-unsharp foo"; empty when something else is the reason.
  std::string unsupportedOption;

  /// Index of the argument that names the source; arguments.size() if there is none. Set for an
  /// unknown task as well, like everything below.
  size_t sourceIndex = 0;

  /// The file that this argument names.
  std::string sourceFile;

  /// Indices of the arguments that name outputs, in ascending order: those after "-write", and the
  /// last argument.
  std::vector<size_t> outputIndices;

  /// The directory for temporary files, from the command line or else from the environment.
  std::string scratchDirectory;
};

/// Parses the arguments after the program's name.
CommandLine ParseCommandLine(std::vector<std::string> arguments);

/// Returns true when all that a run of this line makes is discarded: each output is
/// kDiscardedOutput. Such a run finds out whether the photo can be converted, and why not.
bool IsDiscarded(const CommandLine& line);

/// Returns the file that a source argument names: the argument without "[0]" at its end, which
/// selects the first page.
std::string SourceFile(const std::string& argument);

}  // namespace vela
