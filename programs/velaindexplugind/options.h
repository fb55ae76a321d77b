// The command line.
#pragma once

#include <cstdint>
#include <string>

namespace vela {

/// What is asked for.
struct Options {
  std::string database = "/var/lib/velaindex/index.db";
  std::string group;         ///< empty: the socket's group is root's
  int workers = 4;           ///< threads that read media files
  int clientTimeout = 30;    ///< seconds
  int maxClients = 2048;     ///< connections at once
  bool logRequests = false;  ///< a line for every request, not only for refused ones

  /// Not empty: no daemon, but a request to the one that runs.
  std::string versionDirectory;
  int32_t version = 0;            ///< for versionDirectory
  bool isVersionRemoved = false;  ///< versionDirectory loses its version
};

/// How the reading of the command line ended.
enum class ParseOutcome {
  kRun,    ///< the options are there
  kDone,   ///< help or version was printed
  kWrong,  ///< wrong use, told on standard error
};

/// Reads the command line into `options`.
ParseOutcome ParseOptions(int argc, char** argv, Options& options);

}  // namespace vela
