// How long a process has not used a processor.
#pragma once

#include <ctime>

namespace vela {

/// Counts the looks at a process in which its processor time has not grown. A second in which
/// nobody looks, because everything is stopped or suspended, does not count.
class IdleTime {
 public:
  /// Takes the processor time that the process has used until now. Returns in how many successive
  /// looks, this one included, it was the same as before. Safe in a signal handler.
  int Update(std::time_t seconds, long nanoseconds) {
    const bool isSame = seconds == seconds_ && nanoseconds == nanoseconds_;
    looks_ = isSame ? looks_ + 1 : 0;
    seconds_ = seconds;
    nanoseconds_ = nanoseconds;
    return looks_;
  }

 private:
  std::time_t seconds_ = -1;
  long nanoseconds_ = 0;
  int looks_ = 0;
};

}  // namespace vela
