// Lets the JPEG library's errors end a call instead of the program.
#pragma once

#include <csetjmp>
#include <cstdio>
#include <type_traits>

#include <jpeglib.h>

namespace vela {

/// Put in place of the library's error manager. Its first member is the library's own part.
struct JpegErrors {
  jpeg_error_mgr manager;
  std::jmp_buf jump;
  char message[JMSG_LENGTH_MAX];  ///< of the error that ended a call
};

/// Prepares `errors`; the result goes into the `err` field of a compressor or decompressor.
jpeg_error_mgr* PrepareJpegErrors(JpegErrors& errors);

/// Calls the library; false when an error ended the call. The jump out of the library passes over
/// nothing that needs a destructor: `call` captures references only, and calls nothing but the
/// library's C functions.
template <typename Call>
bool CallJpegLibrary(JpegErrors& errors, const Call& call) {
  static_assert(std::is_trivially_destructible_v<Call>);
  if (setjmp(errors.jump) != 0) {
    return false;
  }
  call();
  return true;
}

}  // namespace vela
