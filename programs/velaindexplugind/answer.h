// What came of a request.
#pragma once

#include <string>

namespace vela {

enum class Outcome {
  kDone,     ///< carried out
  kRefused,  ///< the request was wrong
  kFailed,   ///< the media file could not be read
  kFault,    ///< the daemon's own fault or the index's; the operator is to know
};

struct Answer {
  std::string line;  ///< the reply; empty when there was no memory for it
  Outcome outcome = Outcome::kFault;
  std::string error;  ///< for the log, empty when there is nothing to tell
};

}  // namespace vela
