#include "listening_socket.h"

#include <fcntl.h>
#include <grp.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <systemd/sd-daemon.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <vector>

namespace {

constexpr int kBacklog = 4096;
constexpr mode_t kSocketMode = 0660;

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

Descriptor MakeSocket() {
  return Descriptor(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
}

const sockaddr* Generic(const sockaddr_un& address) {
  return reinterpret_cast<const sockaddr*>(&address);
}

/// Returns 0 when somebody listens at the address, else an errno value.
int TryConnect(const sockaddr_un& address) {
  const Descriptor probe = MakeSocket();
  if (!probe.IsOpen()) return errno;
  const bool isConnected = connect(probe.Get(), Generic(address), sizeof address) == 0;
  // A queue that is full is also somebody's.
  return isConnected || errno == EAGAIN ? 0 : errno;
}

/// Makes room at the path, at the cost of nothing that is of use to anybody.
std::string ClearPath(const std::string& path, const sockaddr_un& address) {
  struct stat status;
  if (lstat(path.c_str(), &status) != 0) {
    return errno == ENOENT ? std::string() : ErrorAt(path, errno);
  }
  if (!S_ISSOCK(status.st_mode)) return path + " is something else than a socket";
  const int error = TryConnect(address);
  if (error == 0) return "another instance listens at " + path;
  if (error != ECONNREFUSED) return error == ENOENT ? std::string() : ErrorAt(path, error);
  return unlink(path.c_str()) == 0 || errno == ENOENT ? std::string() : ErrorAt(path, errno);
}

/// Returns what went wrong, empty when nothing did.
std::string FindGroup(const std::string& name, gid_t& id) {
  // Who starts it by hand as an ordinary user keeps it to himself.
  id = geteuid() == 0 ? 0 : getegid();
  if (name.empty()) return {};
  std::vector<char> text(16384);
  group entry{};
  group* found = nullptr;
  int error = getgrnam_r(name.c_str(), &entry, text.data(), text.size(), &found);
  while (error == ERANGE) {
    text.resize(text.size() * 2);
    error = getgrnam_r(name.c_str(), &entry, text.data(), text.size(), &found);
  }
  if (found == nullptr) return "there is no group " + name;
  id = entry.gr_gid;
  return {};
}

/// Nobody can connect before the owners are right.
int Bind(int fd, const sockaddr_un& address) {
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
  socket_ = Descriptor(SD_LISTEN_FDS_START);
  const int isRight = sd_is_socket(socket_.Get(), AF_UNIX, SOCK_STREAM, 1);
  if (isRight <= 0) return "the service manager handed over no listening local socket";
  const int flags = fcntl(socket_.Get(), F_GETFL);
  if (flags < 0 || fcntl(socket_.Get(), F_SETFL, flags | O_NONBLOCK) != 0) {
    return ErrorAt("the socket from the service manager", errno);
  }
  isTaken = true;
  return {};
}

std::string ListeningSocket::Make(const std::string& path, const std::string& group) {
  gid_t groupId = 0;
  std::string problem = FindGroup(group, groupId);
  if (!problem.empty()) return problem;
  sockaddr_un address;
  if (!MakeAddress(path, address)) return ErrorAt(path, ENAMETOOLONG);
  problem = ClearPath(path, address);
  if (!problem.empty()) return problem;
  socket_ = MakeSocket();
  if (!socket_.IsOpen()) return ErrorAt("socket", errno);
  const int error = Bind(socket_.Get(), address);
  if (error == EADDRINUSE) return "another instance is starting at " + path;
  if (error != 0) return ErrorAt(path, error);
  struct stat status;
  if (lstat(path.c_str(), &status) != 0) return ErrorAt(path, errno);
  path_ = path;
  device_ = status.st_dev;
  inode_ = status.st_ino;
  const bool isReady = lchown(path.c_str(), geteuid(), groupId) == 0 &&
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
  return true;
}
