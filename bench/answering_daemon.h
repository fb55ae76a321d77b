// An index daemon with the lowest possible cost.
#pragma once

#include <thread>

namespace vela_bench {

/// Answers every request on the index daemon's socket immediately, until it is destroyed.
class AnsweringDaemon {
 public:
  AnsweringDaemon();
  ~AnsweringDaemon();
  AnsweringDaemon(const AnsweringDaemon&) = delete;
  AnsweringDaemon& operator=(const AnsweringDaemon&) = delete;

 private:
  void Serve() const;

  int listener_;
  std::thread thread_;
};

}  // namespace vela_bench
