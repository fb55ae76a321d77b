#include "thumb/photo_pass.h"

#include <cerrno>

#include "convert/photo_times.h"
#include "ipc/velamk_ipc.h"
#include "platform/system_rules.h"
#include "platform/velaindex.h"
#include "posix/files.h"
#include "posix/folder.h"
#include "posix/log.h"
#include "profiles/photo_thumb_plan.h"
#include "profiles/thumbnail_profile.h"
#include "progress/velamk_progress.h"
#include "source/raw_image.h"
#include "source/rotation_check.h"
#include "storage/file_helpers.h"
#include "storage/log_source.h"
#include "storage/photo_folder.h"
#include "storage/velamk_thumb_status.h"
#include "thumb/index_registration.h"
#include "thumb/phase_status.h"

namespace vela {

namespace {

/// From this index version on, the index keeps the rotation that a user gave a photo.
constexpr int kRotationKeepingIndexVersion = 1;

/// The thumbnail from which the later phases are made; null when there is none.
const ThumbnailProfile* ReferenceProfile(const DirectoryJob& job) {
  return GetProfileAt(job.profiles, GetProfileCount(job.profiles, 0) - 1, 0);
}

}  // namespace

PhotoPass::PhotoPass(const DirectoryJob& job, const std::string& metadataRoot,
                     const std::string& name, time_t passStart)
    : job_(job),
      photo_(job.path + "/" + name),
      metadataDir_(metadataRoot + "/" + name),
      passStart_(passStart),
      source_(photo_) {}

PhotoEnd PhotoPass::Run() {
  // The tools would look for the photo under a path that now leads elsewhere.
  if (!IsInPlace(job_.path)) {
    return PhotoEnd::kNextPhoto;
  }
  if (VLIBCFileStat(photo_.c_str(), kPhotoStatusOptions, &status_) != 0) {
    return PhotoEnd::kNextPhoto;
  }
  const HeldFolder existing(metadataDir_);
  if (checkCreateDir(metadataDir_) == 0) {
    return PhotoEnd::kNextPhoto;
  }
  const HeldFolder folder(metadataDir_);
  if (folder.Error() == ELOOP) {
    LogError("not following a link of another user: " + metadataDir_);
    return PhotoEnd::kNextPhoto;
  }
  return Process();
}

PhotoEnd PhotoPass::Process() {
  CleanFolder();
  if (!NeedsThumbs()) {
    return Report();
  }
  if (IsVolumeNearlyFull()) {
    return PhotoEnd::kStopPass;
  }
  if (!ChoosePhase()) {
    return Report();
  }
  if (phase_ == 0 && IsRaw() && !DecodeRaw()) {
    return Report();
  }
  if (!IsRegularFile(source_)) {
    return PhotoEnd::kNextPhoto;
  }
  AskIndex();
  if (phase_ == 0) {
    if (!MakePhase0()) {
      return Report();
    }
    phase_ = 1;
  }
  if (!UseReferenceThumb()) {
    return PhotoEnd::kNextPhoto;
  }
  return phase_ == 1 ? MakePhase1() : MakePhase2();
}

void PhotoPass::CleanFolder() const {
  if (!CleanPhotoFolder(metadataDir_)) {
    AppLogError(kErrorPriority, "%s:%d Failed to remove files by pattern [%s/*.fail]",
                kProgramLogSource, 880, metadataDir_.c_str());
  }
}

bool PhotoPass::NeedsThumbs() const {
  int missing = 0;
  int present = 0;
  GetThumbStatus(photo_.c_str(), &missing, &present, -1);
  return missing != 0;
}

bool PhotoPass::IsVolumeNearlyFull() const {
  if (VLIBGetFsAvailSize(job_.path.c_str()) >= kLeastFreeSpace) {
    return false;
  }
  LogError(kProgramLogSource, 893,
           "Stopping creating thumbs as the disk space is near full, " + photo_);
  return true;
}

bool PhotoPass::ChoosePhase() {
  for (phase_ = 0; phase_ <= 2; ++phase_) {
    outdated_ = IsPhaseThumbOutdated(job_, phase_, photo_, metadataDir_);
    if (outdated_ || !IsPhaseThumbComplete(job_, phase_, metadataDir_)) {
      return true;
    }
  }
  return false;
}

bool PhotoPass::IsRaw() const {
  return BlVELAIndexIsRawImage(VELAIndexExtGet(photo_.c_str()));
}

bool PhotoPass::DecodeRaw() {
  source_ = ConvertRawToJpeg(job_, photo_, metadataDir_);
  if (source_.empty()) {
    Finish(MarkAllProfilesFailed(job_, metadataDir_));
    return false;
  }
  decoded_ = true;
  if (status_.modification.seconds > passStart_) {
    CopyPhotoTime(source_, status_);
  }
  return true;
}

void PhotoPass::AskIndex() {
  autoOrient_ = GetIndexVersion(source_.c_str()) < kRotationKeepingIndexVersion;
  if (!autoOrient_ && phase_ == 0) {
    rotation_ = DetectThumbRotation(job_, source_, metadataDir_);
  }
}

int PhotoPass::MakePhase(int phase, int rotation) const {
  return CreatePhotoThumbs(job_, phase, source_, metadataDir_, autoOrient_, outdated_, rotation);
}

bool PhotoPass::MakePhase0() {
  const int result = MakePhase(0, rotation_);
  if (decoded_) {
    RemoveEntry(source_);
  }
  const int thumbs = GetProfileCount(job_.profiles, 0);
  if (result == -1) {
    // The thumbnails that are made from one of this phase cannot be made either.
    const int phase1 = MarkPhaseFailed(job_, 1, metadataDir_);
    const int phase2 = MarkPhaseFailed(job_, 2, metadataDir_);
    Finish(thumbs + phase1 + phase2);
    return false;
  }
  RegisterThumbConversion(photo_, metadataDir_ + "/" + ReferenceProfile(job_)->thumbName());
  AddConvProgress(THUMB_TYPE_PHOTO, "completed_thumb", thumbs);
  return true;
}

bool PhotoPass::UseReferenceThumb() {
  const ThumbnailProfile* reference = ReferenceProfile(job_);
  struct stat status = {};
  return reference != nullptr && FindExistingThumb(*reference, metadataDir_, source_, status) == 1;
}

PhotoEnd PhotoPass::MakePhase1() const {
  const int thumbs = GetProfileCount(job_.profiles, 1);
  if (MakePhase(1, 0) == -1) {
    Finish(thumbs + MarkPhaseFailed(job_, 2, metadataDir_));
    return Report();
  }
  AddConvProgress(THUMB_TYPE_PHOTO, "completed_thumb", thumbs);
  Report();
  return PhotoEnd::kNextPhotoQueue;
}

PhotoEnd PhotoPass::MakePhase2() const {
  MakePhase(2, 0);
  Finish(GetProfileCount(job_.profiles, 2));
  return Report();
}

void PhotoPass::Finish(int thumbs) const {
  AddConvProgress(THUMB_TYPE_PHOTO, "completed", 1);
  AddConvProgress(THUMB_TYPE_PHOTO, "completed_thumb", thumbs);
}

PhotoEnd PhotoPass::Report() const {
  PostPhotoConvert(photo_.c_str());
  return PhotoEnd::kNextPhoto;
}

}  // namespace vela
