// Gives the sandbox a root directory of its own.
#pragma once

#include <string>
#include <vector>

namespace vela_test {

/// A directory of the machine and where the sandbox shows it.
struct ShownDirectory {
  std::string place;                 ///< "/name"
  std::vector<std::string> origins;  ///< the first of these that exists; may be relative
};

/// Makes an empty memory volume the root and working directory of the calling process, which has
/// one thread and a mount namespace of its own, and shows `directories` with everything below them
/// there. The root directory need not be a mount point: the process may have been started by
/// chroot. No mount made from now on is seen outside the namespace. Ends the process when that is
/// not possible.
void MoveToNewRoot(const std::vector<ShownDirectory>& directories);

}  // namespace vela_test
