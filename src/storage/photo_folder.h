// Cleaning the metadata folder of one photo before its thumbnails are made.
#pragma once

#include <string>

namespace vela {

/// Removes what an interrupted run has left in the folder `path`: unfinished thumbnails, decoded
/// copies, trial images and scratch files of the tools. Only for the holder of the directory's
/// lock, because a running velathumb uses files of the same names.
void RemoveLeftovers(const std::string& path);

/// Does the same and removes the failure markers. Returns false when one of these could not be
/// removed; the others are still removed.
bool CleanPhotoFolder(const std::string& path);

}  // namespace vela
