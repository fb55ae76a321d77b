// The check of a profile file.
#include <algorithm>
#include <array>
#include <cstring>
#include <optional>
#include <string>
#include <vector>

#include "checks/checked_file.h"
#include "checks/configuration_check.h"
#include "checks/profile_text.h"
#include "checks/similar_name.h"
#include "configuration/profile_values.h"
#include "configuration/section_text.h"
#include "configuration/settings.h"
#include "platform/velaindex.h"
#include "storage/thumb_size_class.h"

namespace vela {

namespace {

constexpr char kLeftToImageMagick[] = "; the converter leaves the photos to ImageMagick";

/// A thumbnail that velathumb makes.
struct CheckedThumb {
  const ProfileSection* section;
  const ThumbSizeTraits* kind;
  int size;
  int phase;

  std::string Place() const {
    return Quoted(section->name) + " in line " + std::to_string(section->line);
  }
};

std::vector<std::string_view> KindNames() {
  std::vector<std::string_view> names;
  for (const EA_THUMB_SIZE size : kThumbSizesSmallestFirst) {
    names.emplace_back(rgEAThumbInfo[size].name);
  }
  return names;
}

const char* ModeText(const ThumbSizeTraits& kind) {
  return kind.fillsArea ? " fills its box" : " fits into its box";
}

/// Returns false for a text that ImageMagick rejects as well, as it has a character that none of
/// its geometries has. Otherwise ImageMagick decides; it accepts much, even a single "x". The last
/// character is the multiplication sign of Latin-1.
bool MayBeUnsharpMask(std::string_view text) {
  constexpr std::string_view kGeometryCharacters = "0123456789.xX+-,%!^<>@()/:eE \t\v\f\r\xd7";
  return text.find_first_not_of(kGeometryCharacters) == std::string_view::npos;
}

class ProfileCheck {
 public:
  explicit ProfileCheck(FindingList& findings) : findings_(findings) {
    VELAIDX_GetDirThumbSizeMap("/", THUMB_TYPE_PHOTO, &sizeMap_);
  }

  void Check(const ProfileText& profile);

 private:
  const ThumbSizeTraits* CheckKind(const ProfileSection& section);
  void CheckSection(const ProfileSection& section);
  int CheckNumber(const ProfileSection& section, const char* key, int defaultValue);
  int CheckSize(const ProfileSection& section, const ThumbSizeTraits& kind);
  void CheckQuality(const ProfileSection& section);
  void CheckUnsharp(const ProfileSection& section);
  int CheckPhase(const ProfileSection& section);
  void CheckThumbs();
  void CheckKindsOnce();
  void CheckModes(int phase);
  void CheckSource();

  /// What fails every photo is only an error in a section that is used.
  Severity WorstSeverity() const { return isUsed_ ? Severity::kError : Severity::kWarning; }

