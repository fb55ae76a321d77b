// Leaves a command line to ImageMagick.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

namespace vela {

/// Replaces this process by ImageMagick with the same arguments; where it is not installed under
/// the converter's name, this process stays and ends the way ImageMagick ends in a child. A source
/// whose name ImageMagick would take for more than a name is opened here and handed over as a
/// descriptor; one that cannot be opened is an error. The same for a photo that is turned in place.
/// Outputs of a command line that is understood here are written so that they mean nothing but a
/// file, and never a pipe. ImageMagick is told to take no more than `memoryLimit` bytes. Returns
/// only when that failed; TellFailure was called then.
void HandOver(const std::vector<std::string>& arguments, size_t memoryLimit);

}  // namespace vela
