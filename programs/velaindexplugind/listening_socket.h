// The socket that clients connect to.
#pragma once

#include <optional>
#include <string>

#include "posix/accounts.h"
#include "posix/file_descriptor.h"
#include "start_problem.h"

namespace vela {

/// A listening socket, either passed by the service manager or created at a path and removed again.
class ListeningSocket {
 public:
  ListeningSocket() = default;
  ~ListeningSocket() { Unlink(); }
  ListeningSocket(const ListeningSocket&) = delete;
  ListeningSocket& operator=(const ListeningSocket&) = delete;

  /// Takes the socket passed by the service manager; `isTaken` is false when there is none.
  StartProblem TakeFromManager(bool& isTaken);

  /// Creates a socket at `path` for its owner and `group` only; the default group is root's for
  /// root, otherwise that of the process. A socket at which no process listens is replaced. Root
  /// also replaces whatever another user has created there, and logs that. Anything else at the
  /// path is an error and left unchanged; so is another process that is creating a socket there.
  /// Must be called while the process has a single thread.
  StartProblem Make(const std::string& path, std::optional<gid_t> group);

  int Fd() const { return socket_.Get(); }

  /// Returns the address that clients connect to, empty when it is unknown.
  std::string Address() const;

  /// Returns whether the file at that address has another group than `group`.
  bool HasOtherGroup(gid_t group) const;

  /// Removes a socket created by Make from its path, unless another one has replaced it. Existing
  /// connections stay open. Returns whether the socket was created by Make.
  bool Unlink();

  void Close() { socket_.Close(); }

 private:
  StartProblem Bind(const std::string& path);

  FileDescriptor socket_;
  FileDescriptor lock_;  ///< held while this object may create and remove path_
  std::string path_;     ///< empty: not created by this object
  dev_t device_ = 0;
  ino_t inode_ = 0;
};

}  // namespace vela
