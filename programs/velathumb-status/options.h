// The command line.
#pragma once

#include <string>
#include <vector>

#include "cli/command_line.h"

namespace vela {

/// What to report, and how.
struct Options {
  std::vector<std::string> directories;
  bool photos = false;
  bool recursive = false;
  bool checkVideos = false;
  bool queue = false;
  bool progress = false;
  bool watch = false;
  bool resumeTime = false;
  bool security = false;       ///< show how the tools are confined
  bool failed = false;         ///< list the failed photos with their reasons
  bool nulTerminated = false;  ///< only their paths, each followed by a null byte
  bool checkConfig = false;
  std::string profileFile;  ///< for checkConfig; empty: the one that the services use
  bool json = false;
  std::string htmlFile;  ///< empty: no page
};

/// Parses the command line into `options`.
ParseOutcome ParseOptions(int argc, char** argv, Options& options);

}  // namespace vela
