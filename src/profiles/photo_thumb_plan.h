// The plan of one photo and one phase: which thumbnails to make now, and the failure markers when
// that fails.
#pragma once

#include <sys/stat.h>

#include <string>

#include "convert/photo_convert_job.h"
#include "profiles/directory_job.h"
#include "profiles/thumbnail_profile.h"

/// Makes the missing thumbnails of one phase of the photo `srcPath` in its metadata directory
/// `eaDir`; `rotate` is in degrees clockwise. Returns 0 when nothing was missing or everything was
/// made, -1 when the source is missing or the conversion failed (the phase then has failure
/// markers).
int CreatePhotoThumbs(const DirectoryJob& dirJob, int phaseIndex, const std::string& srcPath,
                      const std::string& eaDir, bool autoOrient, bool ignoredFlag, int rotate);

/// Makes the one image `outDir`/`fileName` from `srcPath`, scaled according to `profile` and
/// rotated by `rotate` degrees. Returns 0, or -1.
int CreateRotatedThumb(const DirectoryJob& dirJob, int rotate, const ThumbnailProfile& profile,
                       const std::string& srcPath, const std::string& fileName,
                       const std::string& outDir);

/// Gives `setting` its temporary output name and appends a copy of it to `job`.
void AddPhotoThumbSetting(PhotoConvertJob& job, PhotoThumbSetting& setting);

/// Looks in `eaDir` for the profile's thumbnail, under the written name and then under the
/// configured one. Returns 1 and fills path and status when one exists, else 0 with the path
/// unchanged.
int FindExistingThumb(const ThumbnailProfile& profile, const std::string& eaDir,
                      std::string& foundPath, struct stat& foundStat);

/// Returns 1 when the profile's thumbnail exists, is not empty and not older than `srcPath`, else
/// 0.
int IsThumbUpToDate(const ThumbnailProfile& profile, const std::string& srcPath,
                    const std::string& eaDir);

/// Deletes the profile's thumbnail and failure marker under both names; errors are ignored.
void RemoveThumbAndFailMarker(const ThumbnailProfile& profile, const std::string& eaDir);

/// Replaces the profile's thumbnail with an empty failure marker; errors are ignored.
void CreateThumbFailMarker(const ThumbnailProfile& profile, const std::string& eaDir);

namespace vela {

/// Runs CreateThumbFailMarker for every profile of the phase. Returns their number.
int CreatePhaseFailMarkers(const DirectoryJob& dirJob, int phaseIndex, const std::string& eaDir);

}  // namespace vela
