// How a raw photo's preview must be rotated.
#pragma once

#include <string>

/// Returns the turn (degrees clockwise, from the metadata of the raw photo `rawPath`) that its
/// preview `previewPath` still needs; 0 when the preview's own tag is not upright or the turn is
/// unknown. A preview without EXIF data and a tool that cannot be started are logged.
int GetRawPreviewRotation(const std::string& rawPath, const std::string& previewPath);
