// Input of the JPEG decoder from a file descriptor.
#pragma once

#include <cstddef>
#include <cstdio>

#include <jpeglib.h>

namespace vela {

constexpr size_t kJpegSourceBuffer = 65536;

/// The first member is the library's part.
struct JpegSource {
  jpeg_source_mgr manager;
  int descriptor;
  bool started;  ///< whether any byte has been read
  JOCTET buffer[kJpegSourceBuffer];
};

/// Makes `info` read from `descriptor`, starting at its position. A truncated file is decoded as
/// far as possible; an empty one is an error of the library.
void ReadJpegFrom(JpegSource& source, int descriptor, jpeg_decompress_struct& info);

}  // namespace vela
