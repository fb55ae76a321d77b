// Paths of the program's files in its tests, and of the files of a photo.
#pragma once

#include <string>
#include <vector>

namespace vela_test {

constexpr const char* kPhotos = "/tmp/photos";
constexpr const char* kProfiles = "/tmp/profiles.conf";
constexpr const char* kQueue = "/var/spool/thumb_create.queue";
constexpr const char* kPhotoProgress = "/var/spool/conv_progress_photo";

/// A path in kPhotos.
std::string InPhotos(const std::string& name);

/// The photo's metadata directory.
std::string MetadataDirOf(const std::string& photo);

/// Thumbnail of a size class ("XL", "M", ...) of a photo, under its current or its older name.
std::string Thumb(const std::string& photo, const std::string& sizeClass);
std::string OldThumb(const std::string& photo, const std::string& sizeClass);

/// Failure marker of a size class of a photo.
std::string Marker(const std::string& photo, const std::string& sizeClass);

/// Photo progress: the value of a key, 0 when it is missing.
int Progress(const std::string& key);

/// The command-line arguments: the usual profile file, then the directories.
std::vector<std::string> ArgumentsFor(const std::vector<std::string>& directories);

}  // namespace vela_test
