// A plugin daemon that lets the test act, or look, while the program waits for the answer.
#pragma once

#include <atomic>
#include <functional>
#include <string>
#include <thread>

namespace vela_test {

class CallbackDaemon {
 public:
  /// Given the command and the path of a request; returns the reply, one JSON object. Runs on a
  /// thread of its own.
  using Answer = std::function<std::string(const std::string& command, const std::string& path)>;

  /// Listens at the daemon's usual place.
  explicit CallbackDaemon(Answer answer);
  ~CallbackDaemon();
  CallbackDaemon(const CallbackDaemon&) = delete;
  CallbackDaemon& operator=(const CallbackDaemon&) = delete;

  /// Ends the listening: after it nothing calls back any more.
  void Stop();

 private:
  void Serve();
  void AnswerOne(int connection) const;

  Answer answer_;
  int listener_;
  std::atomic<bool> stopped_{false};
  std::thread thread_;
};

/// The reply of a daemon that carried the command out and has index version 0.
constexpr const char* kDone = "{\"success\":true,\"version\":0}";

}  // namespace vela_test
