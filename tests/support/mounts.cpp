#include "support/mounts.h"

#include <fcntl.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include <cerrno>
#include <utility>

#include "support/environment_failure.h"
#include "support/files.h"
#include "support/removal.h"

namespace vela_test {

namespace {

struct statvfs VolumeOf(const std::string& path) {
  struct statvfs volume {};
  if (statvfs(path.c_str(), &volume) != 0) {
    EnvironmentFailureWithErrno("cannot examine the volume at " + path);
  }
  return volume;
}

/// Does nothing when a reset of the sandbox has already unmounted it.
void Unmount(const std::string& path, uint64_t mount) {
  if (MountAt(path) == mount) {
    umount2(path.c_str(), MNT_DETACH);
  }
}

/// False, with errno set, when the volume cannot be given that size.
bool TrySetAvailable(const std::string& path, uint64_t bytes) {
  const struct statvfs volume = VolumeOf(path);
  const uint64_t used = static_cast<uint64_t>(volume.f_blocks - volume.f_bfree) * volume.f_frsize;
  if (used + bytes == 0) {
    EnvironmentFailure("an empty volume cannot be full");
  }
  const std::string options = "size=" + std::to_string(used + bytes);
  return mount("tmpfs", path.c_str(), "tmpfs", MS_REMOUNT | MS_NOSUID, options.c_str()) == 0;
}

}  // namespace

SmallVolume::SmallVolume(std::string path, uint64_t bytes) : path_(std::move(path)) {
  MakeDirectories(path_);
  if (bytes == 0) {
    EnvironmentFailure("a small volume needs at least one byte");  // 0 means no limit to the kernel
  }
  const std::string options = "mode=0777,size=" + std::to_string(bytes);
  if (mount("tmpfs", path_.c_str(), "tmpfs", MS_NOSUID, options.c_str()) != 0) {
    EnvironmentFailureWithErrno("cannot mount a small volume at " + path_);
  }
  mount_ = MountAt(path_);
}

SmallVolume::~SmallVolume() {
  Unmount(path_, mount_);
}

uint64_t SmallVolume::Available() const {
  const struct statvfs volume = VolumeOf(path_);
  return static_cast<uint64_t>(volume.f_bavail) * volume.f_frsize;
}

void SmallVolume::SetAvailable(uint64_t bytes) {
  // Fails when another writer uses more than the new size at the same time.
  constexpr int kTrials = 1000;
  for (int trial = 0; trial < kTrials; ++trial) {
    if (TrySetAvailable(path_, bytes)) {
      return;
    }
    if (errno != EINVAL) {
      break;
    }
  }
  EnvironmentFailureWithErrno("cannot resize the small volume at " + path_);
}

uint64_t SmallVolume::PageSize() {
  return static_cast<uint64_t>(sysconf(_SC_PAGESIZE));
}

ReadOnlyMount::ReadOnlyMount(std::string path) : path_(std::move(path)) {
  if (mount(path_.c_str(), path_.c_str(), nullptr, MS_BIND, nullptr) != 0) {
    EnvironmentFailureWithErrno("cannot mount " + path_ + " on itself");
  }
  mount_attr attributes{};
  attributes.attr_set = MOUNT_ATTR_RDONLY;
  if (mount_setattr(AT_FDCWD, path_.c_str(), 0, &attributes, sizeof attributes) != 0) {
    EnvironmentFailureWithErrno("cannot make " + path_ + " read-only");
  }
  mount_ = MountAt(path_);
}

ReadOnlyMount::~ReadOnlyMount() {
  Unmount(path_, mount_);
}

}  // namespace vela_test
