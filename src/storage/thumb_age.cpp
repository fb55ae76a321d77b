#include "storage/thumb_age.h"

#include "posix/log.h"
#include "posix/truncated_text.h"
#include "storage/log_source.h"
#include "storage/metadata_dir.h"
#include "storage/velamk_util.h"

using namespace vela;

namespace vela {

std::optional<FileStatus> ExamineMediaFile(const char* path) {
  const std::optional<FileStatus> status = ExamineFile(path);
  if (!status) {
    LogError(kMetadataLogSource, 64, "Fail to get " + LogText(path) + " file information");
  }
  return status;
}

bool IsDerivedFileOutdated(const FileStatus& source, int64_t size, int64_t modified) {
  return source.modified > modified || size < 1;
}

}  // namespace vela

int IsEAThumbOutdated(const char* path, const char* name) {
  const auto source = ExamineMediaFile(path);
  std::string eaDir;
  if (!source || name == nullptr || !FindMetadataDir(path, 69, eaDir)) {
    return 0;
  }
  const auto derived = ExamineFile(JoinPath(eaDir, name));
  const bool isOutdated =
      !derived || IsDerivedFileOutdated(*source, derived->size, derived->modified);
  return isOutdated ? 1 : 0;
}
