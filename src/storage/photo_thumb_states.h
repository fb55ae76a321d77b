// The states of one photo's thumbnails, size class by size class.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>

#include "storage/thumb_size_class.h"

namespace vela {

enum class ThumbState {
  kNotWanted,  ///< not in the size map, or the photo could not be looked up
  kPresent,
  kMissing,
  kOutdated,  ///< older than the photo, or empty
};

/// How the lookup of a photo ended.
enum class PhotoLookup {
  kAbsent,  ///< the photo does not exist
  kFailed,  ///< its thumbnails cannot be looked up
  kDone,
};

/// The states of a photo's thumbnails by size class.
struct PhotoThumbStates {
  PhotoLookup lookup = PhotoLookup::kAbsent;
  std::array<ThumbState, kThumbSizeCount> states = {};

  /// Returns whether the thumbnail of the size class `size` is missing or outdated.
  bool IsLacking(size_t size) const {
    return states[size] == ThumbState::kMissing || states[size] == ThumbState::kOutdated;
  }

  /// Returns how many thumbnails are missing or outdated.
  int Missing() const;
  /// Returns how many are present and up to date.
  int Present() const;
};

/// Examines the thumbnails of the photo `path` that `sizeMap` asks for (-1: ask the index library).
/// A photo that cannot be looked up is logged.
PhotoThumbStates ReadPhotoThumbStates(const char* path, int32_t sizeMap);

}  // namespace vela
