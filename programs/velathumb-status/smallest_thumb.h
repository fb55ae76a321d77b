// The thumbnail that represents a photo on a page.
#pragma once

#include <cstddef>
#include <string>

namespace vela {

/// Larger thumbnails are not embedded into a page, bytes.
inline constexpr size_t kLargestEmbeddedThumb = 4 * 1024 * 1024;

/// Returns the bytes of the smallest thumbnail of the photo `path`, under its current or its older
/// name. One that is not a JPEG file, cannot be read or is larger than kLargestEmbeddedThumb is
/// skipped. Empty when there is no usable thumbnail.
std::string ReadSmallestThumb(const std::string& path);

}  // namespace vela
