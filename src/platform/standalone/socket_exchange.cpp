#include <fcntl.h>
#include <json/value.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/time.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <exception>
#include <string>
#include <string_view>
#include <utility>

#include "platform/standalone/last_error.h"
#include "platform/standalone/strict_json.h"
#include "platform/velaindex.h"
#include "posix/deadline.h"
#include "posix/file_descriptor.h"

namespace {

using vela::Deadline;
using vela::FileDescriptor;

constexpr size_t kReplyMax = 16 * 1024 * 1024;
constexpr size_t kChunkSize = 16384;

/// Returns false for a path that a socket address cannot hold.
bool MakeAddress(std::string_view path, sockaddr_un& address) {
  memset(&address, 0, sizeof(address));
  address.sun_family = AF_UNIX;
  if (path.empty() || path.size() >= sizeof(address.sun_path)) return false;
  memcpy(address.sun_path, path.data(), path.size());
  return true;
}

bool IsOver(const Deadline& deadline) {
  return deadline.Left() == std::chrono::nanoseconds::zero();
}

int ConnectOnce(int fd, const sockaddr_un& address) {
  const auto* generic = reinterpret_cast<const sockaddr*>(&address);
  return connect(fd, generic, sizeof(address)) == 0 ? 0 : errno;
}

bool SetBlocking(int fd, bool isBlocking) {
  return fcntl(fd, F_SETFL, isBlocking ? 0 : O_NONBLOCK) == 0;
}

/// The longest time that a connect on this socket may take.
bool LimitConnect(int fd, const Deadline& deadline) {
  // Zero would stand for no limit.
  const auto left = std::max(std::chrono::ceil<std::chrono::microseconds>(deadline.Left()),
                             std::chrono::microseconds(1));
  timeval limit;
  limit.tv_sec = static_cast<time_t>(left.count() / 1000000);
  limit.tv_usec = static_cast<suseconds_t>(left.count() % 1000000);
  return setsockopt(fd, SOL_SOCKET, SO_SNDTIMEO, &limit, sizeof(limit)) == 0;
}

/// Waits for a place in the daemon's queue of connections. Nothing but a connect that blocks can
/// wait for that.
int ConnectWaiting(int fd, const sockaddr_un& address, const Deadline& deadline) {
  if (!SetBlocking(fd, true)) return errno;
  int error = EAGAIN;
  while ((error == EAGAIN || error == EINTR) && !IsOver(deadline)) {
    if (!LimitConnect(fd, deadline)) return errno;
    error = ConnectOnce(fd, address);
  }
  if (error != 0) return error == EAGAIN || error == EINTR ? ETIMEDOUT : error;
  return SetBlocking(fd, false) ? 0 : errno;
}

/// Returns 0 and the connection, or an errno value.
int Connect(const char* path, const Deadline& deadline, FileDescriptor& connection) {
  sockaddr_un address;
  if (!MakeAddress(path, address)) return ENAMETOOLONG;
  // Where no daemon runs this is asked once a photo: find out before making a socket for nothing.
  if (access(path, F_OK) != 0) return errno;
  connection.Reset(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
  if (!connection.IsOpen()) return errno;
  const int error = ConnectOnce(connection.Get(), address);
  const bool isQueueFull = error == EAGAIN || error == EINTR;
  return isQueueFull ? ConnectWaiting(connection.Get(), address, deadline) : error;
}

/// Waits for one of the poll `events`. Returns 0 or an errno value.
int Await(int fd, short events, const Deadline& deadline) {
  pollfd entry{fd, events, 0};
  for (;;) {
    const int ready = poll(&entry, 1, deadline.PollMilliseconds());
    if (ready > 0) return 0;
    if (ready < 0 && errno != EINTR) return errno;
    if (IsOver(deadline)) return ETIMEDOUT;
  }
}

/// Returns 0 or an errno value.
int Send(int fd, std::string_view text, const Deadline& deadline) {
  while (!text.empty()) {
    const ssize_t sent = send(fd, text.data(), text.size(), MSG_NOSIGNAL);
    if (sent >= 0) {
      text.remove_prefix(static_cast<size_t>(sent));
    } else if (errno == EAGAIN) {
      const int error = Await(fd, POLLOUT, deadline);
      if (error != 0) return error;
    } else if (errno != EINTR) {
      return errno;
    }
    if (IsOver(deadline) && !text.empty()) return ETIMEDOUT;
  }
  return 0;
}

/// Receives what is there after waiting for it; `got` is 0 at the end of the connection. Returns 0
/// or an errno value.
int ReceiveChunk(int fd, char* chunk, const Deadline& deadline, size_t& got) {
  for (;;) {
    const int error = Await(fd, POLLIN, deadline);
    if (error != 0) return error;
    const ssize_t received = recv(fd, chunk, kChunkSize, 0);
    if (received >= 0) {
      got = static_cast<size_t>(received);
      return 0;
    }
    if (errno != EINTR && errno != EAGAIN) return errno;
  }
}

/// Receives up to the newline or the end of the connection. Returns 0 or an errno value.
int ReceiveLine(int fd, const Deadline& deadline, std::string& line) {
  char chunk[kChunkSize];
  for (;;) {
    size_t got = 0;
    const int error = ReceiveChunk(fd, chunk, deadline, got);
    if (error != 0) return error;
    if (got == 0) return 0;
    const std::string_view piece(chunk, got);
    const size_t newline = piece.find('\n');
    line.append(piece.substr(0, newline));
    if (line.size() > kReplyMax) return EMSGSIZE;
    if (newline != std::string_view::npos) return 0;
    // One byte at a time, a peer could keep this going without ever letting a wait run out.
    if (IsOver(deadline)) return ETIMEDOUT;
  }
}

/// Returns 0 and the reply, or an errno value.
int Exchange(const char* socketPath, const Json::Value& request, const Deadline& deadline,
             Json::Value& reply) {
  FileDescriptor connection;
  int error = Connect(socketPath, deadline, connection);
  if (error != 0) return error;
  std::string line;
  if (!vela::WriteJsonLine(request, line)) return EINVAL;
  error = Send(connection.Get(), line, deadline);
  if (error != 0) return error;
  line.clear();
  error = ReceiveLine(connection.Get(), deadline, line);
  if (error != 0) return error;
  connection.Reset();
  if (line.empty()) return ECONNRESET;
  return vela::ReadJsonObject(line, vela::DuplicateKeys::kLastWins, reply) ? 0 : EPROTO;
}

int ExchangeOrFail(const char* socketPath, Json::Value& packet, int timeoutSeconds) {
  try {
    const Deadline deadline{std::chrono::seconds(std::max(timeoutSeconds, 0))};
    Json::Value reply(Json::objectValue);
    const int error = Exchange(socketPath, packet, deadline, reply);
    if (error == 0) packet = std::move(reply);
    return error;
  } catch (const std::exception&) {
    return ENOMEM;
  }
}

}  // namespace

int AutoSendRecvPacket(const char* socketPath, int /*unused*/, Json::Value& packet,
                       int timeoutSeconds) {
  const int error =
      socketPath == nullptr ? EINVAL : ExchangeOrFail(socketPath, packet, timeoutSeconds);
  if (error == 0) return 0;
  packet = Json::Value(Json::objectValue);
  return vela::Fail(error);
}
