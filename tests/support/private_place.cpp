#include "support/private_place.h"

#include <sys/mount.h>
#include <sys/stat.h>

#include <utility>

#include "support/environment_failure.h"
#include "support/removal.h"

namespace vela_test {

namespace {

std::string Octal(unsigned mode) {
  std::string digits;
  for (; mode > 0; mode /= 8) {
    digits.insert(digits.begin(), static_cast<char>('0' + mode % 8));
  }
  return digits;
}

}  // namespace

PrivatePlace::PrivatePlace(std::string path, unsigned mode, const std::string& limit)
    : path_(std::move(path)), mode_(mode), mount_(0) {
  const std::string options = "mode=" + Octal(mode) + ",size=" + limit;
  if (mount("tmpfs", path_.c_str(), "tmpfs", MS_NOSUID, options.c_str()) != 0) {
    EnvironmentFailureWithErrno("cannot mount a memory volume at " + path_);
  }
  mount_ = MountAt(path_);
}

void PrivatePlace::Restore() const {
  while (MountAt(path_) != mount_) {
    if (umount2(path_.c_str(), MNT_DETACH | UMOUNT_NOFOLLOW) != 0) {
      EnvironmentFailureWithErrno("cannot restore " + path_);
    }
  }
  chmod(path_.c_str(), mode_);
  RemoveContent(path_);
}

}  // namespace vela_test
