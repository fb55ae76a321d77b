#include "listening_socket.h"

#include <fcntl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <systemd/sd-daemon.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>

#include "instance_lock.h"
#include "log.h"
#include "posix/accounts.h"
#include "posix/local_socket.h"

namespace vela {

namespace {

constexpr int kBacklog = 4096;
constexpr mode_t kSocketMode = 0660;
constexpr int kBindTries = 100;

/// Returns 0 when a process listens at the path, otherwise an errno value.
int TryConnect(const std::string& path) {
  const FileDescriptor probe = MakeLocalSocket();
  if (!probe.IsOpen()) {
    return errno;
  }
  const int error = ConnectNow(probe.Get(), path);
  // A socket with a full queue also belongs to a process.
  return error == EAGAIN ? 0 : error;
}

/// Moves a directory away instead of deleting it: deleting its content would mean following paths
/// that its owner controls.
bool MoveAside(const std::string& path) {
  std::string place = path + ".XXXXXX";
  if (mkdtemp(place.data()) == nullptr) {
    return false;
  }
  if (rename(path.c_str(), (place + "/moved").c_str()) == 0) {
    return true;
  }
  const int error = errno;
  rmdir(place.c_str());
  errno = error;
  return false;
}

/// All users can write to the directory of the socket. None of them must be able to keep root's
/// daemon from starting, or to answer in its place, by creating the socket first.
StartProblem Evict(const std::string& path, uid_t owner) {
  LogLine(LogLevel::kWarning, "socket").Add("replaced", path).Add("owner", UserName(owner)).Write();
  if (unlink(path.c_str()) == 0 || errno == ENOENT) {
    return {};
  }
  // The owner may have removed the directory meanwhile.
  if (errno == EISDIR && (MoveAside(path) || errno == ENOENT)) {
    return {};
  }
  return ProblemAt(path, errno);
}

/// Removes what is at the path, if it is not in use.
StartProblem ClearPath(const std::string& path) {
  struct stat status;
  if (lstat(path.c_str(), &status) != 0) {
    return errno == ENOENT ? StartProblem() : ProblemAt(path, errno);
  }
  if (EffectiveUser() == 0 && status.st_uid != 0) {
    return Evict(path, status.st_uid);
  }
  if (!S_ISSOCK(status.st_mode)) {
    return {path + " is not a socket", true};
  }
  const int error = TryConnect(path);
  if (error == 0) {
    return {"another instance listens at " + path};
  }
  if (error != ECONNREFUSED) {
    return error == ENOENT ? StartProblem() : ProblemAt(path, error);
  }
  return unlink(path.c_str()) == 0 || errno == ENOENT ? StartProblem() : ProblemAt(path, errno);
}

/// An ordinary user who starts the daemon keeps it private.
gid_t DefaultGroup() {
  return EffectiveUser() == 0 ? 0 : getegid();
}

/// Binds the socket so that no other user can connect before its group and mode are set.
int BindPrivately(int fd, const std::string& path) {
  const mode_t mask = umask(0177);
  const int error = BindLocal(fd, path);
  umask(mask);
  return error;
}

}  // namespace

StartProblem ListeningSocket::TakeFromManager(bool& isTaken) {
  isTaken = false;
  const int count = sd_listen_fds(1);
  if (count < 0) {
    return ProblemAt("sockets from the service manager", -count);
  }
  if (count == 0) {
    return {};
  }
  if (count > 1) {
    return {"the service manager passed more than one socket", true};
  }
  socket_ = FileDescriptor(SD_LISTEN_FDS_START);
  const int isRight = sd_is_socket(socket_.Get(), AF_UNIX, SOCK_STREAM, 1);
  if (isRight <= 0) {
    return {"the service manager passed something other than a listening local socket", true};
  }
  const int flags = fcntl(socket_.Get(), F_GETFL);
  if (flags < 0 || fcntl(socket_.Get(), F_SETFL, flags | O_NONBLOCK) != 0) {
    return ProblemAt("the socket from the service manager", errno);
  }
  isTaken = true;
  return {};
}

std::string ListeningSocket::Address() const {
  return LocalAddressOf(socket_.Get());
}

bool ListeningSocket::HasOtherGroup(gid_t group) const {
  struct stat status;
  return lstat(Address().c_str(), &status) == 0 && status.st_gid != group;
}

StartProblem ListeningSocket::Bind(const std::string& path) {
  if (!FitsLocalAddress(path)) {
    return ProblemAt(path, ENAMETOOLONG);
  }
  socket_ = MakeLocalSocket();
  if (!socket_.IsOpen()) {
    return ProblemAt("socket", errno);
  }
  // Another user may occupy the path again before the daemon binds it, but not every time.
  int error = EADDRINUSE;
  for (int i = 0; i < kBindTries && error == EADDRINUSE; ++i) {
    const StartProblem problem = ClearPath(path);
    if (!problem.IsNone()) {
      return problem;
    }
    error = BindPrivately(socket_.Get(), path);
  }
  return error == 0 ? StartProblem() : ProblemAt(path, error);
}

StartProblem ListeningSocket::Make(const std::string& path, std::optional<gid_t> group) {
  StartProblem problem = LockSocket(path, lock_);
  if (problem.IsNone()) {
    problem = Bind(path);
  }
  if (!problem.IsNone()) {
    return problem;
  }
  struct stat status;
  if (lstat(path.c_str(), &status) != 0) {
    return ProblemAt(path, errno);
  }
  path_ = path;
  device_ = status.st_dev;
  inode_ = status.st_ino;
  const bool isReady = lchown(path.c_str(), EffectiveUser(), group.value_or(DefaultGroup())) == 0 &&
                       chmod(path.c_str(), kSocketMode) == 0 &&
                       listen(socket_.Get(), kBacklog) == 0;
  return isReady ? StartProblem() : ProblemAt(path, errno);
}

bool ListeningSocket::Unlink() {
  if (path_.empty()) {
    return false;
  }
  struct stat status;
  const bool isOwn =
      lstat(path_.c_str(), &status) == 0 && status.st_dev == device_ && status.st_ino == inode_;
  if (isOwn) {
    unlink(path_.c_str());
  }
  path_.clear();
  lock_.Close();
  return true;
}

}  // namespace vela
