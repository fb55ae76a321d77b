// The state of a photo's thumbnails of one phase, and the marking of failed phases.
#pragma once

#include <string>

#include "profiles/directory_job.h"

/// Returns true when any thumbnail of the phase exists and is older (whole seconds) than the photo.
bool IsPhaseThumbOutdated(const DirectoryJob& job, int phase, const std::string& photoPath,
                          const std::string& metadataDir);

/// Returns true when every thumbnail of the phase exists with at least 2 bytes.
bool IsPhaseThumbComplete(const DirectoryJob& job, int phase, const std::string& metadataDir);

/// Replaces every configured thumbnail by its failure marker. Returns the number of profiles.
int MarkAllProfilesFailed(const DirectoryJob& job, const std::string& metadataDir);

/// Replaces every thumbnail of the phase by its failure marker. Returns the number of profiles.
int MarkPhaseFailed(const DirectoryJob& job, int phase, const std::string& metadataDir);
