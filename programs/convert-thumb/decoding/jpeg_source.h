// Feeds the JPEG decoder from a file descriptor.
#pragma once

#include <cstddef>
#include <cstdio>

#include <jpeglib.h>

namespace vela {

constexpr size_t kJpegSourceBuffer = 65536;

/// Its first member is the library's own part.
struct JpegSource {
  jpeg_source_mgr manager;
  int descriptor;
  bool started;  ///< whether any byte has been read
  JOCTET buffer[kJpegSourceBuffer];
};

/// Makes `info` read from `descriptor`, from where it stands. A file that ends too early is
/// decoded as far as it goes; an empty one is the library's error.
void ReadJpegFrom(JpegSource& source, int descriptor, jpeg_decompress_struct& info);

}  // namespace vela
