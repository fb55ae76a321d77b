// Log lines about requests.
#pragma once

#include <chrono>

#include "answer.h"
#include "rate_limit.h"
#include "request.h"

namespace vela {

/// Logs refused and failed requests, so many in a stretch of time, and all others where asked to.
class RequestLog {
 public:
  using Clock = std::chrono::steady_clock;

  explicit RequestLog(bool logsAll) : logsAll_(logsAll) {}

  /// Logs what came of a request. `request` is null when it could not be read; `socket` is the
  /// client's, -1 when it has gone.
  void Write(const Request* request, const Answer& answer, int socket, Clock::time_point begin);

  /// Logs that the daemon cannot take connections for want of something.
  void WriteAcceptFailure(int error);

 private:
  bool MayPass(const Answer& answer, int& heldBack);

  const bool logsAll_;
  RateLimit problems_{20, std::chrono::seconds(10)};
  RateLimit acceptFailures_{1, std::chrono::seconds(10)};
};

}  // namespace vela
