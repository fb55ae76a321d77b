// Leaves a command line to ImageMagick.
#pragma once

#include <cstddef>

#include "command_line/command_line.h"

namespace vela {

/// Runs ImageMagick in a child with the same arguments and ends with the child's status or signal;
/// without outputs that have to be completed or removed afterwards, replaces this process by it.
///
/// The photo is opened here and passed as a descriptor, with the coder that its content requires;
/// an unknown format is an error. The same applies to a photo that is turned in place. The outputs
/// are created here and passed as descriptors, too; they are removed when the child fails. See
/// HandOutputs for command lines that only ImageMagick supports. ImageMagick is limited to
/// `memoryLimit` bytes. Returns only on failure, after a call of ReportFailure.
void HandOver(const CommandLine& line, size_t memoryLimit);

}  // namespace vela
