// A command line in the form in which ImageMagick gets it.
#pragma once

#include <string>
#include <utility>
#include <vector>

#include "posix/file_descriptor.h"
#include "process/output_file.h"
#include "process/trusted_path.h"

namespace vela {

/// The arguments, and the files that they refer to as descriptors.
struct HandedLine {
  std::vector<std::string> arguments;
  std::vector<FileDescriptor> inputs;
  std::vector<OpenOutput> outputs;
  /// Files that do not exist yet and that ImageMagick creates by their names.
  std::vector<Place> namedOutputs;
};

/// Returns a name of an open file. It has no special meaning to ImageMagick, leads to the same file
/// whatever happens to its path, and is valid as long as the descriptor is open.
inline std::string NameOf(const FileDescriptor& file) {
  return "/proc/self/fd/" + std::to_string(file.Get());
}

}  // namespace vela
