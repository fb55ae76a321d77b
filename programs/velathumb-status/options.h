// The command line.
#pragma once

#include <string>
#include <vector>

namespace vela {

/// What is asked for.
struct Options {
  std::vector<std::string> directories;
  bool photos = false;
  bool recursive = false;
  bool checkVideos = false;
  bool queue = false;
  bool progress = false;
  bool watch = false;
  bool resumeTime = false;
  bool json = false;
  std::string htmlFile;  ///< empty: no page
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
