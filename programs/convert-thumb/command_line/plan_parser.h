// Reads the command line that makes thumbnails.
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

#include "command_line/conversion_plan.h"

namespace vela {

/// The arguments behind the program's name as a plan. Empty when they say anything that is not
/// understood here to the last detail.
std::optional<ConversionPlan> ParseConversion(const std::vector<std::string>& arguments);

/// A file to be turned where it is.
struct TurnPlan {
  std::string path;
  int quarterTurns = 0;  ///< clockwise, 1 to 3
};

/// The arguments behind the program's name when they ask to turn one file in place, which they do
/// by naming it twice. Empty for any others.
std::optional<TurnPlan> ParseTurn(const std::vector<std::string>& arguments);

/// The place of the argument that names the source; arguments.size() when there is none.
size_t FindSourceArgument(const std::vector<std::string>& arguments);

/// The directory for temporary files that the arguments name; empty when they name none.
std::optional<std::string> FindScratchDirectory(const std::vector<std::string>& arguments);

/// The file that a source argument names: all of it but for "[0]" at its end, which chooses the
/// first page.
std::string SourceFile(const std::string& argument);

}  // namespace vela
