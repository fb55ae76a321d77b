#include "storage/velamk_util.h"

#include <string>

#include "platform/velaindex.h"
#include "posix/log.h"
#include "posix/truncated_text.h"
#include "storage/log_source.h"
#include "storage/metadata_dir.h"
#include "storage/thumb_age.h"

using namespace vela;

namespace {

/// Returns true when the existing thumbnail `name` can be kept.
bool IsThumbValid(const char* path, const std::string& eaDir, const char* name) {
  if (IsEAThumbOutdated(path, name) == 1) {
    return false;
  }
  const std::string thumbPath = JoinPath(eaDir, name);
  return IsMediaPortraitInDB(path) == IsFilePortrait(thumbPath.c_str());
}

/// Checks one size class and removes its thumbnail when it is invalid. Returns true when it exists
/// and is valid.
bool CheckThumb(const char* path, const std::string& eaDir, const EAThumbInfo& row) {
  const char* name = IsEAFileExist(eaDir.c_str(), nullptr, row.name, row.oldName);
  if (name == nullptr) {
    return false;
  }
  if (IsThumbValid(path, eaDir, name)) {
    return true;
  }
  RemoveEAFile(eaDir.c_str(), row.name, row.oldName);
  return false;
}

}  // namespace

int CheckEAThumbs(const char* path, int32_t sizeMap) {
  if (path == nullptr) {
    LogError(kMetadataLogSource, 545, "Bad parameters.");
    return 0;
  }
  std::string eaDir;
  if (!FindMetadataDir(path, 550, eaDir)) {
    return 0;
  }
  int result = 1;
  for (const EAThumbInfo& row : rgEAThumbInfo) {
    if (IsThumbInSizeMap(row.name, sizeMap) != 0 && !CheckThumb(path, eaDir, row)) {
      result = 0;
    }
  }
  return result;
}
