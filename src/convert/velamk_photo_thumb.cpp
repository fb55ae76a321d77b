#include "convert/velamk_photo_thumb.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <ctime>

#include "convert/photo_times.h"
#include "platform/velaindex.h"
#include "platform/velautils.h"
#include "platform/vlibc.h"
#include "posix/file_content.h"
#include "posix/file_descriptor.h"
#include "posix/files.h"
#include "posix/folder.h"
#include "posix/log.h"
#include "posix/truncated_text.h"

using namespace vela;

namespace {

constexpr char kLogSource[] = "velamk_photo_thumb";

/// Every service of the system may replace a thumbnail.
constexpr unsigned kThumbMode = 0777;

std::string InputArgument(const std::string& srcPath) {
  const bool firstPageOnly = BlVELAIndexIsMultiplePagePhotoFile(srcPath.c_str());
  return Truncated(firstPageOnly ? srcPath + "[0]" : srcPath);
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
    RemoveEntry(setting.tempPath);
  }
}

/// Returns true when the photo was written while it was converted. Either value alone may change
/// without the content: blocks are allocated late, and sparse files are filled in place.
bool IsSourceChanged(const VLIBCFileStatus& source, int64_t oldBlocks, int64_t oldSize) {
  return source.size != oldSize && source.blocks != oldBlocks;
}

/// The output while it is moved into place. The descriptor keeps it apart from whatever other users
/// put under its names.
class Output {
 public:
  explicit Output(const PhotoThumbSetting& setting)
      : temp_(setting.tempPath), dest_(setting.destPath), file_(temp_.OpenOwn()) {}

  /// Gives the file its mode, stores it on the disk and renames it. Returns 0 or an errno value;
  /// `modeError` receives that of setting the mode, which is no failure.
  int Publish(int& modeError) const;

  /// Returns its size in bytes, 0 when it cannot be examined.
  int64_t Size() const { return SizeOfFile(file_.Get()); }

  void RemoveTemp() const { temp_.Remove(); }

  /// Another service may have replaced the thumbnail meanwhile; that one stays.
  void RemoveThumb() const {
    if (dest_.IsFile(file_.Get())) {
      dest_.Remove();
    }
  }

 private:
  FolderEntry temp_;
  FolderEntry dest_;
  FileDescriptor file_;
};

int Output::Publish(int& modeError) const {
  if (!file_.IsOpen()) {
    return EPERM;
  }
  modeError = SetFileMode(file_.Get(), kThumbMode);
  // A name on the disk must not outlive the data in a power failure.
  const int error = SyncData(file_.Get());
  return error != 0 ? error : temp_.RenameTo(dest_);
}

/// Moves one output into place. Returns false, and removes the output, when it is unusable.
bool CommitOutput(const PhotoThumbSetting& setting, const VLIBCFileStatus& source, time_t now) {
  const std::string& dest = setting.destPath;
  const Output output(setting);
  int modeError = 0;
  if (output.Publish(modeError) != 0) {
    LogError(kLogSource, 430, "[Error] rename: " + setting.tempPath + ", " + dest);
    output.RemoveTemp();
    return false;
  }
  if (modeError != 0) {
    LogError(kLogSource, 437,
             "[Error] Failed to chmod [" + dest + "], " + std::strerror(modeError));
  }
  const int64_t size = output.Size();
  if (size < kSmallestThumb) {
    output.RemoveThumb();
    LogError(
        kLogSource, 441,
        "[Error] file size of dest path: " + std::to_string(static_cast<int>(size)) + ", " + dest);
    return false;
  }
  if (now < source.modification.seconds) {
    // A photo dated in the future would make all its thumbnails look outdated.
    CopyPhotoTime(dest, source);
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
    LogError(kLogSource, 117, "[Error] failed to stat file: " + srcPath);
    return -1;
  }
  if (!IsRegularFileMode(source.mode)) {
    LogError(kLogSource, 121, "[Error] not a regular file: " + srcPath);
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
    LogError(kLogSource, 397, "Failed to VLIBCFileStat() path [" + srcPath + "]");
    RemoveTempOutputs(job);
    return -1;
  }
  if (IsSourceChanged(source, oldBlocks, oldSize)) {
    LogError(kLogSource, 409,
             "[Error] file size changed: st_blocks " + std::to_string(static_cast<int>(oldBlocks)) +
                 " -> " + std::to_string(static_cast<int>(source.blocks)) + "; st_size " +
                 std::to_string(oldSize) + " -> " + std::to_string(source.size) + ", " + srcPath);
    RemoveTempOutputs(job);
    return -1;
  }
  bool allCommitted = true;
  for (const PhotoThumbSetting& setting : job.settings) {
    allCommitted = CommitOutput(setting, source, now) && allCommitted;
  }
  return allCommitted ? 0 : -1;
}
