// Work in a directory with the identity of its owner.
#pragma once

#include <optional>
#include <string>

#include "posix/folder.h"
#include "posix/identity.h"

namespace vela {

/// As long as the object exists, the files of a directory are accessed, and tools are run, with the
/// identity of the user who owns the directory. Only when the setting work_as_owner is "yes", the
/// directory belongs to another user than root, and this process is root; otherwise nothing
/// changes. What keeps root from taking the identity is logged once.
class WorkAsOwner {
 public:
  explicit WorkAsOwner(const std::string& dir);

  /// Returns false when the owner cannot be determined: as root, velathumb must not work there.
  bool MayWork() const { return mayWork_; }

 private:
  /// From before its owner is determined: the path may lead elsewhere later.
  std::optional<HeldFolder> folder_;
  std::optional<AssumedIdentity> identity_;
  bool mayWork_ = true;
};

}  // namespace vela
