#include "source/raw_image.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <limits>

#include "convert/photo_convert_job.h"
#include "platform/system_rules.h"
#include "platform/velaindex.h"
#include "platform/velautils.h"
#include "platform/vlibc.h"
#include "posix/descriptor_copy.h"
#include "posix/files.h"
#include "posix/folder.h"
#include "posix/log.h"
#include "profiles/thumbnail_profile.h"
#include "source/orientation.h"
#include "source/raw_limit.h"
#include "source/tool_output.h"
#include "storage/log_source.h"

using namespace vela;

namespace {

constexpr char kDcrawPath[] = "/usr/bin/dcraw";
constexpr unsigned kDecodedCopyMode = 0666;

/// Reads "width x height". Returns false for any other text and for a size that no image can have.
bool ParseSize(const std::string& text, uint32_t& width, uint32_t& height) {
  constexpr long long kLargest = std::numeric_limits<uint32_t>::max();
  long long w = 0;
  long long h = 0;
  if (std::sscanf(text.c_str(), "%lld x %lld", &w, &h) != 2) {
    return false;
  }
  if (w < 1 || w > kLargest || h < 1 || h > kLargest) {
    return false;
  }
  width = static_cast<uint32_t>(w);
  height = static_cast<uint32_t>(h);
  return true;
}

/// Logs why a decoded copy was not written completely.
void LogIncompleteCopy(const CopyResult& copy, const std::string& rawPath,
                       const std::string& outPath) {
  switch (copy.end) {
    case CopyEnd::kComplete:
      break;
    case CopyEnd::kReadFailed:
      LogError(kProgramLogSource, 583, "read failed, path=" + rawPath);
      break;
    case CopyEnd::kWriteFailed:
      LogError(kProgramLogSource, 590,
               "write failed, path=" + outPath + ", " + std::strerror(copy.error));
      break;
    case CopyEnd::kShortWrite:
      LogError(kProgramLogSource, 594,
               "write size wrong, read_count=" + std::to_string(copy.chunk) +
                   ", write_count=" + std::to_string(copy.written));
      break;
  }
}

/// Returns true when the largest thumbnail can be made from the preview without enlarging it.
bool IsPreviewLargeEnough(const DirectoryJob& job, const std::string& previewPath) {
  uint32_t width = 0;
  uint32_t height = 0;
  if (VELAIndexImgResGet(previewPath.c_str(), &width, &height) != 0) {
    return false;
  }
  const int count = GetProfileCount(job.profiles, kAllPhases);
  const ThumbnailProfile* largest = GetProfileAt(job.profiles, count - 1, kAllPhases);
  return largest != nullptr && std::max(width, height) >= static_cast<uint32_t>(largest->size());
}

/// Turns the preview in place according to the raw photo. If that fails, the preview is used
/// unchanged.
void TurnPreview(const std::string& rawPath, const std::string& previewPath) {
  const int degrees = GetRawPreviewRotation(rawPath, previewPath);
  if (degrees <= 0) {
    return;
  }
  VELAUtils::ProcessRunner runner(kConvertToolPath, kConvertToolPath);
  runner.addArguments("-rotate", std::to_string(degrees).c_str(), previewPath.c_str(),
                      previewPath.c_str());
  // Despite its wording, this line announces a turned preview: it is written on success.
  if (runner.run(true, false) == 0) {
    LogError(kProgramLogSource, 650,
             "Failed to rotate " + previewPath + " to " + std::to_string(degrees) + " degree");
  }
}

/// Decodes the photo by its preview or in full. Returns the path of the result, empty on failure.
std::string Decode(const DirectoryJob& job, const std::string& rawPath,
                   const std::string& thumbDir) {
  const std::string previewPath = thumbDir + "/VELAPHOTO_THUMB_RAW.jpg";
  if (DcrawToFile(rawPath, previewPath, "-e") && IsPreviewLargeEnough(job, previewPath)) {
    TurnPreview(rawPath, previewPath);
    return previewPath;
  }
  RemoveEntry(previewPath);
  const std::string ppmPath = thumbDir + "/RAW_TEMP.ppm";
  if (IsWithinRawLimit(rawPath) && DcrawToFile(rawPath, ppmPath, "-w")) {
    return ppmPath;
  }
  LogError(kProgramLogSource, 660, "Failed to convert raw " + rawPath + " to pnm");
  RemoveEntry(ppmPath);
  return {};
}

}  // namespace

int GetImageResolution(const std::string& path, uint32_t& width, uint32_t& height) {
  if (BlVELAIndexIsRawImage(VELAIndexExtGet(path.c_str()))) {
    return GetRawImageSize(path, width, height);
  }
  return VELAIndexImgResGet(path.c_str(), &width, &height) == 0 ? 1 : 0;
}

int GetRawImageSize(const std::string& path, uint32_t& width, uint32_t& height) {
  ToolOutput output(VLIBCPopen(kDcrawPath, "rB", "-i", "-v", path.c_str(), nullptr));
  if (!output.IsOpen()) {
    LogError(kProgramLogSource, 83,
             "[Error] VLIBCPopen: " + std::string(kDcrawPath) + " -i -v " + path);
    return 0;
  }
  while (const auto line = output.ReadLine()) {
    const auto tag = SplitTagLine(*line);
    if (tag && tag->name == "Output size" && ParseSize(tag->value, width, height)) {
      return 1;
    }
  }
  return 0;
}

bool DcrawToFile(const std::string& rawPath, const std::string& outPath, const char* option) {
  if (option == nullptr) {
    return false;
  }
  const ToolOutput output(VLIBCPopen(kDcrawPath, "r", option, "-c", rawPath.c_str(), nullptr));
  if (!output.IsOpen()) {
    AppLogError(kErrorPriority, "%s:%d VLIBCPopen [%s %s -c] failed", kProgramLogSource, 569,
                kDcrawPath, option);
    return false;
  }
  const FileDescriptor file = FolderEntry(outPath).CreateAnew(kDecodedCopyMode);
  if (!file.IsOpen()) {
    const int error = errno;
    LogError(kProgramLogSource, 574,
             "fopen failed, path=" + outPath + ", errno=" + std::to_string(error));
    return false;
  }
  const CopyResult copy = CopyDescriptor(output.Descriptor(), file.Get(), kToolFileSize);
  LogIncompleteCopy(copy, rawPath, outPath);
  return copy.end == CopyEnd::kComplete && copy.total > 0;
}

std::string ConvertRawToJpeg(const DirectoryJob& job, const std::string& rawPath,
                             const std::string& thumbDir) {
  const auto before = ExamineFile(rawPath);
  if (!before || !before->isRegular) {
    LogError(kProgramLogSource, 628, rawPath + " is not regular file");
    return {};
  }
  const std::string result = Decode(job, rawPath, thumbDir);
  if (result.empty()) {
    return {};
  }
  const auto after = ExamineFile(rawPath);
  if (!after || after->blocks != before->blocks) {
    RemoveEntry(result);
    return {};
  }
  return result;
}
