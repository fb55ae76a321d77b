// For platforms whose library has no FindEAFile of its own.
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
    // A file that was removed in between is outdated: an empty one always is.
    *status = {};
  }
  return found;
}
