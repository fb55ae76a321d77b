// Encodes JPEGs with the JPEG library.
#pragma once

#include <cstdio>  // before jpeglib.h, which uses FILE
#include <functional>
#include <string>

#include <jpeglib.h>

namespace vela_test {

/// Returns the file of an encoder that `setUp` gives a size and its options, and `write` metadata
/// and all rows. Ends the test program when the library reports an error.
std::string EncodeJpeg(const std::function<void(jpeg_compress_struct* encoder)>& setUp,
                       const std::function<void(jpeg_compress_struct* encoder)>& write);

}  // namespace vela_test
