// Log lines about requests.
#pragma once

#include <chrono>

#include "answer.h"
#include "request.h"

namespace vela {

/// Keeps clients from flooding the log: allows a number of lines in each interval and counts the
/// suppressed ones.
class RateLimit {
 public:
  using Clock = std::chrono::steady_clock;

  RateLimit(int burst, Clock::duration interval) : burst_(burst), interval_(interval) {}

  /// Returns whether the line may be written. If so, `suppressed` is how many were suppressed since
  /// the last one that was.
  bool Pass(Clock::time_point now, int& suppressed) {
    if (passed_ == 0 || now - begin_ >= interval_) {
      begin_ = now;
      passed_ = 0;
    }
    if (passed_ >= burst_) {
      ++suppressed_;
      return false;
    }
    ++passed_;
    suppressed = suppressed_;
    suppressed_ = 0;
    return true;
  }

 private:
  const int burst_;
  const Clock::duration interval_;
  Clock::time_point begin_{};
  int passed_ = 0;
  int suppressed_ = 0;
};

/// Logs refused and failed requests, up to a maximum rate, or all requests.
class RequestLog {
 public:
  using Clock = std::chrono::steady_clock;

  explicit RequestLog(bool logsAll) : logsAll_(logsAll) {}

  /// Logs the result of a request. `request` is null when it could not be parsed; `socket` is the
  /// client's, -1 when it has disconnected.
  void Write(const Request* request, const Answer& answer, int socket, Clock::time_point begin);

  /// Logs that the daemon cannot accept connections because of `error`, an errno value.
  void WriteAcceptFailure(int error);

 private:
  bool MayPass(const Answer& answer, int& suppressed);

  const bool logsAll_;
  RateLimit problems_{20, std::chrono::seconds(10)};
  RateLimit acceptFailures_{1, std::chrono::seconds(10)};
};

}  // namespace vela
