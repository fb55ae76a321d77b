#include "process/confinement.h"

#include "posix/confinement.h"
#include "posix/system_call_filter.h"

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
