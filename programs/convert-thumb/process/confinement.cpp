#include "process/confinement.h"

#include "posix/confinement.h"
#include "posix/system_call_filter.h"

namespace vela {

int Confine(const AllowedFiles& files) {
  Confinement confinement;
  confinement.files = files;
  PreparedConfinement prepared;
  const int error = prepared.Prepare(confinement);
  return error != 0 ? error : prepared.Enter();
}

void ConfineToThisProgram() {
  BlockOtherPrograms();
}

}  // namespace vela
