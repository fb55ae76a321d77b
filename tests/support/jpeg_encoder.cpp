#include "support/jpeg_encoder.h"

#include <cstdlib>

#include "support/environment_failure.h"

namespace vela_test {

namespace {

[[noreturn]] void EncoderFailed(j_common_ptr encoder) {
  char message[JMSG_LENGTH_MAX];
  encoder->err->format_message(encoder, message);
  EnvironmentFailure(std::string("cannot encode a JPEG: ") + message);
}

}  // namespace

std::string EncodeJpeg(const std::function<void(jpeg_compress_struct* encoder)>& setUp,
                       const std::function<void(jpeg_compress_struct* encoder)>& write) {
  jpeg_compress_struct encoder{};
  jpeg_error_mgr errors{};
  encoder.err = jpeg_std_error(&errors);
  errors.error_exit = EncoderFailed;
  jpeg_create_compress(&encoder);
  unsigned char* bytes = nullptr;
  unsigned long size = 0;
  jpeg_mem_dest(&encoder, &bytes, &size);
  setUp(&encoder);
  jpeg_start_compress(&encoder, TRUE);
  write(&encoder);
  jpeg_finish_compress(&encoder);
  std::string file(reinterpret_cast<const char*>(bytes), size);
  jpeg_destroy_compress(&encoder);
  std::free(bytes);
  return file;
}

}  // namespace vela_test
