#include "storage/metadata_dir.h"

#include "platform/velaindex.h"
#include "platform/vlibc.h"
#include "posix/log.h"
#include "posix/truncated_text.h"
#include "storage/log_source.h"

namespace vela {

bool FindMetadataDir(const char* path, int line, std::string& out) {
  char buffer[kPathBufferSize] = "";
  if (VELAEADirPath(0, path, buffer, sizeof buffer) != 0) {
    LogError(kMetadataLogSource, line,
             "VELAEADirPath error [" + LogCode(VLIBCErrGet()) + " " + LogText(VLIBCErrorGetFile()) +
                 ":" + std::to_string(VLIBCErrorGetLine()) + "] on " + LogText(path));
    return false;
  }
  out = buffer;
  return true;
}

}  // namespace vela
