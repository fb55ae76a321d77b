#include "listening_socket.h"

#include <fcntl.h>
#include <pwd.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <systemd/sd-daemon.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "instance_lock.h"
#include "log.h"

namespace vela {

namespace {

constexpr int kBacklog = 4096;
constexpr mode_t kSocketMode = 0660;
constexpr int kBindTries = 100;

std::string ErrorAt(const std::string& what, int error) {
  return what + ": " + std::strerror(error);
}

bool MakeAddress(const std::string& path, sockaddr_un& address) {
  address = {};
  address.sun_family = AF_UNIX;
  if (path.size() >= sizeof address.sun_path) return false;
  std::memcpy(address.sun_path, path.data(), path.size());
  return true;
}

FileDescriptor MakeSocket() {
  return FileDescriptor(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
}

const sockaddr* Generic(const sockaddr_un& address) {
  return reinterpret_cast<const sockaddr*>(&address);
}

/// Returns 0 when somebody listens at the address, else an errno value.
int TryConnect(const sockaddr_un& address) {
  const FileDescriptor probe = MakeSocket();
  if (!probe.IsOpen()) return errno;
  const bool isConnected = connect(probe.Get(), Generic(address), sizeof address) == 0;
  // A queue that is full is also somebody's.
  return isConnected || errno == EAGAIN ? 0 : errno;
}

std::string NameOf(uid_t user) {
  const passwd* entry = getpwuid(user);
  return entry == nullptr ? std::to_string(user) : entry->pw_name;
}

/// A directory may be full, and to empty it is to follow its owner wherever he leads.
bool MoveAside(const std::string& path) {
  std::string place = path + ".XXXXXX";
  if (mkdtemp(place.data()) == nullptr) return false;
  if (rename(path.c_str(), (place + "/moved").c_str()) == 0) return true;
  const int error = errno;
  rmdir(place.c_str());
  errno = error;
  return false;
}

/// The socket's directory is open to all: whoever is there first must not keep root's daemon out,
/// nor answer in its place.
std::string Evict(const std::string& path, uid_t owner) {
  LogLine(LogLevel::kWarning, "socket").Add("replaced", path).Add("owner", NameOf(owner)).Write();
  if (unlink(path.c_str()) == 0 || errno == ENOENT) return {};
  if (errno == EISDIR && MoveAside(path)) return {};
  return ErrorAt(path, errno);
}

/// Makes room at the path, at the cost of nothing that is of use to anybody.
std::string ClearPath(const std::string& path, const sockaddr_un& address) {
  struct stat status;
  if (lstat(path.c_str(), &status) != 0) {
    return errno == ENOENT ? std::string() : ErrorAt(path, errno);
  }
  if (geteuid() == 0 && status.st_uid != 0) return Evict(path, status.st_uid);
  if (!S_ISSOCK(status.st_mode)) return path + " is something else than a socket";
  const int error = TryConnect(address);
  if (error == 0) return "another instance listens at " + path;
  if (error != ECONNREFUSED) return error == ENOENT ? std::string() : ErrorAt(path, error);
  return unlink(path.c_str()) == 0 || errno == ENOENT ? std::string() : ErrorAt(path, errno);
}

/// Who starts it by hand as an ordinary user keeps it to himself.
gid_t StandardGroup() {
  return geteuid() == 0 ? 0 : getegid();
}

/// Nobody can connect before the owners are right.
int BindClosed(int fd, const sockaddr_un& address) {
  const mode_t mask = umask(0177);
  const int error = bind(fd, Generic(address), sizeof address) == 0 ? 0 : errno;
  umask(mask);
  return error;
}

}  // namespace

std::string ListeningSocket::TakeFromManager(bool& isTaken) {
  isTaken = false;
  const int count = sd_listen_fds(1);
  if (count < 0) return ErrorAt("sockets from the service manager", -count);
  if (count == 0) return {};
  if (count > 1) return "the service manager handed over more than one socket";
  socket_ = FileDescriptor(SD_LISTEN_FDS_START);
  const int isRight = sd_is_socket(socket_.Get(), AF_UNIX, SOCK_STREAM, 1);
  if (isRight <= 0) return "the service manager handed over no listening local socket";
  const int flags = fcntl(socket_.Get(), F_GETFL);
  if (flags < 0 || fcntl(socket_.Get(), F_SETFL, flags | O_NONBLOCK) != 0) {
    return ErrorAt("the socket from the service manager", errno);
  }
  isTaken = true;
  return {};
}

std::string ListeningSocket::Address() const {
  sockaddr_un address{};
  socklen_t size = sizeof address;
  auto* generic = reinterpret_cast<sockaddr*>(&address);
  if (getsockname(socket_.Get(), generic, &size) != 0) return {};
  const size_t length = std::min<size_t>(size, sizeof address) - offsetof(sockaddr_un, sun_path);
  const std::string name(address.sun_path, length);
  // A name that is in no directory begins with NUL and may have more of them.
  if (!name.empty() && name[0] == '\0') return '@' + name.substr(1);
  return name.substr(0, name.find('\0'));
}

std::string ListeningSocket::Bind(const std::string& path) {
  sockaddr_un address;
  if (!MakeAddress(path, address)) return ErrorAt(path, ENAMETOOLONG);
  socket_ = MakeSocket();
  if (!socket_.IsOpen()) return ErrorAt("socket", errno);
  // Another user can be quicker than the daemon, but not each time.
  int error = EADDRINUSE;
  for (int i = 0; i < kBindTries && error == EADDRINUSE; ++i) {
    const std::string problem = ClearPath(path, address);
    if (!problem.empty()) return problem;
    error = BindClosed(socket_.Get(), address);
  }
  return error == 0 ? std::string() : ErrorAt(path, error);
}

std::string ListeningSocket::Make(const std::string& path, std::optional<gid_t> group) {
  std::string problem = LockSocket(path, lock_);
  if (problem.empty()) problem = Bind(path);
  if (!problem.empty()) return problem;
  struct stat status;
  if (lstat(path.c_str(), &status) != 0) return ErrorAt(path, errno);
  path_ = path;
  device_ = status.st_dev;
  inode_ = status.st_ino;
  const bool isReady = lchown(path.c_str(), geteuid(), group.value_or(StandardGroup())) == 0 &&
                       chmod(path.c_str(), kSocketMode) == 0 &&
                       listen(socket_.Get(), kBacklog) == 0;
  return isReady ? std::string() : ErrorAt(path, errno);
}

bool ListeningSocket::Unlink() {
  if (path_.empty()) return false;
  struct stat status;
  const bool isOwn =
      lstat(path_.c_str(), &status) == 0 && status.st_dev == device_ && status.st_ino == inode_;
  if (isOwn) unlink(path_.c_str());
  path_.clear();
  lock_.Close();
  return true;
}

}  // namespace vela
