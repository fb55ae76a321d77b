// The outputs of a command line that is left to ImageMagick.
#pragma once

#include "command_line/command_line.h"
#include "imagemagick/handed_line.h"

namespace vela {

/// Creates the outputs and replaces their names in the arguments by descriptors, with the format
/// that their extension or prefix chooses. In a command line that only ImageMagick supports, names
/// keep any special meaning if nobody else can change the output's directory. Returns false, after
/// a call of ReportFailure, when an output cannot be created.
bool HandOutputs(const CommandLine& line, HandedLine& handed);

/// Removes the outputs that were created here, and files that did not exist before and that
/// ImageMagick has created by their names.
void RemoveHandedOutputs(const HandedLine& handed);

/// Returns true when every output has been written; otherwise calls ReportFailure.
bool AreOutputsWritten(const HandedLine& handed);

}  // namespace vela
