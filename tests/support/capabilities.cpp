#include "support/capabilities.h"

#include <linux/capability.h>
#include <linux/securebits.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <fstream>

#include "support/environment_failure.h"
#include "support/privileges.h"

namespace vela_test {

namespace {

struct CapabilitySets {
  __user_cap_header_struct header{};
  __user_cap_data_struct data[_LINUX_CAPABILITY_U32S_3]{};

  CapabilitySets() { header.version = _LINUX_CAPABILITY_VERSION_3; }
  bool Read() { return syscall(SYS_capget, &header, data) == 0; }
  bool Write() { return syscall(SYS_capset, &header, data) == 0; }
};

void MustBeDone(int error) {
  if (error != 0) {
    errno = error;
    EnvironmentFailureWithErrno("cannot change the capabilities");
  }
}

}  // namespace

uint64_t EffectiveCapabilities(bool* ok) {
  CapabilitySets sets;
  *ok = sets.Read();
  return sets.data[0].effective | static_cast<uint64_t>(sets.data[1].effective) << 32;
}

int SetEffectiveCapabilities(uint64_t effective) {
  CapabilitySets sets;
  if (!sets.Read()) {
    return errno;
  }
  sets.data[0].effective = static_cast<uint32_t>(effective);
  sets.data[1].effective = static_cast<uint32_t>(effective >> 32);
  return sets.Write() ? 0 : errno;
}

int GiveUpCapabilities() {
  // Without these bits, exec gives user 0 everything back.
  if (prctl(PR_SET_SECUREBITS, SECBIT_NOROOT | SECBIT_NOROOT_LOCKED, 0, 0, 0) != 0) {
    return errno;
  }
  CapabilitySets sets;
  return sets.Write() ? 0 : errno;
}

WithoutCapabilities::WithoutCapabilities() : effective_(0) {
  bool ok = false;
  effective_ = EffectiveCapabilities(&ok);
  MustBeDone(ok ? 0 : errno);
  MustBeDone(SetEffectiveCapabilities(0));
}

WithoutCapabilities::~WithoutCapabilities() {
  MustBeDone(SetEffectiveCapabilities(effective_));
}

}  // namespace vela_test
