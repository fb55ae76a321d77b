#include "failure_reason.h"

#include <limits.h>

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <optional>
#include <string_view>

#include "checks/configuration_check.h"
#include "configuration/setting_values.h"
#include "configuration/settings.h"
#include "convert/photo_convert_job.h"
#include "platform/system_rules.h"
#include "platform/velaindex.h"
#include "platform/vlibc.h"
#include "posix/folder.h"
#include "source/raw_image.h"
#include "source/raw_limit.h"
#include "thumb/work_as_owner.h"

namespace vela {

namespace {

constexpr char kDcrawPath[] = "/usr/bin/dcraw";

/// The options of the largest thumbnail, from which all others are made.
constexpr uint32_t kLargestSide = 1280;
constexpr char kSizeHint[] = "jpeg:size=1280x1280";
constexpr char kBox[] = "1280x1280>";

/// A picture that has less of the converter's memory for each pixel may not fit into what the
/// converter allows ImageMagick: it needs several copies of 8 bytes per pixel.
constexpr uint64_t kLeastBytesPerPixel = 34;
/// In place of a directory for temporary files: none can be created.
constexpr char kNoDirectory[] = "/dev/null";

/// Longer reasons are cut.
constexpr size_t kLongestReason = 500;
/// Of what a tool prints, so much is kept.
constexpr size_t kMostOutput = 65536;

/// What a tool has printed, and how it has ended.
struct ToolEnd {
  std::string output;  ///< its beginning
  int status = 0;      ///< its exit status; another value than 0 for any other end
};

/// Reads what the started tool prints, and waits for its end.
ToolEnd AwaitTool(FILE* stream) {
  ToolEnd end;
  char chunk[4096];
  for (size_t got = 0; (got = std::fread(chunk, 1, sizeof chunk, stream)) > 0;) {
    end.output.append(chunk, std::min(got, kMostOutput - end.output.size()));
  }
  end.status = VLIBCPclose(stream);
  return end;
}

std::string NotStarted(const char* tool) {
  return std::string(tool) + " cannot be started: " + std::strerror(VLIBCErrGet());
}

std::string NoMessage(const char* tool) {
  return std::string(tool) + " has ended without a message: it has crashed or was killed, " +
         "perhaps because tool_timeout was reached";
}

std::string_view TakeLine(std::string_view& text) {
  const std::string_view line = text.substr(0, text.find('\n'));
  text.remove_prefix(std::min(text.size(), line.size() + 1));
  return line;
}

/// Returns the line without the name of the photo at its beginning, in which the converter replaces
/// control characters by spaces.
std::string WithoutName(std::string_view line, std::string photo) {
  photo += ": ";
  std::replace_if(
      photo.begin(), photo.end(), [](unsigned char byte) { return byte < ' '; }, ' ');
  return std::string(line.substr(line.substr(0, photo.size()) == photo ? photo.size() : 0));
}

/// Returns the last line of the converter itself, without its name, or else the first line.
/// ImageMagick may run under the same name; its lines end with a place in its sources.
std::string_view MainLine(std::string_view output) {
  constexpr std::string_view kPrefix = "convert-thumb: ";
  constexpr std::string_view kSource = " @ error/";
  std::string_view first;
  std::string_view last;
  while (!output.empty()) {
    std::string_view line = TakeLine(output);
    const bool isNamed = line.substr(0, kPrefix.size()) == kPrefix;
    line.remove_prefix(isNamed ? kPrefix.size() : 0);
    const size_t source = line.rfind(kSource);
    line = line.substr(0, source);
    first = first.empty() ? line : first;
    last = isNamed && source == std::string_view::npos ? line : last;
  }
  return last.empty() ? first : last;
}

/// Returns what can be said of a photo that the converter accepts.
std::string ReasonOfProfile() {
  const std::string profile = DefaultProfileFile();
  const std::string error = FirstErrorOfProfile(profile);
  if (!error.empty()) {
    return "it can be converted, but not with the profile " + profile + ": " + error;
  }
  return "it can be converted now: the cause is gone, or it is in the profile; the system log has "
         "the reason that it had then";
}

std::string ReasonOfConverter(const std::string& source, const std::string& scratch) {
  const std::string define = "registry:temporary-path=" + scratch;
  const bool hasPages = BlVELAIndexIsMultiplePagePhotoFile(source.c_str());
  FILE* const stream =
      VLIBCPopen(kConvertToolPath, "rBE", "-define", define.c_str(),
                 (source + (hasPages ? "[0]" : "")).c_str(), "-define", kSizeHint, "-thumbnail",
                 kBox, "-quality", "90", "+profile", "!icc,*", "-flatten", "-auto-orient",
                 "-colorspace", "sRGB", kDiscardedOutput, nullptr);
  if (stream == nullptr) {
    return NotStarted(kConvertToolPath);
  }
  const ToolEnd end = AwaitTool(stream);
  if (end.status == 0) {
    return ReasonOfProfile();
  }
  const std::string_view line = MainLine(end.output);
  return line.empty() ? NoMessage(kConvertToolPath) : WithoutName(line, source);
}

std::string ReasonOfDcraw(const std::string& photo) {
  FILE* const stream = VLIBCPopen(kDcrawPath, "rBE", "-w", "-c", photo.c_str(), nullptr);
  if (stream == nullptr) {
    return NotStarted(kDcrawPath);
  }
  const ToolEnd end = AwaitTool(stream);
  if (end.status == 0) {
    return "its decoded form does not fit into /tmp";
  }
  std::string_view output = end.output;
  const std::string_view line = TakeLine(output);
  return line.empty() ? NoMessage(kDcrawPath) : "dcraw: " + WithoutName(line, photo);
}

bool IsPreviewLargeEnough(const std::string& preview) {
  uint32_t width = 0;
  uint32_t height = 0;
  return VELAIndexImgResGet(preview.c_str(), &width, &height) == 0 &&
         std::max(width, height) >= kLargestSide;
}

/// Decodes the raw photo as velathumb does, into the scratch directory.
std::string ReasonOfRaw(const std::string& photo, const std::string& scratch) {
  const std::string preview = scratch + "/VELAPHOTO_THUMB_RAW.jpg";
  if (DcrawToFile(photo, preview, "-e") && IsPreviewLargeEnough(preview)) {
    return "its preview: " + ReasonOfConverter(preview, scratch);
  }
  if (!IsWithinRawLimit(photo)) {
    return "the raw photo is larger than raw_pixel_limit allows";
  }
  const std::string decoded = scratch + "/RAW_TEMP.ppm";
  return DcrawToFile(photo, decoded, "-w") ? ReasonOfConverter(decoded, scratch)
                                           : ReasonOfDcraw(photo);
}

/// Returns the largest thumbnail that is present, empty without one that is larger than all that
/// have failed.
std::string FindLargestThumb(const PhotoReport& photo) {
  std::string largest;
  for (const EA_THUMB_SIZE size : kThumbSizesSmallestFirst) {
    const EAThumbInfo& row = rgEAThumbInfo[size];
    if (photo.failures[static_cast<size_t>(size)].has_value()) {
      largest.clear();
    }
    char thumb[PATH_MAX] = "";
    if (photo.thumbs.states[static_cast<size_t>(size)] == ThumbState::kPresent &&
        GetEAFilePath(photo.path.c_str(), row.name, row.oldName, thumb, sizeof thumb) == 0) {
      largest = thumb;
    }
  }
  return largest;
}

/// Returns the bytes that the converter may use for one photo.
uint64_t ConvertMemory() {
  char text[64] = "";
  VLIBCFileGetKeyValue(kSettingsFile, kConvertMemoryKey, text, sizeof text, 0);
  const std::optional<size_t> limit = ParseByteCount(text);
  return limit ? *limit : DefaultConvertMemory();
}

bool IsLarge(const std::string& photo) {
  uint32_t width = 0;
  uint32_t height = 0;
  return VELAIndexImgResGet(photo.c_str(), &width, &height) == 0 &&
         uint64_t{width} * height > ConvertMemory() / kLeastBytesPerPixel;
}

/// Examines a photo for which files may have to be created.
std::string ExamineWithFiles(const std::string& photo, bool isRaw) {
  const ScratchDirectory scratch;
  if (scratch.Path().empty()) {
    return "unknown, because no file can be created in /tmp";
  }
  return isRaw ? ReasonOfRaw(photo, scratch.Path()) : ReasonOfConverter(photo, scratch.Path());
}

std::string Examine(const PhotoReport& photo) {
  const WorkAsOwner owner(photo.path.substr(0, photo.path.rfind('/')));
  if (!owner.MayWork()) {
    return "the owner of its directory is unknown";
  }
  if (const std::string thumb = FindLargestThumb(photo); !thumb.empty()) {
    return "its largest thumbnail: " + ReasonOfConverter(thumb, kNoDirectory);
  }
  const bool isRaw = BlVELAIndexIsRawImage(VELAIndexExtGet(photo.path.c_str()));
  return isRaw || IsLarge(photo.path) ? ExamineWithFiles(photo.path, isRaw)
                                      : ReasonOfConverter(photo.path, kNoDirectory);
}

}  // namespace

std::string FindFailureReason(const PhotoReport& photo) {
  return Examine(photo).substr(0, kLongestReason);
}

std::string ReasonFinder::Find(const PhotoReport& photo) {
  if (photos_ >= limits_.photos || time_ >= limits_.time) {
    const auto seconds = std::chrono::duration_cast<std::chrono::seconds>(limits_.time);
    return "not examined: only the first " + std::to_string(limits_.photos) +
           " failed photos are, for " + std::to_string(seconds.count()) +
           " seconds; --failed examines all";
  }
  ++photos_;
  const auto begin = std::chrono::steady_clock::now();
  std::string reason = FindFailureReason(photo);
  time_ += std::chrono::steady_clock::now() - begin;
  return reason;
}

void ReasonFinder::TakePhoto(const PhotoReport& photo) {
  if (photo.FailureCount() == 0) {
    next_.TakePhoto(photo);
    return;
  }
  PhotoReport explained = photo;
  explained.reason = Find(photo);
  next_.TakePhoto(explained);
}

}  // namespace vela
