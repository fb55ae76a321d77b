// What the headers of image files say. A separate, confined program examines the files, so that a
// malicious file that takes over a parser gains nothing. It is started at the first question and
// ends with this process.
#pragma once

#include <cstdint>
#include <optional>
#include <string>

namespace vela {

/// Reads the size in pixels, as stored, of the image file `path`. Returns 0 or an errno value
/// (sizes untouched), EINVAL when the file has no size that can be read. A header reader that
/// cannot be started is logged, once.
int ReadImageSize(const char* path, uint32_t& width, uint32_t& height);

/// Reads the text of the orientation of the image file `path`, empty when its EXIF data has none.
/// Returns nothing when the file cannot be read or has no EXIF data.
std::optional<std::string> ReadExifOrientation(const std::string& path);

/// Ends the header reader, if it runs, and waits for its end. The next question starts a new one.
void EndHeaderReader();

}  // namespace vela
