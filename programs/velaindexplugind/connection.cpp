#include "connection.h"

#include <array>
#include <cerrno>
#include <utility>

#include "posix/local_socket.h"
#include "request.h"

namespace vela {

namespace {

constexpr size_t kChunkSize = 16384;

/// How many times its idle limit a client may take for one request or reply.
constexpr int kSlowClientFactor = 4;

/// How much of an overlong request is received and discarded.
constexpr size_t kDrainMax = 16 * 1024 * 1024;

using Chunk = std::array<char, kChunkSize>;

/// Returns false when nothing has arrived. `piece` is what has, empty at the end of the connection
/// or after a failure; it points into `chunk`.
bool ReceivePiece(int fd, Chunk& chunk, std::string_view& piece) {
  size_t got = 0;
  const int error = ReceiveNow(fd, chunk.data(), chunk.size(), got);
  if (error == EAGAIN) {
    return false;
  }
  piece = {chunk.data(), error == 0 ? got : 0};
  return true;
}

}  // namespace

Connection::Connection(FileDescriptor socket, Clock::time_point now)
    : socket_(std::move(socket)), stateBegin_(now), lastBytes_(now) {}

Connection::Received Connection::Receive(Clock::time_point now) {
  Chunk chunk;
  for (;;) {
    std::string_view piece;
    if (!ReceivePiece(Fd(), chunk, piece)) {
      return Received::kMore;
    }
    if (piece.empty()) {
      return line_.empty() ? Received::kEnd : Received::kLine;
    }
    lastBytes_ = now;
    const size_t newline = piece.find('\n');
    line_.append(piece.substr(0, newline));
    if (line_.size() > kRequestMax) {
      return Received::kTooLong;
    }
    if (newline != std::string_view::npos) {
      return Received::kLine;
    }
  }
}

void Connection::BeginReply(std::string reply, bool drains, Clock::time_point now) {
  reply_ = std::move(reply);
  drains_ = drains;
  state_ = State::kSending;
  stateBegin_ = lastBytes_ = now;
  line_ = {};
}

Connection::Sent Connection::Send(Clock::time_point now) {
  while (sent_ < reply_.size()) {
    size_t count = 0;
    const int error = SendNow(Fd(), std::string_view(reply_).substr(sent_), count);
    if (error == EAGAIN) {
      return Sent::kMore;
    }
    if (error != 0) {
      return Sent::kEnd;
    }
    sent_ += count;
    lastBytes_ = now;
  }
  if (!drains_) {
    return Sent::kAll;
  }
  EndSending(Fd());
  state_ = State::kDraining;
  stateBegin_ = now;
  return Sent::kMore;
}

bool Connection::Drain() {
  Chunk chunk;
  for (;;) {
    std::string_view piece;
    if (!ReceivePiece(Fd(), chunk, piece)) {
      return true;
    }
    drained_ += piece.size();
    if (piece.empty() || drained_ > kDrainMax) {
      return false;
    }
  }
}

bool Connection::IsOverdue(Clock::time_point now, Clock::duration limit) const {
  if (state_ == State::kWorking) {
    return false;
  }
  if (state_ == State::kDraining) {
    return now - stateBegin_ >= limit;
  }
  return now - lastBytes_ >= limit || now - stateBegin_ >= limit * kSlowClientFactor;
}

}  // namespace vela
