#include "source/rotation_check.h"

#include <cstdlib>

#include "platform/velaindex.h"
#include "platform/vlibc.h"
#include "posix/files.h"
#include "posix/glob_matches.h"
#include "posix/log.h"
#include "profiles/photo_thumb_plan.h"
#include "profiles/thumbnail_profile.h"
#include "source/raw_image.h"
#include "source/tool_output.h"
#include "storage/file_helpers.h"
#include "storage/log_source.h"

using namespace vela;

namespace {

constexpr char kComparePath[] = "/usr/bin/compare";
constexpr int kUnknownDistance = 65535;
constexpr char kTrialPattern[] = "/Temp_*.jpg";

/// The largest existing thumbnail of a photo.
struct Reference {
  const ThumbnailProfile* profile = nullptr;
  std::string path;
};

Reference FindReference(const DirectoryJob& job, const std::string& thumbDir) {
  for (int i = GetProfileCount(job.profiles, kAllPhases) - 1; i >= 0; --i) {
    Reference reference = {GetProfileAt(job.profiles, i, kAllPhases), {}};
    struct stat status = {};
    if (FindExistingThumb(*reference.profile, thumbDir, reference.path, status) == 1) {
      return reference;
    }
  }
  return {};
}

/// Returns true when one of the two is landscape and the other portrait; a square is neither.
bool DifferInOrientation(const std::string& photoPath, const std::string& referencePath) {
  uint32_t photoWidth = 0;
  uint32_t photoHeight = 0;
  uint32_t width = 0;
  uint32_t height = 0;
  if (!ExamineFile(referencePath) || GetImageResolution(photoPath, photoWidth, photoHeight) != 1 ||
      GetImageResolution(referencePath, width, height) != 1) {
    return false;
  }
  return (photoWidth > photoHeight && width < height) ||
         (photoWidth < photoHeight && width > height);
}

std::string TrialName(int degrees) {
  return "Temp_" + std::to_string(degrees) + ".jpg";
}

/// Compares trial images at two turns with the reference. Returns the turn of the closer one,
/// `preferred` when both are equally close; 0 when a trial image cannot be made.
int CloserTurn(const DirectoryJob& job, const std::string& photoPath, const std::string& thumbDir,
               const Reference& reference, int preferred, int other) {
  for (const int degrees : {preferred, other}) {
    if (CreateRotatedThumb(job, degrees, *reference.profile, photoPath, TrialName(degrees),
                           thumbDir) == -1) {
      return 0;
    }
  }
  const int otherDistance = CompareImagesMAE(thumbDir + "/" + TrialName(other), reference.path);
  const int preferredDistance =
      CompareImagesMAE(thumbDir + "/" + TrialName(preferred), reference.path);
  return otherDistance < preferredDistance ? other : preferred;
}

int CompareWithReference(const DirectoryJob& job, const std::string& photoPath,
                         const std::string& thumbDir) {
  const Reference reference = FindReference(job, thumbDir);
  if (reference.path.empty()) {
    return 0;
  }
  return DifferInOrientation(photoPath, reference.path)
             ? CloserTurn(job, photoPath, thumbDir, reference, 90, 270)
             : CloserTurn(job, photoPath, thumbDir, reference, 0, 180);
}

void RemoveTrialImages(const std::string& thumbDir) {
  if (RemoveFilesByPattern(EscapePattern(thumbDir) + kTrialPattern) == -1) {
    AppLogError(kErrorPriority, "%s:%d Failed to remove files by pattern [%s%s]", kProgramLogSource,
                334, thumbDir.c_str(), kTrialPattern);
  }
}

}  // namespace

int CompareImagesMAE(const std::string& imageA, const std::string& imageB) {
  ToolOutput output(VLIBCPopen(kComparePath, "rE", "-metric", "MAE", imageA.c_str(), imageB.c_str(),
                               "null:", nullptr));
  if (!output.IsOpen()) {
    LogError(kProgramLogSource, 152,
             "[Error] VLIBCPopen: " + std::string(kComparePath) + " -metric MAE " + imageA + " " +
                 imageB + " null:");
    return kUnknownDistance;
  }
  const auto line = output.ReadLine();
  const std::size_t space = line ? line->find(' ') : std::string::npos;
  if (space == std::string::npos) {
    return kUnknownDistance;
  }
  return static_cast<int>(std::strtol(line->substr(0, space).c_str(), nullptr, 10));
}

int DetectThumbRotation(const DirectoryJob& job, const std::string& photoPath,
                        const std::string& thumbDir) {
  checkCreateDir(thumbDir);
  const int degrees = CompareWithReference(job, photoPath, thumbDir);
  RemoveTrialImages(thumbDir);
  return degrees;
}
