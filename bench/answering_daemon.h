// A plugin daemon that costs as little as one can.
#pragma once

#include <thread>

namespace vela_bench {

/// Answers every request on the plugin daemon's socket at once, until it is destroyed.
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
