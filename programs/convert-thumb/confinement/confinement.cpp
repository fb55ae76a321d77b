#include "confinement/confinement.h"

#include <sys/prctl.h>
#include <sys/resource.h>

#include <algorithm>

#include "confinement/landlock.h"
#include "confinement/system_calls.h"

namespace vela {

namespace {

/// Of all sizes this one alone also keeps programs that collect memory images from getting one.
constexpr rlim_t kNoMemoryImage = 1;

void LeaveNoMemoryImage() {
  rlimit limit = {};
  getrlimit(RLIMIT_CORE, &limit);
  limit.rlim_max = std::min(limit.rlim_max, kNoMemoryImage);
  limit.rlim_cur = limit.rlim_max;
  setrlimit(RLIMIT_CORE, &limit);
}

}  // namespace

void Confine(const WritablePlaces& places) {
  prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0);
  LeaveNoMemoryImage();
  AllowWritingOnlyAt(places);
  RefuseForeignSystemCalls();
}

void ConfineToThisProgram() {
  RefuseOtherPrograms();
}

}  // namespace vela
