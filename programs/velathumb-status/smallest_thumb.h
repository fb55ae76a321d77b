// The picture that stands for a photo on a page.
#pragma once

#include <cstddef>
#include <string>

namespace vela {

/// Larger files are left out of a page, bytes.
inline constexpr size_t kLargestEmbeddedThumb = 4 * 1024 * 1024;

/// Returns the bytes of the smallest thumbnail of the photo `path`, under its current or its older
/// name. One that is empty, cannot be read or is larger than kLargestEmbeddedThumb is passed over.
/// Empty when no thumbnail is left.
std::string ReadSmallestThumb(const std::string& path);

}  // namespace vela
