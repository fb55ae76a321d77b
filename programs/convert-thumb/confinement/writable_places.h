// Which places a command line may write to.
#pragma once

#include <string>
#include <vector>

namespace vela {

struct WritablePlaces {
  std::vector<std::string> directories;  ///< with all below them
  std::vector<std::string> files;        ///< outputs that may exist already; links are followed
};

/// The directories of the outputs and for temporary files, the outputs, and /dev/null. `arguments`
/// is what stands behind the program's name, whether it is understood here or only by ImageMagick:
/// an output is what stands behind "-write", and the last argument. Nothing has to exist.
WritablePlaces FindWritablePlaces(const std::vector<std::string>& arguments);

}  // namespace vela
