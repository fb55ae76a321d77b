#include "picture/jpeg_errors.h"

namespace vela {

namespace {

void AbortCall(j_common_ptr info) {
  JpegErrors* const errors = reinterpret_cast<JpegErrors*>(info->err);
  info->err->format_message(info, errors->message);
  std::longjmp(errors->jump, 1);
}

/// Damaged data is decoded as far as possible without a message: the thumbnail is still useful.
void CountWarning(j_common_ptr info, int level) {
  if (level < 0) {
    ++info->err->num_warnings;
  }
}

}  // namespace

jpeg_error_mgr* PrepareJpegErrors(JpegErrors& errors) {
  jpeg_std_error(&errors.manager);
  errors.manager.error_exit = AbortCall;
  errors.manager.emit_message = CountWarning;
  errors.message[0] = '\0';
  return &errors.manager;
}

}  // namespace vela
