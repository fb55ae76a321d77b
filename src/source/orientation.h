// How a raw photo's preview must be turned.
#pragma once

#include <string>

/// Returns the turn (degrees clockwise, as the raw photo `rawPath` states it) that its preview
/// `previewPath` still needs; 0 when the preview says it is not upright, and when the turn cannot
/// be told. A preview without EXIF data and a tool that cannot be started are logged.
int GetRawPreviewRotation(const std::string& rawPath, const std::string& previewPath);
