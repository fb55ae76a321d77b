// The file of the index database and the directory where it lies.
#pragma once

#include <sys/types.h>

#include <optional>
#include <string>

namespace vela {

/// Where the index database is, and whose it is to be when it is made.
struct IndexFile {
  std::string path;
  std::optional<gid_t> group;  ///< of what is made; nothing: as the system gives it
};

/// Makes the directories above the file that are missing. The last one is for its owner and group,
/// whatever the process's mask. A failure shows when the file is opened.
void MakeIndexDirectory(const IndexFile& file);

/// Makes the file, empty, when it is missing, and its directories. It is for its owner and group,
/// whatever the process's mask; a file that is there keeps its mode. A failure shows when the file
/// is opened; a group that cannot be given is logged.
void MakeIndexFile(const IndexFile& file);

}  // namespace vela
