// For platforms whose library lacks FindEAFile.
#include <string>

#include "platform/velaindex.h"
#include "platform/vlibc.h"

namespace {

/// The options with which this system's programs examine files.
constexpr int kStatusOptions = 9;

}  // namespace

const char* FindEAFile(const char* eaDir, const char* name, const char* oldName,
                       EAFileStatus* status) {
  const char* found = IsEAFileExist(eaDir, &status->size, name, oldName);
  if (found == nullptr) {
    return nullptr;
  }
  VLIBCFileStatus file = {};
  const std::string path = std::string(eaDir) + "/" + found;
  if (VLIBCFileStat(path.c_str(), kStatusOptions, &file) == 0) {
    status->modified = file.modification.seconds;
  } else {
    // A file removed in between is reported as empty, which counts as outdated.
    *status = {};
  }
  return found;
}
