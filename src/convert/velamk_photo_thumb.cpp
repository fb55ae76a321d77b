#include "convert/velamk_photo_thumb.h"

#include <sys/stat.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <ctime>

#include "convert/photo_times.h"
#include "platform/velaindex.h"
#include "platform/velautils.h"
#include "platform/vlibc.h"
#include "posix/cut_text.h"

using vela::CutText;
using vela::DateLikePhoto;
using vela::kPhotoStatusOptions;

namespace {

constexpr char kLogSource[] = "velamk_photo_thumb";

/// A JPEG of a single byte is what is left of an output that failed while it was opened.
constexpr int64_t kSmallestThumb = 2;

std::string InputArgument(const std::string& srcPath) {
  const bool firstPageOnly = BlVELAIndexIsMultiplePagePhotoFile(srcPath.c_str());
  return CutText(firstPageOnly ? srcPath + "[0]" : srcPath);
}

void AddCommand(VELAUtils::ProcessRunner& runner, const PhotoConvertJob& job,
                const std::string& srcPath) {
  AddTempPathDefine(job, runner);
  runner.addArguments(InputArgument(srcPath).c_str());
  const auto& settings = job.settings;
  const std::size_t last = settings.size() - 1;
  if (last > 0) {
    AddFirstOutput(runner, settings.front());
  }
  for (std::size_t i = 1; i < last; ++i) {
    AddMiddleOutput(runner, settings[i]);
  }
  AddLastOutput(runner, settings[last]);
}

void RemoveTempOutputs(const PhotoConvertJob& job) {
  for (const PhotoThumbSetting& setting : job.settings) {
    unlink(setting.tempPath.c_str());
  }
}

/// Tells whether the photo was written while it was converted. One figure alone may change without
/// the content: allocation is settled late, and sparse files are filled in place.
bool IsSourceChanged(const VLIBCFileStatus& source, int64_t oldBlocks, int64_t oldSize) {
  return source.size != oldSize && source.blocks != oldBlocks;
}

/// Returns the size of the thumbnail in bytes, 0 when it cannot be examined.
int64_t ThumbSize(const std::string& destPath) {
  struct stat status = {};
  return stat(destPath.c_str(), &status) == 0 ? status.st_size : 0;
}

/// Moves one output into place. Returns false when there is no usable output; nothing of it is left
/// then.
bool CommitOutput(const PhotoThumbSetting& setting, const VLIBCFileStatus& source, time_t now) {
  const char* temp = setting.tempPath.c_str();
  const char* dest = setting.destPath.c_str();
  if (rename(temp, dest) != 0) {
    syslog(LOG_ERR, "%s:%d [Error] rename: %s, %s", kLogSource, 430, temp, dest);
    unlink(temp);
    return false;
  }
  if (chmod(dest, 0777) != 0) {
    syslog(LOG_ERR, "%s:%d [Error] Failed to chmod [%s], %s", kLogSource, 437, dest,
           std::strerror(errno));
  }
  const int64_t size = ThumbSize(setting.destPath);
  if (size < kSmallestThumb) {
    unlink(dest);
    syslog(LOG_ERR, "%s:%d [Error] file size of dest path: %d, %s", kLogSource, 441,
           static_cast<int>(size), dest);
    return false;
  }
  if (now < source.modification.seconds) {
    // A photo from the future would make every thumbnail of it look outdated.
    DateLikePhoto(setting.destPath, source);
  }
  return true;
}

}  // namespace

bool SortPhotoThumbSetting(const PhotoThumbSetting& a, const PhotoThumbSetting& b) {
  return a.width > b.width;
}

int RunPhotoConvertJob(PhotoConvertJob& job) {
  const char* tool = job.toolPath.c_str();
  VELAUtils::ProcessRunner runner(tool, tool);
  const std::string srcPath = job.settings.empty() ? std::string() : job.settings.front().srcPath;
  std::sort(job.settings.begin(), job.settings.end(), SortPhotoThumbSetting);
  if (job.settings.empty()) {
    return 0;
  }
  VLIBCFileStatus source = {};
  if (VLIBCFileStat(srcPath.c_str(), kPhotoStatusOptions, &source) != 0) {
    syslog(LOG_ERR, "%s:%d [Error] failed to stat file: %s", kLogSource, 117, srcPath.c_str());
    return -1;
  }
  if (!S_ISREG(source.mode)) {
    syslog(LOG_ERR, "%s:%d [Error] not a regular file: %s", kLogSource, 121, srcPath.c_str());
    return -1;
  }
  AddCommand(runner, job, srcPath);
  if (runner.run(true, false) != 0) {
    return -1;
  }
  return CommitPhotoThumbs(job, srcPath, source.blocks, source.size);
}

int CommitPhotoThumbs(const PhotoConvertJob& job, const std::string& srcPath, int64_t oldBlocks,
                      int64_t oldSize) {
  const time_t now = std::time(nullptr);
  VLIBCFileStatus source = {};
  if (VLIBCFileStat(srcPath.c_str(), kPhotoStatusOptions, &source) != 0) {
    syslog(LOG_ERR, "%s:%d Failed to VLIBCFileStat() path [%s]", kLogSource, 397, srcPath.c_str());
    RemoveTempOutputs(job);
    return -1;
  }
  if (IsSourceChanged(source, oldBlocks, oldSize)) {
    syslog(LOG_ERR, "%s:%d [Error] file size changed: st_blocks %d -> %d; st_size %jd -> %jd, %s",
           kLogSource, 409, static_cast<int>(oldBlocks), static_cast<int>(source.blocks),
           static_cast<intmax_t>(oldSize), static_cast<intmax_t>(source.size), srcPath.c_str());
    RemoveTempOutputs(job);
    return -1;
  }
  bool allCommitted = true;
  for (const PhotoThumbSetting& setting : job.settings) {
    allCommitted = CommitOutput(setting, source, now) && allCommitted;
  }
  return allCommitted ? 0 : -1;
}
