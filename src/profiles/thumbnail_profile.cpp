#include "profiles/thumbnail_profile.h"

#include <algorithm>
#include <cstddef>
#include <utility>

#include "configuration/profile_values.h"
#include "platform/velaindex.h"
#include "platform/velautils.h"
#include "storage/velamk_util.h"

using namespace vela;

namespace {

std::string WithUnderscores(std::string name) {
  std::replace(name.begin(), name.end(), ':', '_');
  return name;
}

bool FillsArea(const std::string& thumbName) {
  const ThumbSizeTraits* traits = FindThumbSize(thumbName);
  return traits != nullptr && traits->fillsArea;
}

/// Builds the profile of one section; null when the section has no wanted thumbnail.
std::unique_ptr<const ThumbnailProfile> ReadProfile(const VELAUtils::ConfParser& conf,
                                                    const std::string& section, int32_t sizeMap) {
  const int size = conf.getInt(section, kSizeKey, kDefaultSize);
  const int quality = conf.getInt(section, kQualityKey, kDefaultQuality);
  std::string unsharp = conf.getString(section, kUnsharpKey, "");
  std::string filename = conf.getString(section, kFilenameKey, "");
  const int phase = conf.getInt(section, kPhaseKey, kDefaultPhase);
  if (filename.empty() || IsThumbInSizeMap(filename.c_str(), sizeMap) == 0) {
    return nullptr;
  }
  return std::make_unique<const ThumbnailProfile>(size, quality, std::move(unsharp),
                                                  std::move(filename), phase);
}

void SortBySize(ThumbnailProfileList& list) {
  std::sort(list.all.begin(), list.all.end(),
            [](const auto& a, const auto& b) { return ProfileSortPredicate(*a, *b); });
}

void SortIntoPhases(ThumbnailProfileList& list) {
  for (const auto& profile : list.all) {
    switch (profile->phase()) {
      case 1:
        list.phase1.push_back(profile.get());
        break;
      case 2:
        list.phase2.push_back(profile.get());
        break;
      default:
        list.phase0.push_back(profile.get());
    }
  }
}

/// Returns the list of one phase, null when the index means all profiles.
const std::vector<const ThumbnailProfile*>* PhaseList(const ThumbnailProfileList& list,
                                                      int phaseIndex) {
  switch (phaseIndex) {
    case 0:
      return &list.phase0;
    case 1:
      return &list.phase1;
    case 2:
      return &list.phase2;
    default:
      return nullptr;
  }
}

}  // namespace

ThumbnailProfile::ThumbnailProfile(int32_t size, int32_t quality, std::string unsharp,
                                   std::string filename, int32_t phase)
    : size_(size),
      quality_(quality),
      unsharp_(std::move(unsharp)),
      filename_(std::move(filename)),
      thumbName_(WithUnderscores(filename_)),
      phase_(phase),
      fillArea_(FillsArea(thumbName_)) {}

int ParseThumbnailProfiles(ThumbnailProfileList& list, const std::string& profileFilePath,
                           const std::string& dirPath) {
  VELAUtils::ConfParser conf;
  int32_t sizeMap = 0;
  VELAIDX_GetDirThumbSizeMap(dirPath.c_str(), THUMB_TYPE_PHOTO, &sizeMap);
  if (!conf.loadFromFile(profileFilePath)) {
    return 0;
  }
  for (const std::string& section : conf.enumSections()) {
    if (!IsThumbSection(section)) {
      continue;
    }
    if (auto profile = ReadProfile(conf, section, sizeMap)) {
      list.all.push_back(std::move(profile));
    }
  }
  SortBySize(list);
  SortIntoPhases(list);
  return 1;
}

int GetProfileCount(const ThumbnailProfileList& list, int phaseIndex) {
  const auto* phase = PhaseList(list, phaseIndex);
  return static_cast<int>(phase != nullptr ? phase->size() : list.all.size());
}

const ThumbnailProfile* GetProfileAt(const ThumbnailProfileList& list, int position,
                                     int phaseIndex) {
  if (position < 0 || position >= GetProfileCount(list, phaseIndex)) {
    return nullptr;
  }
  const auto index = static_cast<std::size_t>(position);
  const auto* phase = PhaseList(list, phaseIndex);
  return phase != nullptr ? (*phase)[index] : list.all[index].get();
}

bool ProfileSortPredicate(const ThumbnailProfile& a, const ThumbnailProfile& b) {
  return a.size() < b.size();
}
