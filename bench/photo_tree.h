// Directories of photos to measure with.
#pragma once

#include <string>

namespace vela_bench {

/// Makes `directory` with `count` photo files of a few bytes.
void MakePhotoFiles(const std::string& directory, int count);

/// Gives every photo of MakePhotoFiles its metadata directory with all six thumbnails, newer than
/// the photo.
void MakeThumbFiles(const std::string& directory, int count);

/// Makes `directory` with `count` real JPEG photos of `width` x `height` pixels.
void MakeRealPhotos(const std::string& directory, int count, int width, int height);

/// Removes the metadata of all photos in `directory`.
void RemoveMetadata(const std::string& directory);

}  // namespace vela_bench
