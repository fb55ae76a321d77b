#include "posix/local_socket.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/stat.h>
#include <sys/time.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstring>

#include "posix/event_wait.h"

namespace vela {

namespace {

/// Returns false for a path that an address cannot hold.
bool MakeAddress(std::string_view path, sockaddr_un& address) {
  address = {};
  address.sun_family = AF_UNIX;
  if (!FitsLocalAddress(path)) {
    return false;
  }
  std::memcpy(address.sun_path, path.data(), path.size());
  return true;
}

int ConnectTo(int socket, const sockaddr_un& address) {
  const auto* generic = reinterpret_cast<const sockaddr*>(&address);
  return connect(socket, generic, sizeof(address)) == 0 ? 0 : errno;
}

/// A message of one part, with room for one descriptor.
class DescriptorMessage {
 public:
  DescriptorMessage(void* bytes, size_t size) : part_{bytes, size} {
    header_.msg_iov = &part_;
    header_.msg_iovlen = 1;
    header_.msg_control = control_;
    header_.msg_controllen = sizeof control_;
  }
  DescriptorMessage(const DescriptorMessage&) = delete;
  DescriptorMessage& operator=(const DescriptorMessage&) = delete;

  msghdr* Header() { return &header_; }

  void Attach(int fd) {
    cmsghdr* const item = CMSG_FIRSTHDR(&header_);
    item->cmsg_level = SOL_SOCKET;
    item->cmsg_type = SCM_RIGHTS;
    item->cmsg_len = CMSG_LEN(sizeof fd);
    std::memcpy(CMSG_DATA(item), &fd, sizeof fd);
  }

  /// Returns the descriptor that has come with the message.
  FileDescriptor Detach() {
    const cmsghdr* const item = CMSG_FIRSTHDR(&header_);
    int fd = -1;
    if (item != nullptr && item->cmsg_level == SOL_SOCKET && item->cmsg_type == SCM_RIGHTS &&
        item->cmsg_len == CMSG_LEN(sizeof fd)) {
      std::memcpy(&fd, CMSG_DATA(item), sizeof fd);
    }
    return FileDescriptor(fd);
  }

