// One client's connection: a request line in, a reply line out.
#pragma once

#include <chrono>
#include <string>
#include <string_view>

#include "posix/file_descriptor.h"

namespace vela {

/// A connection with a non-blocking socket. The caller decides when to call its functions.
class Connection {
 public:
  using Clock = std::chrono::steady_clock;

  enum class State {
    kReceiving,  ///< the request is incomplete
    kWorking,    ///< the request is in progress
    kSending,    ///< the reply is being sent
    kDraining,   ///< the reply is sent, the client is still sending
  };

  enum class Received {
    kMore,     ///< the line is incomplete
    kLine,     ///< Line() is complete
    kTooLong,  ///< the line is longer than a request may be
    kEnd,      ///< the client has disconnected without a request, or the socket has failed
  };

  enum class Sent {
    kMore,  ///< the client must receive some of it first
    kAll,
    kEnd,  ///< the client has disconnected
  };

  Connection(FileDescriptor socket, Clock::time_point now);

  int Fd() const { return socket_.Get(); }
  State GetState() const { return state_; }

  /// Receives what has arrived. A last line does not need a newline when the client closes its side
  /// of the connection.
  Received Receive(Clock::time_point now);

  /// The request line without its newline.
  std::string_view Line() const { return line_; }

  void BeginWork() { state_ = State::kWorking; }

  /// Sets the reply for Send. With `drains`, the client is still sending its request: the rest is
  /// received and discarded after the reply, because closing the connection at once would destroy
  /// the reply.
  void BeginReply(std::string reply, bool drains, Clock::time_point now);

  /// Sends as much of the reply as possible without waiting.
  Sent Send(Clock::time_point now);

  /// Discards what has arrived, after Send. Returns false when the client has disconnected or has
  /// sent too much.
  bool Drain();

  /// Returns whether the client has been idle for `limit`, or has taken several times as long for
  /// one request line or reply. Returns false while its request is in progress.
  bool IsOverdue(Clock::time_point now, Clock::duration limit) const;

 private:
  FileDescriptor socket_;
  State state_ = State::kReceiving;
  std::string line_;
  std::string reply_;
  size_t sent_ = 0;
  size_t drained_ = 0;
  bool drains_ = false;
  Clock::time_point stateBegin_;
  Clock::time_point lastBytes_;
};

}  // namespace vela
