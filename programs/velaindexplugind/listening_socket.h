// The socket that clients connect to.
#pragma once

#include <sys/types.h>

#include <optional>
#include <string>

#include "posix/file_descriptor.h"

namespace vela {

/// A listening socket: handed over by the service manager, or made at a path and removed again.
class ListeningSocket {
 public:
  ListeningSocket() = default;
  ~ListeningSocket() { Unlink(); }
  ListeningSocket(const ListeningSocket&) = delete;
  ListeningSocket& operator=(const ListeningSocket&) = delete;

  /// Takes the socket that the service manager handed over, if it did. `isTaken` tells. Returns
  /// what went wrong, empty when nothing did.
  std::string TakeFromManager(bool& isTaken);

  /// Makes a socket at `path` that its owner and the group `group` (nothing: root's for root, else
  /// the process's) may use, and nobody else. A socket that is there and that nobody listens at is
  /// replaced, and for root whatever somebody else has put there, which is logged; anything else is
  /// left alone and an error, as is another process that does the same. Must run while the process
  /// has one thread. Returns what went wrong.
  std::string Make(const std::string& path, std::optional<gid_t> group);

  int Fd() const { return socket_.Get(); }

  /// Returns where clients connect to, empty when that cannot be told.
  std::string Address() const;

  /// Takes a socket that Make made away from its path, unless another one is there by now. Who is
  /// connected stays so. Returns whether Make had made it.
  bool Unlink();

  void Close() { socket_.Close(); }

 private:
  std::string Bind(const std::string& path);

  FileDescriptor socket_;
  FileDescriptor lock_;  ///< open while path_ is the object's own to make and remove
  std::string path_;     ///< empty: not made here
  dev_t device_ = 0;
  ino_t inode_ = 0;
};

}  // namespace vela
