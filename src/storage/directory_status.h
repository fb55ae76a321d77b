// The photos of one directory and the states of their thumbnails.
#pragma once

#include <functional>
#include <string>

#include "storage/photo_thumb_states.h"

namespace vela {

/// Takes the path of a photo and the states of its thumbnails.
using PhotoStatusVisitor = std::function<void(const std::string&, const PhotoThumbStates&)>;

/// Calls `visit` for each photo of the directory `dir`, subdirectories not entered, in the order in
/// which the system lists them. Ends early when `shouldStop`, asked before each photo is examined,
/// returns true. Returns false when `dir` is not a directory or cannot be opened; the latter is
/// logged.
bool ForEachPhotoStatus(const char* dir, const PhotoStatusVisitor& visit,
                        const std::function<bool()>& shouldStop = nullptr);

}  // namespace vela
