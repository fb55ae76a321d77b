// Leaves a command line to ImageMagick.
#pragma once

#include <cstddef>

#include "command_line/command_line.h"

namespace vela {

/// Replaces this process by ImageMagick with the same arguments. Where ImageMagick is not installed
/// under the converter's name, runs it in a child and ends with the child's status or signal.
///
/// A source whose name has a special meaning to ImageMagick is opened here and passed as a
/// descriptor; one that cannot be opened is an error. The same applies to a photo that is turned in
/// place. The outputs of a conversion are rewritten so that they can only be interpreted as file
/// names; an output that is a pipe is an error. ImageMagick is limited to `memoryLimit` bytes.
/// Returns only on failure, after a call of ReportFailure.
void HandOver(const CommandLine& line, size_t memoryLimit);

}  // namespace vela
