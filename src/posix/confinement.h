// What a process that reads hostile data may do.
#pragma once

#include <cstdint>
#include <limits>
#include <optional>
#include <string>
#include <vector>

#include "posix/file_descriptor.h"
#include "posix/landlock.h"
#include "posix/system_call_filter.h"

namespace vela {

/// Limits on what a process may use.
struct ResourceLimits {
  static constexpr uint64_t kNone = std::numeric_limits<uint64_t>::max();

  uint64_t memory = kNone;            ///< bytes of memory that is not part of a file
  uint64_t processorSeconds = kNone;  ///< of all threads together; SIGXCPU when used up
  uint64_t fileSize = kNone;          ///< bytes of a file that is written
};

/// Applies the limits to this process and what it starts. Lower limits that exist already stay.
/// Only makes system calls.
void LowerLimits(const ResourceLimits& limits);

/// Returns true when this process may use less than that many bytes of memory that is not part of a
/// file.
bool IsMemoryLimitedBelow(uint64_t bytes);

/// Makes sure that a crash leaves no core dump, neither as a file nor with a crash handler. Only
/// makes system calls.
void DisableCoreDumps();

/// The mechanisms that the kernel supports and, if this process is in a sandbox itself, that
/// allows.
struct ConfinementSupport {
  bool noNewPrivileges = false;
  bool seccomp = false;     ///< filters of system calls
  int landlockVersion = 0;  ///< 0: none
  bool openat2 = false;     ///< opening a path without following links
};

ConfinementSupport FindConfinementSupport();

/// The restrictions of a process.
struct Confinement {
  ResourceLimits limits;
  bool blocksSystemCalls = true;  ///< those of BlockUnneededSystemCalls
  SocketUse sockets = SocketUse::kNone;
  std::optional<AllowedFiles> files;  ///< nothing: all files
  /// Variables of a program that is started, as "NAME=value", besides those that every program has.
  std::vector<std::string> environment;
};

/// A confinement in the form that the kernel takes, so that a process can enter it without
/// allocating memory.
class PreparedConfinement {
 public:
  /// Prepares `confinement`. Returns 0 or an errno value. Restrictions that the kernel does not
  /// support are left out.
  int Prepare(const Confinement& confinement);

  /// Confines this thread and all that it starts; they also cannot gain privileges and leave no
  /// core dump. Cannot be undone. Only makes system calls, so that a child can call it before exec.
  /// Restrictions that the kernel does not support are skipped. Returns 0, or the errno value of a
  /// restriction that is supported and failed.
  int Enter() const;

 private:
  ResourceLimits limits_;
  bool blocksSystemCalls_ = false;
  SocketUse sockets_ = SocketUse::kNone;
  FileDescriptor ruleset_;
};

}  // namespace vela
