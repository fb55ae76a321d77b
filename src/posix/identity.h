// With whose rights this process accesses files.
//
// A program of root that works in a directory of another user can be led to files that the user
// must not reach. With the user's identity it can do there only what the user could do as well.
// Only the rights to files are exchanged: the process itself still belongs to root, so that the
// user can neither signal, trace nor slow it down, and can go back.
#pragma once

#include <sys/types.h>

#include <optional>
#include <string>
#include <vector>

namespace vela {

/// The rights of a user.
struct Identity {
  uid_t user = 0;
  gid_t group = 0;
  std::vector<gid_t> groups;  ///< supplementary groups
};

/// Returns the user and group that own the directory `path`, without supplementary groups; trusted
/// links are followed, and a directory that is held open is examined itself (see folder.h).
/// Nothing, with errno set, on failure.
std::optional<Identity> OwnerOf(const std::string& path);

/// Returns the identity that the user of `owner` has after a login: the account's group and its
/// supplementary groups. A user without an account, or whose account cannot be read, has no more
/// than `owner`. Not thread-safe.
Identity AccountIdentity(const Identity& owner);

/// As long as the object exists, this thread accesses files, and the programs that it starts run,
/// with another identity and without capabilities. At most one object at a time, in a process with
/// one thread.
class AssumedIdentity {
 public:
  /// Takes the identity, which only root can do.
  explicit AssumedIdentity(const Identity& identity);
  ~AssumedIdentity();
  AssumedIdentity(const AssumedIdentity&) = delete;
  AssumedIdentity& operator=(const AssumedIdentity&) = delete;

  /// Returns 0 when the identity has been taken, else an errno value.
  int Error() const { return error_; }

 private:
  int error_ = 0;
};

/// As long as the object exists, the process has its own identity in spite of an AssumedIdentity:
/// for files of the system. The program ends when it cannot give up its own rights afterwards.
class OwnIdentity {
 public:
  OwnIdentity();
  ~OwnIdentity();
  OwnIdentity(const OwnIdentity&) = delete;
  OwnIdentity& operator=(const OwnIdentity&) = delete;

 private:
  bool isChanged_;
};

/// Gives the process its own identity for good. For signal handlers.
void ResumeOwnIdentity();

/// Returns the user who owns the files that this process creates.
uid_t FileUser();

/// Makes the identity with which the calling thread accesses files the only one of this process,
/// which then cannot go back. For a child before it becomes another program: system calls only.
/// Returns 0 or an errno value.
int BecomeFileUser();

}  // namespace vela
