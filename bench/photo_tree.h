// Directories of photos for measurements.
#pragma once

#include <string>

namespace vela_bench {

/// Creates `directory` with `count` photo files of a few bytes.
void MakePhotoFiles(const std::string& directory, int count);

/// Creates the metadata directory of every photo of MakePhotoFiles, with all six thumbnails, newer
/// than the photo.
void MakeThumbFiles(const std::string& directory, int count);

/// Creates `directory` with `count` real JPEG photos of `width` x `height` pixels.
void MakeRealPhotos(const std::string& directory, int count, int width, int height);

/// Removes the metadata of all photos in `directory`.
void RemoveMetadata(const std::string& directory);

}  // namespace vela_bench
