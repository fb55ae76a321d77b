// Reading a file that is to be checked.
#pragma once

#include <string>

#include "checks/finding.h"

namespace vela {

/// How reading a file ended.
enum class FileRead {
  kDone,
  kFaulty,     ///< the path leads to no file that could be read: a finding, not a failed check
  kUnchecked,  ///< may be a good file, but not for this process now
};

/// Reads the file `path` into `text`; `error` receives an errno value. Never waits for a pipe's
/// writer.
FileRead ReadCheckedFile(const std::string& path, std::string& text, int& error);

}  // namespace vela
