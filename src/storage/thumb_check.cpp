#include "storage/velamk_util.h"

#include <syslog.h>

#include <string>

#include "platform/velaindex.h"
#include "storage/log_source.h"
#include "storage/metadata_dir.h"
#include "storage/thumb_age.h"

using vela::DerivedFilePath;
using vela::FindMetadataDir;
using vela::kMetadataLogSource;

namespace {

/// Tells whether the existing thumbnail `name` can stay.
bool IsThumbGood(const char* path, const std::string& eaDir, const char* name) {
  if (IsEAThumbOutdated(path, name) == 1) {
    return false;
  }
  const std::string thumbPath = DerivedFilePath(eaDir, name);
  return IsMediaPortraitInDB(path) == IsFilePortrait(thumbPath.c_str());
}

/// Checks one size class and removes its thumbnail when it is bad. Returns true when it is there
/// and good.
bool CheckThumb(const char* path, const std::string& eaDir, const EAThumbInfo& row) {
  const char* name = IsEAFileExist(eaDir.c_str(), nullptr, row.name, row.oldName);
  if (name == nullptr) {
    return false;
  }
  if (IsThumbGood(path, eaDir, name)) {
    return true;
  }
  RemoveEAFile(eaDir.c_str(), row.name, row.oldName);
  return false;
}

}  // namespace

int CheckEAThumbs(const char* path, int32_t sizeMap) {
  if (path == nullptr) {
    syslog(LOG_ERR, "%s:%d Bad parameters.", kMetadataLogSource, 545);
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