  FindingList& findings_;
  int32_t sizeMap_ = 0;
  bool isUsed_ = false;  // the section that is being checked
  std::vector<CheckedThumb> thumbs_;
};

/// Returns the kind of the section's thumbnail, null when the section defines none.
const ThumbSizeTraits* ProfileCheck::CheckKind(const ProfileSection& section) {
  const ProfileValue* const name = section.Find(kFilenameKey);
  if (name == nullptr || name->text.empty()) {
    findings_.Warn(name == nullptr ? section.line : name->line,
                   "the section " + Quoted(section.name) + " is ignored: it has no filename");
    return nullptr;
  }
  const ThumbSizeTraits* const kind = FindThumbSize(name->text);
  if (kind == nullptr) {
    findings_.Warn(name->line, "the section " + Quoted(section.name) +
                                   " is ignored: " + Quoted(name->text) + " is none of " +
                                   NameList(KindNames()) + SuggestName(name->text, KindNames()));
  }
  return kind;
}

/// Returns the number that velathumb reads.
int ProfileCheck::CheckNumber(const ProfileSection& section, const char* key, int defaultValue) {
  const ProfileValue* const value = section.Find(key);
  if (value == nullptr) {
    return defaultValue;
  }
  const std::optional<LeadingInteger> integer = ParseLeadingInteger(value->text);
  if (!integer) {
    findings_.Warn(value->line, std::string(key) + " is not a number: " + Quoted(value->text) +
                                    "; " + std::to_string(defaultValue) + " is used");
    return defaultValue;
  }
  if (!integer->rest.empty()) {
    findings_.Warn(value->line, "the text after the number is ignored: " + Quoted(integer->rest) +
                                    "; a comment needs a line of its own");
  }
  return integer->number;
}

int ProfileCheck::CheckSize(const ProfileSection& section, const ThumbSizeTraits& kind) {
  const int size = CheckNumber(section, kSizeKey, kDefaultSize);
  const ProfileValue* const value = section.Find(kSizeKey);
  if (value == nullptr) {
    if (kind.edge != size) {
      findings_.Warn(section.line, "the section " + Quoted(section.name) + " has no size; " +
                                       std::to_string(size) + " is used, other programs expect " +
                                       std::to_string(kind.edge));
    }
  } else if (size < 1) {
    findings_.Add(value->line, WorstSeverity(),
                  "size is not a number of pixels from 1: " + Quoted(value->text) +
                      "; no thumbnail has the right size");
  } else if (size > kMaxSide) {
    findings_.Warn(value->line, "size is not a number from 1 to " + std::to_string(kMaxSide) +
                                    ": " + Quoted(value->text) + kLeftToImageMagick);
  }
  return size;
}

void ProfileCheck::CheckQuality(const ProfileSection& section) {
  const int quality = CheckNumber(section, kQualityKey, kDefaultQuality);
  if (quality < kMinQuality || quality > kMaxQuality) {
    const ProfileValue& value = *section.Find(kQualityKey);
    findings_.Warn(value.line, "quality is not a number from " + std::to_string(kMinQuality) +
                                   " to " + std::to_string(kMaxQuality) + ": " +
                                   Quoted(value.text) + kLeftToImageMagick);
  }
}

void ProfileCheck::CheckUnsharp(const ProfileSection& section) {
  const ProfileValue* const value = section.Find(kUnsharpKey);
  if (value == nullptr || value->text.empty() || ParseUnsharpMask(value->text)) {
    return;
  }
  const std::string fault =
      "unsharp is not RADIUSxSIGMA+AMOUNT+THRESHOLD, such as 0x0.8+0.5+0.01: " +
      Quoted(value->text);
  if (MayBeUnsharpMask(value->text)) {
    findings_.Warn(value->line, fault + kLeftToImageMagick);
  } else {
    findings_.Add(value->line, WorstSeverity(), fault + "; every photo fails");
  }
}

int ProfileCheck::CheckPhase(const ProfileSection& section) {
  const int phase = CheckNumber(section, kPhaseKey, kDefaultPhase);
  if (phase >= 0 && phase <= kMaxPhase) {
    return phase;
  }
  const ProfileValue& value = *section.Find(kPhaseKey);
  findings_.Warn(value.line, "phase is not 0, 1 or 2: " + Quoted(value.text) + "; 0 is used");
  return 0;
}

void ProfileCheck::CheckSection(const ProfileSection& section) {
  const ThumbSizeTraits* const kind = CheckKind(section);
  isUsed_ = kind != nullptr && (sizeMap_ & (1 << kind->size)) != 0;
  if (kind == nullptr) {
    return;
  }
  const int size = CheckSize(section, *kind);
  CheckQuality(section);
  CheckUnsharp(section);
  const int phase = CheckPhase(section);
  if (isUsed_) {
    thumbs_.push_back({&section, kind, size, phase});
  }
}

void ProfileCheck::CheckKindsOnce() {
  std::array<const CheckedThumb*, kThumbSizeCount> first = {};
  for (const CheckedThumb& thumb : thumbs_) {
    const CheckedThumb*& known = first[static_cast<size_t>(thumb.kind->size)];
    if (known == nullptr) {
      known = &thumb;
      continue;
    }
    findings_.Warn(thumb.section->line, "the section " + Quoted(thumb.section->name) +
                                            " makes the same file as " + known->Place() +
                                            "; one of them is overwritten");
  }
}

/// The thumbnails of a phase are made largest first, but their modes are applied smallest first.
void ProfileCheck::CheckModes(int phase) {
  const CheckedThumb* first = nullptr;
  for (const CheckedThumb& thumb : thumbs_) {
    if (thumb.phase != phase) {
      continue;
    }
    first = first == nullptr ? &thumb : first;
    if (thumb.kind->fillsArea != first->kind->fillsArea) {
      findings_.Warn(thumb.section->line, std::string(thumb.kind->shortName) +
                                              ModeText(*thumb.kind) + ", but " +
                                              first->kind->shortName + " (" + first->Place() +
                                              ") in the same phase" + ModeText(*first->kind) +
                                              ": their modes are applied in the opposite order");
      return;
    }
  }
}

/// The thumbnails of the later phases are made from the largest one of phase 0.
void ProfileCheck::CheckSource() {
  const CheckedThumb* source = nullptr;
  for (const CheckedThumb& thumb : thumbs_) {
    const bool isLarger = thumb.phase == 0 && (source == nullptr || thumb.size > source->size);
    source = isLarger ? &thumb : source;
  }
  if (source == nullptr) {
    findings_.Add(0, Severity::kError,
                  "no thumbnail is made in phase 0; those of phases 1 and 2 are made from the "
                  "largest one of phase 0, so nothing is made");
    return;
  }
  for (const CheckedThumb& thumb : thumbs_) {
    if (thumb.phase != 0 && thumb.size > source->size) {
      findings_.Warn(thumb.section->line,
                     "the thumbnail is larger than the largest one of phase 0, from which it is "
                     "made (" +
                         source->Place() + "); it is not enlarged");
    }
  }
}

void ProfileCheck::CheckThumbs() {
  if (thumbs_.empty()) {
    findings_.Add(0, Severity::kError,
                  "no section defines a thumbnail that " + std::string(kPhotoSizeMapKey) + " (" +
                      std::to_string(sizeMap_) + ") asks for, so nothing is made");
    return;
  }
  CheckKindsOnce();
  CheckModes(0);
  CheckModes(1);
  CheckModes(kMaxPhase);
  CheckSource();
}

void ProfileCheck::Check(const ProfileText& profile) {
  for (const ProfileSection& section : profile.sections) {
    CheckSection(section);
  }
  if (profile.isLoadable) {
    CheckThumbs();
  }
}

void CheckText(const std::string& text, FindingList& findings) {
  if (text.size() > kLargestSectionText) {
    findings.Add(0, Severity::kError,
                 "is larger than " + std::to_string(kLargestSectionText) +
                     " bytes; the whole file is rejected");
    return;
  }
  ProfileCheck(findings).Check(ReadProfileText(text, findings));
}

}  // namespace

CheckResult CheckProfile(const std::string& path) {
  CheckResult result;
  std::string text;
  int error = 0;
  FindingList findings(path);
  switch (ReadCheckedFile(path, text, error)) {
    case FileRead::kDone:
      CheckText(text, findings);
      break;
    case FileRead::kFaulty:
      findings.Add(0, Severity::kError,
                   std::string("cannot be read: ") + std::strerror(error) + "; nothing is made");
      break;
    case FileRead::kUnchecked:
      result.unchecked.push_back({path, error});
      break;
  }
  result.findings = findings.Take();
  return result;
}

}  // namespace vela
