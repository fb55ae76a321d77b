#include "storage/thumb_age.h"

#include <syslog.h>

#include "posix/cut_text.h"
#include "storage/log_source.h"
#include "storage/metadata_dir.h"
#include "storage/velamk_util.h"

using vela::CutText;
using vela::FindMetadataDir;
using vela::kMetadataLogSource;

namespace vela {

std::string DerivedFilePath(const std::string& eaDir, const char* name) {
  return CutText(eaDir + "/" + name);
}

bool StatMediaFile(const char* path, struct stat& out) {
  if (stat(path, &out) == 0) {
    return true;
  }
  syslog(LOG_ERR, "%s:%d Fail to get %s file information", kMetadataLogSource, 64, path);
  return false;
}

bool IsDerivedFileOutdated(const struct stat& source, const struct stat& derived) {
  return source.st_mtim.tv_sec > derived.st_mtim.tv_sec || derived.st_size < 1;
}

bool IsDerivedFileOutdated(const struct stat& source, const std::string& derivedPath) {
  struct stat derived = {};
  return stat(derivedPath.c_str(), &derived) != 0 || IsDerivedFileOutdated(source, derived);
}

}  // namespace vela

int IsEAThumbOutdated(const char* path, const char* name) {
  struct stat source = {};
  std::string eaDir;
  if (!vela::StatMediaFile(path, source) || !FindMetadataDir(path, 69, eaDir)) {
    return 0;
  }
  return vela::IsDerivedFileOutdated(source, vela::DerivedFilePath(eaDir, name)) ? 1 : 0;
}
