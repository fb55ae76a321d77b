// Decoding of JPEGs, strictly: the library's warnings count as failures.
#include <csetjmp>
#include <cstdio>  // before jpeglib.h, which uses FILE
#include <utility>

#include <jpeglib.h>

#include "support/files.h"
#include "support/image_checks.h"

namespace vela_test {

namespace {

constexpr int kRgbParts = 3;
constexpr int kCmykParts = 4;

struct Decoder {
  jpeg_decompress_struct library{};
  jpeg_error_mgr errors{};
  jmp_buf failure{};
  char message[JMSG_LENGTH_MAX] = "";
};

/// Any error or warning ends the decoding.
[[noreturn]] void FailDecoding(j_common_ptr library) {
  auto* decoder = static_cast<Decoder*>(library->client_data);
  library->err->format_message(library, decoder->message);
  std::longjmp(decoder->failure, 1);
}

void OnMessage(j_common_ptr library, int level) {
  if (level < 0) {
    FailDecoding(library);
  }
}

/// Decodes into `pixels`; returns whether it succeeded. No local object may have a destructor,
/// since a failure leaves by longjmp.
bool Decode(const std::string& file, Decoder* decoder, std::vector<uint8_t>* pixels) {
  jpeg_decompress_struct* library = &decoder->library;
  library->err = jpeg_std_error(&decoder->errors);
  decoder->errors.error_exit = FailDecoding;
  decoder->errors.emit_message = OnMessage;
  library->client_data = decoder;
  if (setjmp(decoder->failure) != 0) {
    return false;
  }
  jpeg_create_decompress(library);
  jpeg_mem_src(library, reinterpret_cast<const unsigned char*>(file.data()), file.size());
  jpeg_read_header(library, TRUE);
  library->out_color_space = library->num_components == kCmykParts ? JCS_CMYK : JCS_RGB;
  jpeg_start_decompress(library);
  const size_t rowSize =
      static_cast<size_t>(library->output_width) * static_cast<size_t>(library->output_components);
  pixels->resize(rowSize * library->output_height);
  while (library->output_scanline < library->output_height) {
    JSAMPROW row = pixels->data() + rowSize * library->output_scanline;
    jpeg_read_scanlines(library, &row, 1);
  }
  jpeg_finish_decompress(library);
  return true;
}

/// Inks, stored inverted, as colours.
std::vector<uint8_t> RgbOfInks(const std::vector<uint8_t>& inks) {
  std::vector<uint8_t> pixels;
  for (size_t i = 0; i + kCmykParts <= inks.size(); i += kCmykParts) {
    for (size_t part = 0; part < kRgbParts; ++part) {
      pixels.push_back(static_cast<uint8_t>(inks[i + part] * inks[i + kRgbParts] / 255));
    }
  }
  return pixels;
}

}  // namespace

std::optional<DecodedImage> DecodeJpeg(const std::string& path, std::string* why) {
  std::string reason;
  std::string& problem = why != nullptr ? *why : reason;
  if (!IsRegularFile(path)) {
    problem = "no such file";
    return std::nullopt;
  }
  const std::string file = ReadFile(path);
  Decoder decoder;
  std::vector<uint8_t> pixels;
  const bool decoded = Decode(file, &decoder, &pixels);
  const int width = static_cast<int>(decoder.library.output_width);
  const int height = static_cast<int>(decoder.library.output_height);
  const int components = decoder.library.num_components;
  const size_t left = decoded ? decoder.library.src->bytes_in_buffer : 0;
  jpeg_destroy_decompress(&decoder.library);
  problem =
      decoded ? (left == 0 ? "" : std::to_string(left) + " bytes behind the end") : decoder.message;
  if (!problem.empty()) {
    return std::nullopt;
  }
  return DecodedImage(width, height, components,
                      components == kCmykParts ? RgbOfInks(pixels) : std::move(pixels));
}

bool IsWholeJpeg(const std::string& path) {
  return DecodeJpeg(path).has_value();
}

}  // namespace vela_test
