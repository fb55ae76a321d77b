// Why the daemon cannot start.
#pragma once

#include <string>

namespace vela {

/// An empty text means that there is no problem.
struct StartProblem {
  std::string text;
  /// Another start would fail as well, until an administrator changes something.
  bool isPermanent = false;

  bool IsNone() const { return text.empty(); }
};

/// A problem with `what` for which the system gives the errno value `error`. It is permanent unless
/// its cause, such as a full volume, may pass.
StartProblem ProblemAt(const std::string& what, int error);

}  // namespace vela
