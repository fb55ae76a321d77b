#include "likeness/output.h"

#include <algorithm>
#include <cmath>
#include <cstdio>  // before jpeglib.h, which uses FILE
#include <cstdlib>

#include <jpeglib.h>

#include "support/environment_failure.h"
#include "support/files.h"
#include "support/image_checks.h"

namespace vela_test {
namespace {

[[noreturn]] void DecoderFailed(j_common_ptr decoder) {
  char message[JMSG_LENGTH_MAX];
  decoder->err->format_message(decoder, message);
  EnvironmentFailure(std::string("cannot decode a thumbnail: ") + message);
}

std::string Pair(int one, int other) {
  return std::to_string(one) + "x" + std::to_string(other);
}

std::string SamplingOf(const jpeg_decompress_struct& decoder) {
  std::string text;
  for (int i = 0; i < decoder.num_components; ++i) {
    const jpeg_component_info& component = decoder.comp_info[i];
    text += (i > 0 ? "," : "") + Pair(component.h_samp_factor, component.v_samp_factor);
  }
  return text;
}

std::string DensityOf(const jpeg_decompress_struct& decoder) {
  if (decoder.saw_JFIF_marker == FALSE) {
    return "none";
  }
  return Pair(decoder.X_density, decoder.Y_density) + " unit " +
         std::to_string(decoder.density_unit);
}

std::string ProfileOf(jpeg_decompress_struct* decoder) {
  JOCTET* bytes = nullptr;
  unsigned int size = 0;
  if (jpeg_read_icc_profile(decoder, &bytes, &size) == FALSE) {
    return "";
  }
  std::string profile(reinterpret_cast<const char*>(bytes), size);
  std::free(bytes);
  return profile;
}

std::string MetadataOf(const std::string& path) {
  const JpegMetadata metadata = ReadJpegMetadata(path);
  return std::string(metadata.exif ? "exif " : "") + (metadata.xmp ? "xmp " : "") +
         (metadata.iptc ? "iptc " : "") + (metadata.comment ? "comment " : "");
}

void ReadSamples(jpeg_decompress_struct* decoder, std::vector<uint8_t>& samples) {
  const size_t rowSize =
      static_cast<size_t>(decoder->output_width) * static_cast<size_t>(decoder->output_components);
  samples.resize(rowSize * decoder->output_height);
  while (decoder->output_scanline < decoder->output_height) {
    JSAMPROW row = samples.data() + rowSize * decoder->output_scanline;
    jpeg_read_scanlines(decoder, &row, 1);
  }
}

void Decode(const std::string& file, OutputPicture& picture) {
  jpeg_decompress_struct decoder{};
  jpeg_error_mgr errors{};
  decoder.err = jpeg_std_error(&errors);
  errors.error_exit = DecoderFailed;
  jpeg_create_decompress(&decoder);
  jpeg_save_markers(&decoder, JPEG_APP0 + 2, 0xffff);
  jpeg_mem_src(&decoder, reinterpret_cast<const unsigned char*>(file.data()), file.size());
  jpeg_read_header(&decoder, TRUE);
  if (decoder.num_components == 4) {
    decoder.out_color_space = JCS_CMYK;
  }
  picture.width = static_cast<int>(decoder.image_width);
  picture.height = static_cast<int>(decoder.image_height);
  picture.components = decoder.num_components;
  picture.sampling = SamplingOf(decoder);
  picture.density = DensityOf(decoder);
  picture.profile = ProfileOf(&decoder);
  jpeg_start_decompress(&decoder);
  ReadSamples(&decoder, picture.samples);
  jpeg_finish_decompress(&decoder);
  jpeg_destroy_decompress(&decoder);
}

std::string Difference(const std::string& what, const std::string& ours,
                       const std::string& theirs) {
  return ours == theirs ? "" : what + " " + ours + " for " + theirs + "; ";
}

std::string ProfileText(const OutputPicture& picture) {
  return picture.profile.empty() ? "none" : std::to_string(picture.profile.size()) + " bytes";
}

}  // namespace

std::optional<OutputPicture> ReadOutputPicture(const std::string& path) {
  if (!Exists(path) || !IsWholeJpeg(path)) {
    return std::nullopt;
  }
  OutputPicture picture;
  Decode(ReadFile(path), picture);
  picture.metadata = MetadataOf(path);
  return picture;
}

double Decibels(const OutputPicture& one, const OutputPicture& other) {
  double squares = 0;
  for (size_t i = 0; i < one.samples.size(); ++i) {
    const double difference = static_cast<double>(one.samples[i]) - other.samples[i];
    squares += difference * difference;
  }
  if (squares == 0) {
    return kSamePixels;
  }
  const double mean = squares / static_cast<double>(one.samples.size());
  return std::min(10 * std::log10(255.0 * 255.0 / mean), kSamePixels);
}

std::string Differences(const OutputPicture& ours, const OutputPicture& theirs) {
  std::string text =
      Difference("components", std::to_string(ours.components), std::to_string(theirs.components)) +
      Difference("sampling", ours.sampling, theirs.sampling) +
      Difference("density", ours.density, theirs.density) +
      Difference("metadata", ours.metadata, theirs.metadata) +
      Difference("profile", ProfileText(ours), ProfileText(theirs));
  if (text.empty() && ours.profile != theirs.profile) {
    text = "another profile; ";
  }
  return text;
}

}  // namespace vela_test
