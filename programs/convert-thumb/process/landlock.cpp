#include "process/landlock.h"

#include <fcntl.h>
#include <linux/landlock.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cstdint>
#include <string>

#include "posix/file_descriptor.h"

namespace vela {

namespace {

// May be newer than the kernel headers of the build.
constexpr uint64_t kTruncate = 1U << 14;
constexpr uint64_t kDeviceControl = 1U << 15;
constexpr uint64_t kTcp = (1U << 0) | (1U << 1);
constexpr uint64_t kAbstractSocketsAndSignals = (1U << 0) | (1U << 1);

constexpr int kVersionOfTruncate = 3;
constexpr int kVersionOfTcp = 4;
constexpr int kVersionOfDeviceControl = 5;
constexpr int kVersionOfScopes = 6;

constexpr uint64_t kMakeOtherThanFiles =
    LANDLOCK_ACCESS_FS_MAKE_CHAR | LANDLOCK_ACCESS_FS_MAKE_DIR | LANDLOCK_ACCESS_FS_MAKE_SOCK |
    LANDLOCK_ACCESS_FS_MAKE_FIFO | LANDLOCK_ACCESS_FS_MAKE_BLOCK | LANDLOCK_ACCESS_FS_MAKE_SYM |
    LANDLOCK_ACCESS_FS_REMOVE_DIR;
constexpr uint64_t kChangeDirectory = LANDLOCK_ACCESS_FS_MAKE_REG | LANDLOCK_ACCESS_FS_REMOVE_FILE;

/// The kernel's structure in its latest known form; older kernels accept it as long as the fields
/// that they do not know are zero.
struct RulesetAttributes {
  uint64_t files = 0;
  uint64_t network = 0;
  uint64_t scopes = 0;
};

/// Returns 0 or less when the kernel does not support Landlock.
int LandlockVersion() {
  return static_cast<int>(
      syscall(SYS_landlock_create_ruleset, nullptr, 0, LANDLOCK_CREATE_RULESET_VERSION));
}

uint64_t ChangeFile(int version) {
  return LANDLOCK_ACCESS_FS_WRITE_FILE | (version >= kVersionOfTruncate ? kTruncate : 0);
}

RulesetAttributes AllRestrictions(int version) {
  RulesetAttributes all;
  all.files = ChangeFile(version) | kChangeDirectory | kMakeOtherThanFiles |
              (version >= kVersionOfDeviceControl ? kDeviceControl : 0);
  all.network = version >= kVersionOfTcp ? kTcp : 0;
  all.scopes = version >= kVersionOfScopes ? kAbstractSocketsAndSignals : 0;
  return all;
}

void Allow(const FileDescriptor& ruleset, const FileDescriptor& file, uint64_t access) {
  landlock_path_beneath_attr rule = {};
  rule.allowed_access = access;
  rule.parent_fd = file.Get();
  syscall(SYS_landlock_add_rule, ruleset.Get(), LANDLOCK_RULE_PATH_BENEATH, &rule, 0);
}

void AllowChangesBelow(const FileDescriptor& ruleset, const std::string& directory, int version) {
  const FileDescriptor file(open(directory.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
  if (file.IsOpen()) {
    Allow(ruleset, file, ChangeFile(version) | kChangeDirectory);
  }
}

void AllowChangesOf(const FileDescriptor& ruleset, const std::string& path, int version) {
  const FileDescriptor file(open(path.c_str(), O_PATH | O_CLOEXEC));
  struct stat status;
  if (file.IsOpen() && fstat(file.Get(), &status) == 0 && !S_ISDIR(status.st_mode)) {
    Allow(ruleset, file, ChangeFile(version));
  }
}

}  // namespace

void RestrictWritingTo(const WritablePaths& paths) {
  const int version = LandlockVersion();
  if (version < 1) {
    return;
  }
  const RulesetAttributes restrictions = AllRestrictions(version);
  const FileDescriptor ruleset(static_cast<int>(
      syscall(SYS_landlock_create_ruleset, &restrictions, sizeof restrictions, 0)));
  if (!ruleset.IsOpen()) {
    return;
  }
  for (const std::string& directory : paths.directories) {
    AllowChangesBelow(ruleset, directory, version);
  }
  for (const std::string& path : paths.files) {
    AllowChangesOf(ruleset, path, version);
  }
  syscall(SYS_landlock_restrict_self, ruleset.Get(), 0);
}

}  // namespace vela
