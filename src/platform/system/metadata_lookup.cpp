// For platforms whose library has no FindEAFile of its own.
#include <string>

#include "platform/velaindex.h"
#include "platform/vlibc.h"

const char* FindEAFile(const char* eaDir, const char* name, const char* oldName,
                       EAFileStatus* status) {
  const char* found = IsEAFileExist(eaDir, &status->size, name, oldName);
  if (found == nullptr) {
    return nullptr;
  }
  VLIBCFileStatus file = {};
  const std::string path = std::string(eaDir) + "/" + found;
  // A file that has gone since then is out of date.
  status->modified = VLIBCFileStat(path.c_str(), 0, &file) == 0 ? file.modification.seconds : 0;
  return found;
}
