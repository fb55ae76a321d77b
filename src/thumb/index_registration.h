// Registers new thumbnails with the index.
#pragma once

#include <string>

/// Registers the thumbnail made from a photo, both with their pixel size. When a size cannot be
/// read nothing is registered, which is logged.
void RegisterThumbConversion(const std::string& photoPath, const std::string& thumbPath);
