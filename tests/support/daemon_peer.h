// Simulates the index daemon at its socket.
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace vela_test {

constexpr const char* kDaemonSocket = "/tmp/velaindexplugind_sock";

/// A received request.
struct DaemonRequest {
  std::string bytes;      ///< raw, the newline included
  std::string command;    ///< value of "command", empty when there is none
  uint64_t sequence = 0;  ///< place among all events, see NextSequence in stub_tool.h
};

/// How the daemon treats one connection.
class DaemonReply {
 public:
  /// Answers with the text and a newline, then closes.
  static DaemonReply Line(const std::string& text) { return Bytes(text + "\n"); }
  /// Answers with exactly these bytes, then closes.
  static DaemonReply Bytes(const std::string& bytes) {
    DaemonReply reply;
    reply.bytes_ = bytes;
    return reply;
  }
  /// Reads the request, never answers, keeps the connection until the other side closes it.
  static DaemonReply Silence() { return BytesThenSilence(""); }
  /// Answers with exactly these bytes, then keeps the connection as Silence does.
  static DaemonReply BytesThenSilence(const std::string& bytes) {
    DaemonReply reply = Bytes(bytes);
    reply.keepOpen_ = true;
    return reply;
  }
  /// Closes without reading the request.
  static DaemonReply CloseAtOnce() {
    DaemonReply reply;
    reply.readRequest_ = false;
    return reply;
  }
  /// Reads the request and closes without an answer.
  static DaemonReply CloseAfterRequest() { return Bytes(""); }

  /// Waits this long before the answer (or the closing).
  DaemonReply& After(int milliseconds) {
    delayMilliseconds_ = milliseconds;
    return *this;
  }
  /// Sends the answer one byte at a time with this pause between.
  DaemonReply& ByteByByte(int pauseMilliseconds = 0) {
    byteByByte_ = true;
    pauseMilliseconds_ = pauseMilliseconds;
    return *this;
  }
  /// Calls this, on the connection's own thread, while the other side waits for the answer.
  DaemonReply& Meanwhile(std::function<void(const DaemonRequest&)> action) {
    action_ = std::move(action);
    return *this;
  }

 private:
  friend class DaemonPeer;
  bool readRequest_ = true;
  bool keepOpen_ = false;
  bool byteByByte_ = false;
  int delayMilliseconds_ = 0;
  int pauseMilliseconds_ = 0;
  std::string bytes_;
  std::function<void(const DaemonRequest&)> action_;
};

/// The daemon; listens until the object ends, which closes all connections and removes the socket.
/// Without scripts every command is answered as a daemon with an empty index of version 0 would:
/// {"success":true} with "version" 0, "result" false or an empty "media" where the command has one.
class DaemonPeer {
 public:
  explicit DaemonPeer(const std::string& socketPath = kDaemonSocket);
  ~DaemonPeer();
  DaemonPeer(const DaemonPeer&) = delete;
  DaemonPeer& operator=(const DaemonPeer&) = delete;

  /// Every request with this command gets `reply`.
  void Answer(const std::string& command, const DaemonReply& reply);
  /// Queues `reply` for the next connection without one, whatever its request.
  void AnswerNext(const DaemonReply& reply);
  /// Shorthand: sets the index version in replies to GET_INDEX_VERSION.
  void SetIndexVersion(int version);

  /// All requests so far, in order of arrival.
  std::vector<DaemonRequest> Requests() const;
  /// The commands of all requests so far.
  std::vector<std::string> Commands() const;
  /// Waits until `count` requests have come in, at most `milliseconds`; returns whether they have.
  bool WaitForRequests(size_t count, int milliseconds = 10000) const;
  /// Connections accepted so far.
  size_t Connections() const;

 private:
  class Server;
  std::unique_ptr<Server> server_;
};

}  // namespace vela_test
