#include "posix/confinement.h"

#include <linux/capability.h>
#include <sys/prctl.h>
#include <sys/resource.h>

#include <algorithm>
#include <cerrno>

#include "posix/folder.h"

namespace vela {

namespace {

/// From SIGXCPU until the kernel kills the process.
constexpr rlim_t kGraceSeconds = 5;
/// The only size that also keeps crash handlers, which read core dumps from a pipe, from being run.
constexpr rlim_t kNoCoreDump = 1;

void Lower(int resource, rlim_t soft, rlim_t hard) {
  const auto kind = static_cast<__rlimit_resource>(resource);
  rlimit limit = {};
  if (getrlimit(kind, &limit) != 0) {
    return;
  }
  limit.rlim_max = std::min(limit.rlim_max, hard);
  limit.rlim_cur = std::min({limit.rlim_cur, limit.rlim_max, soft});
  setrlimit(kind, &limit);
}

rlim_t Limit(uint64_t number) {
  return number < RLIM_INFINITY ? static_cast<rlim_t>(number) : RLIM_INFINITY;
}

/// Returns 0 for an error that means that the kernel, or a sandbox around this process, does not
/// support a restriction.
int UnlessUnsupported(int error) {
  const bool isUnsupported =
      error == ENOSYS || error == EOPNOTSUPP || error == EINVAL || error == EPERM;
  return isUnsupported ? 0 : error;
}

/// A program of root that is started later has no other rights than to reach files in spite of
/// their permissions. Fails for other users, who have no rights to give up.
void LimitCapabilities() {
  for (unsigned long right = 0; prctl(PR_CAPBSET_READ, right) >= 0; ++right) {
    const bool isKept = right == CAP_DAC_OVERRIDE || right == CAP_DAC_READ_SEARCH;
    if (!isKept && prctl(PR_CAPBSET_DROP, right) != 0) {
      return;
    }
  }
}

}  // namespace

ConfinementSupport FindConfinementSupport() {
  return {CanRefuseNewPrivileges(), CanBlockSystemCalls(), LandlockVersion(), CanRefuseLinks()};
}

void LowerLimits(const ResourceLimits& limits) {
// A sanitizer reserves many times the memory of any limit.
#if !defined(VELA_SANITIZED)
  Lower(RLIMIT_DATA, Limit(limits.memory), Limit(limits.memory));
#endif
  if (limits.processorSeconds < ResourceLimits::kNone - kGraceSeconds) {
    Lower(RLIMIT_CPU, Limit(limits.processorSeconds),
          Limit(limits.processorSeconds + kGraceSeconds));
  }
  Lower(RLIMIT_FSIZE, Limit(limits.fileSize), Limit(limits.fileSize));
}

bool IsMemoryLimitedBelow(uint64_t bytes) {
  rlimit limit = {};
  return getrlimit(RLIMIT_DATA, &limit) == 0 && limit.rlim_cur < Limit(bytes);
}

void DisableCoreDumps() {
  rlimit limit = {};
  getrlimit(RLIMIT_CORE, &limit);
  limit.rlim_max = std::min(limit.rlim_max, kNoCoreDump);
  // A limit of 0 is raised, because it would not keep crash handlers from being run.
  limit.rlim_cur = limit.rlim_max;
  setrlimit(RLIMIT_CORE, &limit);
}

int PreparedConfinement::Prepare(const Confinement& confinement) {
  limits_ = confinement.limits;
  blocksSystemCalls_ = confinement.blocksSystemCalls;
  sockets_ = confinement.sockets;
  if (blocksSystemCalls_) {
    PrepareSystemCallFilter(sockets_);
  }
  ruleset_.Reset();
  return confinement.files ? UnlessUnsupported(MakeLandlockRuleset(*confinement.files, ruleset_))
                           : 0;
}

int PreparedConfinement::Enter() const {
  if (blocksSystemCalls_) {
    LimitCapabilities();
  }
  int error = UnlessUnsupported(RefuseNewPrivileges());
  LowerLimits(limits_);
  DisableCoreDumps();
  if (error == 0 && ruleset_.IsOpen()) {
    error = UnlessUnsupported(EnterLandlockRuleset(ruleset_.Get()));
  }
  if (error == 0 && blocksSystemCalls_) {
    error = UnlessUnsupported(BlockUnneededSystemCalls(sockets_));
  }
  return error;
}

}  // namespace vela
