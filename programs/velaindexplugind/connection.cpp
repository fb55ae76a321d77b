#include "connection.h"

#include <sys/socket.h>

#include <array>
#include <cerrno>
#include <utility>

#include "request.h"

namespace vela {

namespace {

constexpr size_t kChunkSize = 16384;

/// How often a client may be slow by its limit in one request or reply.
constexpr int kSlowness = 4;

/// How much of a request that is too long is taken off the client.
constexpr size_t kDrainMax = 16 * 1024 * 1024;

using Chunk = std::array<char, kChunkSize>;

/// Returns the bytes received, 0 at the end of the connection or after a failure, -1 when there is
/// nothing yet.
ssize_t ReceiveChunk(int fd, Chunk& chunk) {
  for (;;) {
    const ssize_t got = recv(fd, chunk.data(), chunk.size(), MSG_DONTWAIT);
    if (got >= 0) return got;
    if (errno == EAGAIN) return -1;
    if (errno != EINTR) return 0;
  }
}

}  // namespace

Connection::Connection(FileDescriptor socket, Clock::time_point now)
    : socket_(std::move(socket)), stateBegin_(now), lastBytes_(now) {}

Connection::Received Connection::Receive(Clock::time_point now) {
  Chunk chunk;
  for (;;) {
    const ssize_t got = ReceiveChunk(Fd(), chunk);
    if (got < 0) return Received::kMore;
    if (got == 0) return line_.empty() ? Received::kEnd : Received::kLine;
    lastBytes_ = now;
    const std::string_view piece(chunk.data(), static_cast<size_t>(got));
    const size_t newline = piece.find('\n');
    line_.append(piece.substr(0, newline));
    if (line_.size() > kRequestMax) return Received::kTooLong;
    if (newline != std::string_view::npos) return Received::kLine;
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
    const ssize_t count =
        send(Fd(), reply_.data() + sent_, reply_.size() - sent_, MSG_NOSIGNAL | MSG_DONTWAIT);
    if (count >= 0) {
      sent_ += static_cast<size_t>(count);
      lastBytes_ = now;
    } else if (errno == EAGAIN) {
      return Sent::kMore;
    } else if (errno != EINTR) {
      return Sent::kEnd;
    }
  }
  if (!drains_) return Sent::kAll;
  shutdown(Fd(), SHUT_WR);
  state_ = State::kDraining;
  stateBegin_ = now;
  return Sent::kMore;
}

bool Connection::Drain() {
  Chunk chunk;
  for (;;) {
    const ssize_t got = ReceiveChunk(Fd(), chunk);
    if (got < 0) return true;
    drained_ += static_cast<size_t>(got);
    if (got == 0 || drained_ > kDrainMax) return false;
  }
}

bool Connection::IsOverdue(Clock::time_point now, Clock::duration limit) const {
  if (state_ == State::kWorking) return false;
  if (state_ == State::kDraining) return now - stateBegin_ >= limit;
  return now - lastBytes_ >= limit || now - stateBegin_ >= limit * kSlowness;
}

}  // namespace vela
