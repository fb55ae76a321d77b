// The socket that clients connect to.
#pragma once

#include <sys/types.h>

#include <string>

#include "thumb/descriptor.h"

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

  /// Makes a socket at `path` that root and the group `group` (a name; empty: root's) may use, and
  /// nobody else. A socket that is there and that nobody listens at is replaced; anything else is
  /// left alone and an error. Must run while the process has one thread. Returns what went wrong.
  std::string Make(const std::string& path, const std::string& group);

  int Fd() const { return socket_.Get(); }

  /// Takes a socket that Make made away from its path, unless another one is there by now. Who is
  /// connected stays so. Returns whether Make had made it.
  bool Unlink();

  void Close() { socket_.Close(); }

 private:
  Descriptor socket_;
  std::string path_;  ///< empty: not made here
  dev_t device_ = 0;
  ino_t inode_ = 0;
};
