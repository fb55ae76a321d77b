// One client's connection: a request line in, a reply line out.
#pragma once

#include <chrono>
#include <string>
#include <string_view>

#include "posix/file_descriptor.h"

namespace vela {

/// A connection whose socket never blocks. Knows nothing of when it is called.
class Connection {
 public:
  using Clock = std::chrono::steady_clock;

  enum class State {
    kReceiving,  ///< the request is not yet whole
    kWorking,    ///< the request is being carried out
    kSending,    ///< the reply is on its way
    kDraining,   ///< the reply is sent, the client is still writing
  };

  enum class Received {
    kMore,     ///< the line is not yet whole
    kLine,     ///< Line() is there
    kTooLong,  ///< the line is longer than a request may be
    kEnd,      ///< the client has gone without a request, or the socket has failed
  };

  enum class Sent {
    kMore,  ///< the client must take some of it first
    kAll,
    kEnd,  ///< the client has gone
  };

  Connection(FileDescriptor socket, Clock::time_point now);

  int Fd() const { return socket_.Get(); }
  State GetState() const { return state_; }

  /// Receives what is there. What a client leaves without a newline when it closes its side counts
  /// as a line.
  Received Receive(Clock::time_point now);

  /// The request line without its newline.
  std::string_view Line() const { return line_; }

  void BeginWork() { state_ = State::kWorking; }

  /// Takes the reply that Send sends. With `drains`, the client is still writing its request: its
  /// bytes are thrown away afterwards, so that the reply reaches it.
  void BeginReply(std::string reply, bool drains, Clock::time_point now);

  /// Sends as much as the client takes.
  Sent Send(Clock::time_point now);

  /// Throws away what is there, after Send. Returns false when the client has gone or has been
  /// writing for too long.
  bool Drain();

  /// Returns whether the client has kept still for `limit`, or has kept the daemon busy with one
  /// request line or reply for several times that. Never while its request is carried out.
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
