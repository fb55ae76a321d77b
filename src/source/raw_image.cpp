#include "source/raw_image.h"

#include <sys/stat.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <limits>
#include <memory>

#include "convert/photo_convert_job.h"
#include "platform/velaindex.h"
#include "platform/velautils.h"
#include "platform/vlibc.h"
#include "profiles/thumbnail_profile.h"
#include "source/orientation.h"
#include "source/tool_output.h"
#include "thumb/log_source.h"

using vela::kAllPhases;
using vela::kConvertToolPath;
using vela::kLogSource;
using vela::SplitTagLine;
using vela::ToolOutput;

namespace {

constexpr char kDcrawPath[] = "/usr/bin/dcraw";

struct FileCloser {
  void operator()(FILE* file) const { std::fclose(file); }
};
using File = std::unique_ptr<FILE, FileCloser>;

/// Reads "width x height". Returns false when the text is something else or no size that an image
/// can have.
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

/// Writes what was read in one piece. Returns false when not all of it could be written, which is
/// logged.
bool WriteAll(int descriptor, const char* data, ssize_t count, const std::string& outPath) {
  const ssize_t written = write(descriptor, data, static_cast<std::size_t>(count));
  if (written == -1) {
    syslog(LOG_ERR, "%s:%d write failed, path=%s, %s", kLogSource, 590, outPath.c_str(),
           std::strerror(errno));
    return false;
  }
  if (written != count) {
    syslog(LOG_ERR, "%s:%d write size wrong, read_count=%zd, write_count=%zd", kLogSource, 594,
           count, written);
    return false;
  }
  return true;
}

/// Copies everything from one descriptor to the other. Returns true when there was anything and all
/// of it arrived.
bool CopyOutput(int from, int to, const std::string& rawPath, const std::string& outPath) {
  char buffer[4096];
  int64_t total = 0;
  for (;;) {
    const ssize_t count = read(from, buffer, sizeof buffer);
    if (count == -1) {
      syslog(LOG_ERR, "%s:%d read failed, path=%s", kLogSource, 583, rawPath.c_str());
      return false;
    }
    if (count == 0) {
      return total > 0;
    }
    if (!WriteAll(to, buffer, count, outPath)) {
      return false;
    }
    total += count;
  }
}

/// Tells whether the largest thumbnail can be made from the preview without enlarging it.
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

/// Turns the preview in place as the raw photo says; it is used as it stands whatever comes of it.
void TurnPreview(const std::string& rawPath, const std::string& previewPath) {
  const int degrees = GetRawPreviewRotation(rawPath, previewPath);
  if (degrees <= 0) {
    return;
  }
  VELAUtils::ProcessRunner runner(kConvertToolPath, kConvertToolPath);
  runner.addArguments("-rotate", std::to_string(degrees).c_str(), previewPath.c_str(),
                      previewPath.c_str());
  // Readers of the log know this line as the sign of a turned preview: it is written on success.
  if (runner.run(true, false) == 0) {
    syslog(LOG_ERR, "%s:%d Failed to rotate %s to %d degree", kLogSource, 650, previewPath.c_str(),
           degrees);
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
  unlink(previewPath.c_str());
  const std::string ppmPath = thumbDir + "/RAW_TEMP.ppm";
  if (DcrawToFile(rawPath, ppmPath, "-w")) {
    return ppmPath;
  }
  syslog(LOG_ERR, "%s:%d Failed to convert raw %s to pnm", kLogSource, 660, rawPath.c_str());
  unlink(ppmPath.c_str());
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
    syslog(LOG_ERR, "%s:%d [Error] VLIBCPopen: %s -i -v %s", kLogSource, 83, kDcrawPath,
           path.c_str());
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
  const ToolOutput output(VLIBCPopen(kDcrawPath, "r", option, "-c", rawPath.c_str(), nullptr));
  if (!output.IsOpen()) {
    AppLogError(LOG_ERR, "%s:%d VLIBCPopen [%s %s -c] failed", kLogSource, 569, kDcrawPath, option);
    return false;
  }
  const File file(std::fopen(outPath.c_str(), "wbe"));
  if (file == nullptr) {
    syslog(LOG_ERR, "%s:%d fopen failed, path=%s, errno=%d", kLogSource, 574, outPath.c_str(),
           errno);
    return false;
  }
  return CopyOutput(output.Descriptor(), fileno(file.get()), rawPath, outPath);
}

std::string ConvertRawToJpeg(const DirectoryJob& job, const std::string& rawPath,
                             const std::string& thumbDir) {
  struct stat before = {};
  if (stat(rawPath.c_str(), &before) != 0 || !S_ISREG(before.st_mode)) {
    syslog(LOG_ERR, "%s:%d %s is not regular file", kLogSource, 628, rawPath.c_str());
    return {};
  }
  const std::string result = Decode(job, rawPath, thumbDir);
  if (result.empty()) {
    return {};
  }
  struct stat after = {};
  if (stat(rawPath.c_str(), &after) != 0 || after.st_blocks != before.st_blocks) {
    unlink(result.c_str());
    return {};
  }
  return result;
}
