// The command line.
#pragma once

#include "queue_run.h"

namespace vela {

/// How the reading of the command line ended.
enum class ParseOutcome {
  kRun,    ///< the settings are there
  kDone,   ///< help or version was printed
  kWrong,  ///< wrong use, told on standard error
};

/// Reads the command line into `settings`.
ParseOutcome ParseOptions(int argc, char** argv, RunSettings& settings);

}  // namespace vela
