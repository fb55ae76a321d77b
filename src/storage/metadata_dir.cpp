#include "storage/metadata_dir.h"

#include <syslog.h>

#include "platform/velaindex.h"
#include "platform/vlibc.h"
#include "posix/cut_text.h"
#include "storage/log_source.h"

namespace vela {

bool FindMetadataDir(const char* path, int line, std::string& out) {
  char buffer[kPathBufferSize] = "";
  if (VELAEADirPath(0, path, buffer, sizeof buffer) != 0) {
    syslog(LOG_ERR, "%s:%d VELAEADirPath error [0x%04X %s:%d] on %s", kMetadataLogSource, line,
           static_cast<unsigned>(VLIBCErrGet()), VLIBCErrorGetFile(), VLIBCErrorGetLine(), path);
    return false;
  }
  out = buffer;
  return true;
}

}  // namespace vela
