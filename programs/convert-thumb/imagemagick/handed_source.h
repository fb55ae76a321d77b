// The photo that is left to ImageMagick.
#pragma once

#include "command_line/command_line.h"
#include "imagemagick/handed_line.h"

namespace vela {

/// Replaces the name of the photo in the arguments by the coder of its format, which is chosen by
/// its content, and a descriptor of the file. A photo that is turned in place is replaced as output
/// as well. Does nothing when the line names no photo. Returns false, after a call of
/// ReportFailure, when the photo cannot be opened, is not a regular file or has none of the known
/// formats.
bool HandSource(const CommandLine& line, HandedLine& handed);

}  // namespace vela
