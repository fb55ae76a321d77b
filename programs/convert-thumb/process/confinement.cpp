#include "process/confinement.h"

#include "process/landlock.h"
#include "process/resource_limits.h"
#include "process/system_calls.h"

namespace vela {

void Confine(const WritablePaths& paths) {
  RefuseNewPrivileges();
  DisableCoreDumps();
  RestrictWritingTo(paths);
  BlockUnneededSystemCalls();
}

void ConfineToThisProgram() {
  BlockOtherPrograms();
}

}  // namespace vela
