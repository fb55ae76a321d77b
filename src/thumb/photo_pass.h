// The decisions about one photo.
#pragma once

#include <ctime>
#include <string>

#include "platform/vlibc.h"
#include "profiles/directory_job.h"

namespace vela {

/// How the processing of a photo ended.
enum class PhotoEnd {
  kNextPhoto,       ///< finished, successfully or not
  kNextPhotoQueue,  ///< the same, and the directory needs a later run
  kStopPass,        ///< no further photo of the directory may be started
};

/// Processes the phases of one photo that are due. A failure leaves failure markers, is counted and
/// reported, and never stops the pass.
class PhotoPass {
 public:
  /// `name` is the photo's name in the job's directory, `metadataRoot` the directory that holds the
  /// metadata directories of its photos, `passStart` when the pass began.
  PhotoPass(const DirectoryJob& job, const std::string& metadataRoot, const std::string& name,
            time_t passStart);

  PhotoEnd Run();

 private:
  PhotoEnd Process();
  void CleanFolder() const;
  bool NeedsThumbs() const;
  bool IsVolumeNearlyFull() const;
  bool ChoosePhase();
  bool IsRaw() const;
  bool DecodeRaw();
  void AskIndex();
  int MakePhase(int phase, int rotation) const;
  bool MakePhase0();
  bool UseReferenceThumb();
  PhotoEnd MakePhase1() const;
  PhotoEnd MakePhase2() const;
  void Finish(int thumbs) const;
  PhotoEnd Report() const;

  const DirectoryJob& job_;
  const std::string photo_;
  const std::string metadataDir_;
  const time_t passStart_;

  VLIBCFileStatus status_ = {};
  std::string source_;       ///< what the thumbnails are currently made from
  bool decoded_ = false;     ///< the source is a temporary copy of a raw photo
  int phase_ = 0;            ///< the first phase that is due
  bool outdated_ = false;    ///< it is due because the photo is newer than a thumbnail
  bool autoOrient_ = false;  ///< the converter turns the photo upright
  int rotation_ = 0;         ///< degrees clockwise
};

}  // namespace vela
