#include "support/new_root.h"

#include <fcntl.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include "support/descriptor.h"
#include "support/environment_failure.h"

namespace vela_test {

namespace {

/// Entering a mount namespace, even one's own, leads to its root directory. Only there are all
/// mounts below the root directory; after a chroot it may be an ordinary directory of a mount that
/// others share, which cannot be made private from inside.
void GoToRootOfNamespace() {
  const Descriptor self(static_cast<int>(syscall(SYS_pidfd_open, getpid(), 0)));
  if (!self.IsOpen() || setns(self.Get(), CLONE_NEWNS) != 0) {
    EnvironmentFailureWithErrno("cannot enter the mount namespace of the sandbox");
  }
  if (mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) != 0) {
    EnvironmentFailureWithErrno("cannot make the mounts of the sandbox private");
  }
}

Descriptor Open(const ShownDirectory& shown) {
  Descriptor directory;
  for (const std::string& origin : shown.origins) {
    directory = Descriptor(open(origin.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
    if (directory.IsOpen()) {
      return directory;
    }
  }
  EnvironmentFailureWithErrno("cannot open " + shown.origins.front());
}

/// A copy of all mounts at and below the directory, not mounted anywhere. A directory that is not
/// below the root of the namespace is not private yet.
Descriptor PrivateCopy(const Descriptor& directory) {
  Descriptor copy(open_tree(directory.Get(), "",
                            AT_EMPTY_PATH | AT_RECURSIVE | OPEN_TREE_CLONE | OPEN_TREE_CLOEXEC));
  mount_attr attributes{};
  attributes.propagation = MS_PRIVATE;
  if (!copy.IsOpen() || mount_setattr(copy.Get(), "", AT_EMPTY_PATH | AT_RECURSIVE, &attributes,
                                      sizeof attributes) != 0) {
    EnvironmentFailureWithErrno("cannot copy mounts of the machine");
  }
  return copy;
}

Descriptor EmptyVolume() {
  const Descriptor settings(fsopen("tmpfs", FSOPEN_CLOEXEC));
  if (!settings.IsOpen() || fsconfig(settings.Get(), FSCONFIG_SET_STRING, "mode", "0755", 0) != 0 ||
      fsconfig(settings.Get(), FSCONFIG_SET_STRING, "size", "64m", 0) != 0 ||
      fsconfig(settings.Get(), FSCONFIG_CMD_CREATE, nullptr, nullptr, 0) != 0) {
    EnvironmentFailureWithErrno("cannot make the root directory of the sandbox");
  }
  return Descriptor(fsmount(settings.Get(), FSMOUNT_CLOEXEC, MOUNT_ATTR_NOSUID));
}

void Attach(const Descriptor& tree, const std::string& path) {
  if (move_mount(tree.Get(), "", AT_FDCWD, path.c_str(), MOVE_MOUNT_F_EMPTY_PATH) != 0) {
    EnvironmentFailureWithErrno("cannot mount " + path + " of the sandbox");
  }
}

}  // namespace

void MoveToNewRoot(const std::vector<ShownDirectory>& directories) {
  std::vector<Descriptor> opened;  // before the paths mean something else
  for (const ShownDirectory& shown : directories) {
    opened.push_back(Open(shown));
  }
  GoToRootOfNamespace();
  for (Descriptor& directory : opened) {
    directory = PrivateCopy(directory);
  }
  const Descriptor root = EmptyVolume();
  // It covers the root directory of the namespace, whose mount is private.
  Attach(root, "/");
  if (fchdir(root.Get()) != 0 || chroot(".") != 0) {
    EnvironmentFailureWithErrno("cannot change the root directory");
  }
  for (size_t i = 0; i < directories.size(); ++i) {
    const std::string& place = directories[i].place;
    if (mkdir(place.c_str(), 0755) != 0) {
      EnvironmentFailureWithErrno("cannot make " + place);
    }
    Attach(opened[i], place);
  }
}

}  // namespace vela_test
