// The command line.
#pragma once

#include <cstdint>
#include <string>

#include "cli/command_line.h"

namespace vela {

/// The options of the daemon.
struct Options {
  std::string database = "/var/lib/velaindex/index.db";
  std::string group;         ///< empty: the socket's group is root's
  int workers = 4;           ///< threads that read media files
  int clientTimeout = 30;    ///< seconds
  int maxClients = 2048;     ///< connections at a time
  bool logRequests = false;  ///< a line for every request, not only for refused ones

  /// Not empty: send a request to the running daemon instead of starting one.
  std::string versionDirectory;
  int32_t version = 0;            ///< for versionDirectory
  bool isVersionRemoved = false;  ///< remove the version of versionDirectory
};

/// Parses the command line into `options`.
ParseOutcome ParseOptions(int argc, char** argv, Options& options);

}  // namespace vela
