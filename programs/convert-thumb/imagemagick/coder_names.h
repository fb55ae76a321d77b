// ImageMagick's names of the formats that it may be used for.
#pragma once

#include <string>

#include "picture/photo_format.h"

namespace vela {

/// Returns the prefix by which ImageMagick reads a format, such as "PSD:"; empty for an unknown
/// format.
std::string CoderPrefix(PhotoFormat format);

/// Returns the prefix by which ImageMagick writes a file whose name has this extension, such as
/// "jpg:"; empty when it is not the extension of a format of photos.
std::string CoderPrefix(const std::string& extension);

/// Returns true for bytes without a special meaning to ImageMagick anywhere in a name.
bool IsPlainName(const std::string& name);

}  // namespace vela