 private:
  iovec part_;
  msghdr header_ = {};
  alignas(cmsghdr) char control_[CMSG_SPACE(sizeof(int))] = {};
};

bool IsOver(const Deadline& deadline) {
  return deadline.Left() == std::chrono::nanoseconds::zero();
}

bool SetBlocking(int socket, bool isBlocking) {
  return fcntl(socket, F_SETFL, isBlocking ? 0 : O_NONBLOCK) == 0;
}

/// Limits how long a connect on this socket may block.
bool LimitConnect(int socket, const Deadline& deadline) {
  // Zero would mean no limit.
  const auto left = std::max(std::chrono::ceil<std::chrono::microseconds>(deadline.Left()),
                             std::chrono::microseconds(1));
  timeval limit;
  limit.tv_sec = static_cast<time_t>(left.count() / 1000000);
  limit.tv_usec = static_cast<suseconds_t>(left.count() % 1000000);
  return setsockopt(socket, SOL_SOCKET, SO_SNDTIMEO, &limit, sizeof(limit)) == 0;
}

/// Waits for a place in the listener's queue. Only a blocking connect can wait for that.
int ConnectBlocking(int socket, const sockaddr_un& address, const Deadline& deadline) {
  if (!SetBlocking(socket, true)) {
    return errno;
  }
  int error = EAGAIN;
  while ((error == EAGAIN || error == EINTR) && !IsOver(deadline)) {
    if (!LimitConnect(socket, deadline)) {
      return errno;
    }
    error = ConnectTo(socket, address);
  }
  if (error != 0) {
    return error == EAGAIN || error == EINTR ? ETIMEDOUT : error;
  }
  return SetBlocking(socket, false) ? 0 : errno;
}

int ConnectWithin(int socket, const std::string& path, const Deadline& deadline) {
  sockaddr_un address;
  if (!MakeAddress(path, address)) {
    return ENAMETOOLONG;
  }
  const int error = ConnectTo(socket, address);
  const bool isQueueFull = error == EAGAIN || error == EINTR;
  return isQueueFull ? ConnectBlocking(socket, address, deadline) : error;
}

bool IsTrusted(uid_t user) {
  return user == 0 || user == geteuid();
}

/// Opens the file at the path without using it. Returns 0 or an errno value.
int OpenPlace(const char* path, int links, FileDescriptor& place, struct stat& status) {
  place.Reset(open(path, O_PATH | O_CLOEXEC | links));
  return place.IsOpen() && fstat(place.Get(), &status) == 0 ? 0 : errno;
}

/// Finds the socket of a trusted user. It is examined before the connection is made: a listener
/// that accepts nothing would keep the client waiting without saying who it is. Returns 0 or an
/// errno value, ECONNREFUSED when anything else is at the path.
int FindTrustedSocket(const char* path, FileDescriptor& place) {
  struct stat status = {};
  int error = OpenPlace(path, O_NOFOLLOW, place, status);
  if (error == 0 && S_ISLNK(status.st_mode) && IsTrusted(status.st_uid)) {
    error = OpenPlace(path, 0, place, status);
  }
  if (error != 0) {
    return error;
  }
  return S_ISSOCK(status.st_mode) && IsTrusted(status.st_uid) ? 0 : ECONNREFUSED;
}

}  // namespace

FileDescriptor MakeLocalSocket() {
  return FileDescriptor(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
}

bool FitsLocalAddress(std::string_view path) {
  return !path.empty() && path.size() < sizeof(sockaddr_un::sun_path);
}

int ConnectNow(int socket, std::string_view path) {
  sockaddr_un address;
  return MakeAddress(path, address) ? ConnectTo(socket, address) : ENAMETOOLONG;
}

int OpenConnection(const char* path, const Deadline& deadline, FileDescriptor& connection) {
  if (!FitsLocalAddress(path)) {
    return ENAMETOOLONG;
  }
  FileDescriptor place;
  int error = FindTrustedSocket(path, place);
  if (error != 0) {
    return error;
  }
  connection = MakeLocalSocket();
  if (!connection.IsOpen()) {
    return errno;
  }
  // The socket that was examined, whatever is at the path now.
  error = ConnectWithin(connection.Get(), "/proc/self/fd/" + std::to_string(place.Get()), deadline);
  if (error == ENOENT) {
    error = ConnectWithin(connection.Get(), path, deadline);  // without a /proc
  }
  const std::optional<ucred> peer = error == 0 ? PeerOf(connection.Get()) : std::nullopt;
  if (peer && IsTrusted(peer->uid)) {
    return 0;
  }
  connection.Reset();
  return error != 0 ? error : ECONNREFUSED;
}

int BindLocal(int socket, std::string_view path) {
  sockaddr_un address;
  if (!MakeAddress(path, address)) {
    return ENAMETOOLONG;
  }
  const auto* generic = reinterpret_cast<const sockaddr*>(&address);
  return bind(socket, generic, sizeof(address)) == 0 ? 0 : errno;
}

FileDescriptor AcceptLocal(int listener) {
  return FileDescriptor(accept4(listener, nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK));
}

int SendNow(int socket, std::string_view bytes, size_t& sent) {
  for (;;) {
    const ssize_t count = send(socket, bytes.data(), bytes.size(), MSG_NOSIGNAL | MSG_DONTWAIT);
    if (count >= 0) {
      sent = static_cast<size_t>(count);
      return 0;
    }
    if (errno != EINTR) {
      return errno;
    }
  }
}

int SendAll(int socket, std::string_view bytes, const Deadline& deadline) {
  while (!bytes.empty()) {
    size_t sent = 0;
    int error = SendNow(socket, bytes, sent);
    if (error == EAGAIN) {
      error = AwaitEvent(socket, POLLOUT, deadline);
    }
    if (error != 0) {
      return error;
    }
    bytes.remove_prefix(sent);
    if (IsOver(deadline) && !bytes.empty()) {
      return ETIMEDOUT;
    }
  }
  return 0;
}

int ReceiveNow(int socket, char* buffer, size_t size, size_t& got) {
  for (;;) {
    const ssize_t count = recv(socket, buffer, size, MSG_DONTWAIT);
    if (count >= 0) {
      got = static_cast<size_t>(count);
      return 0;
    }
    if (errno != EINTR) {
      return errno;
    }
  }
}

int ReceiveSome(int socket, char* buffer, size_t size, const Deadline& deadline, size_t& got) {
  for (;;) {
    int error = AwaitEvent(socket, POLLIN, deadline);
    if (error == 0) {
      error = ReceiveNow(socket, buffer, size, got);
    }
    if (error != EAGAIN) {
      return error;
    }
  }
}

MessageSockets ConnectMessageSockets() {
  int ends[2] = {-1, -1};
  if (socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0, ends) != 0) {
    return {};
  }
  return {FileDescriptor(ends[0]), FileDescriptor(ends[1])};
}

int SendDescriptor(int socket, std::string_view message, int fd) {
  std::string bytes(message);
  DescriptorMessage packed(bytes.data(), bytes.size());
  packed.Attach(fd);
  for (;;) {
    if (sendmsg(socket, packed.Header(), MSG_NOSIGNAL | MSG_DONTWAIT) >= 0) {
      return 0;
    }
    if (errno != EINTR) {
      return errno;
    }
  }
}

int LimitReceiving(int socket, std::chrono::seconds limit) {
  timeval time = {};
  time.tv_sec = static_cast<time_t>(limit.count());
  return setsockopt(socket, SOL_SOCKET, SO_RCVTIMEO, &time, sizeof time) == 0 ? 0 : errno;
}

int ReceiveDescriptor(int socket, char* buffer, size_t size, size_t& got, FileDescriptor& fd) {
  for (;;) {
    DescriptorMessage packed(buffer, size);
    const ssize_t count = recvmsg(socket, packed.Header(), MSG_CMSG_CLOEXEC);
    if (count >= 0) {
      got = static_cast<size_t>(count);
      fd = packed.Detach();
      return 0;
    }
    if (errno != EINTR) {
      return errno;
    }
  }
}

void EndSending(int socket) {
  shutdown(socket, SHUT_WR);
}

std::optional<ucred> PeerOf(int socket) {
  ucred peer{};
  socklen_t size = sizeof(peer);
  if (socket < 0 || getsockopt(socket, SOL_SOCKET, SO_PEERCRED, &peer, &size) != 0) {
    return {};
  }
  return peer;
}

std::string LocalAddressOf(int socket) {
  sockaddr_un address{};
  socklen_t size = sizeof(address);
  auto* generic = reinterpret_cast<sockaddr*>(&address);
  if (getsockname(socket, generic, &size) != 0) {
    return {};
  }
  const size_t length = std::min<size_t>(size, sizeof(address)) - offsetof(sockaddr_un, sun_path);
  const std::string name(address.sun_path, length);
  // A name in the abstract namespace begins with NUL and may contain more of them.
  if (!name.empty() && name[0] == '\0') {
    return '@' + name.substr(1);
  }
  return name.substr(0, name.find('\0'));
}

}  // namespace vela
