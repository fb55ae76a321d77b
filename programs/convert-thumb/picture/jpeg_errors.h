// Turns fatal errors of the JPEG library, which end the program by default, into failed calls.
#pragma once

#include <csetjmp>
#include <cstdio>
#include <type_traits>

#include <jpeglib.h>

namespace vela {

/// Replaces the library's error manager. The first member is the library's part.
struct JpegErrors {
  jpeg_error_mgr manager;
  std::jmp_buf jump;
  char message[JMSG_LENGTH_MAX];  ///< of the error that aborted a call
};

/// Initialises `errors`. Returns the value for the `err` field of a compressor or decompressor.
jpeg_error_mgr* PrepareJpegErrors(JpegErrors& errors);

/// Calls the library. Returns false when an error aborted the call. Errors leave the library by
/// longjmp, which skips destructors: `call` must capture only references and call only C functions
/// of the library.
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
