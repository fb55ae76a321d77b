#include "likeness/jpeg_maker.h"

#include <algorithm>

#include "support/jpeg_encoder.h"

namespace vela_test {
namespace {

bool HasInks(JpegColours colours) {
  return colours == JpegColours::kCmyk || colours == JpegColours::kLumaChromaInk;
}

J_COLOR_SPACE StoredSpace(JpegColours colours) {
  switch (colours) {
    case JpegColours::kRgb:
      return JCS_RGB;
    case JpegColours::kGrey:
      return JCS_GRAYSCALE;
    case JpegColours::kCmyk:
      return JCS_CMYK;
    case JpegColours::kLumaChromaInk:
      return JCS_YCCK;
    case JpegColours::kLumaChroma:
      break;
  }
  return JCS_YCbCr;
}

/// The inks of a pixel: half of what the three have in common is printed black.
void AppendInks(const uint8_t* rgb, bool inverted, std::string& row) {
  const int black = (255 - std::max({rgb[0], rgb[1], rgb[2]})) / 2;
  for (int i = 0; i < 4; ++i) {
    const int ink = i == 3 ? black : (255 - rgb[i] - black) * 255 / (255 - black);
    row += static_cast<char>(inverted ? 255 - ink : ink);
  }
}

void AppendPixel(const uint16_t* samples, const JpegKind& kind, std::string& row) {
  uint8_t rgb[3];
  std::transform(samples, samples + 3, rgb,
                 [](uint16_t sample) { return static_cast<uint8_t>(sample >> 8); });
  if (HasInks(kind.colours)) {
    AppendInks(rgb, kind.editorMarker, row);
  } else if (kind.colours == JpegColours::kGrey) {
    row += static_cast<char>((rgb[0] * 299 + rgb[1] * 587 + rgb[2] * 114) / 1000);
  } else {
    row.append(reinterpret_cast<const char*>(rgb), 3);
  }
}

void SetInput(const Samples& picture, JpegColours colours, jpeg_compress_struct* encoder) {
  encoder->image_width = static_cast<JDIMENSION>(picture.width);
  encoder->image_height = static_cast<JDIMENSION>(picture.height);
  encoder->input_components = HasInks(colours) ? 4 : colours == JpegColours::kGrey ? 1 : 3;
  encoder->in_color_space = HasInks(colours)                ? JCS_CMYK
                            : colours == JpegColours::kGrey ? JCS_GRAYSCALE
                                                            : JCS_RGB;
}

void SetSampling(const JpegKind& kind, jpeg_compress_struct* encoder) {
  for (int i = 0; i < encoder->num_components; ++i) {
    // Black has the same resolution as luma.
    const bool isFine = i == 0 || i == 3;
    encoder->comp_info[i].h_samp_factor = isFine && encoder->num_components > 1 ? kind.across : 1;
    encoder->comp_info[i].v_samp_factor = isFine && encoder->num_components > 1 ? kind.down : 1;
  }
}

void SetKind(const JpegKind& kind, jpeg_compress_struct* encoder) {
  jpeg_set_defaults(encoder);
  jpeg_set_colorspace(encoder, StoredSpace(kind.colours));
  jpeg_set_quality(encoder, kind.quality, TRUE);
  SetSampling(kind, encoder);
  if (kind.progressive) {
    jpeg_simple_progression(encoder);
  }
  encoder->arith_code = kind.arithmetic ? TRUE : FALSE;
  encoder->restart_in_rows = kind.restartRows;
  if (HasInks(kind.colours)) {
    encoder->write_Adobe_marker = kind.editorMarker ? TRUE : FALSE;
  }
  if (kind.dotsPerInch > 0) {
    encoder->density_unit = 1;
    encoder->X_density = static_cast<UINT16>(kind.dotsPerInch);
    encoder->Y_density = static_cast<UINT16>(kind.dotsPerInch);
  }
}

/// An EXIF block that contains only the orientation.
std::string ExifOf(int orientation) {
  std::string block("Exif\0\0MM\0\x2a\0\0\0\x08\0\x01\x01\x12\0\x03\0\0\0\x01\0\0\0\0\0\0\0\0", 32);
  block[25] = static_cast<char>(orientation);
  return block;
}

void WriteMetadata(const JpegKind& kind, jpeg_compress_struct* encoder) {
  if (kind.orientation >= 0) {
    const std::string exif = ExifOf(kind.orientation);
    jpeg_write_marker(encoder, JPEG_APP0 + 1, reinterpret_cast<const JOCTET*>(exif.data()),
                      static_cast<unsigned int>(exif.size()));
  }
  if (!kind.profile.empty()) {
    jpeg_write_icc_profile(encoder, reinterpret_cast<const JOCTET*>(kind.profile.data()),
                           static_cast<unsigned int>(kind.profile.size()));
  }
}

void WriteRows(const Samples& picture, const JpegKind& kind, jpeg_compress_struct* encoder) {
  const uint16_t* sample = picture.values.data();
  std::string row;
  while (encoder->next_scanline < encoder->image_height) {
    row.clear();
    for (int x = 0; x < picture.width; ++x, sample += picture.channels) {
      AppendPixel(sample, kind, row);
    }
    JSAMPROW rows[] = {reinterpret_cast<JSAMPROW>(row.data())};
    jpeg_write_scanlines(encoder, rows, 1);
  }
}

}  // namespace

std::string EncodeKind(const Samples& picture, const JpegKind& kind) {
  return EncodeJpeg(
      [&](jpeg_compress_struct* encoder) {
        SetInput(picture, kind.colours, encoder);
        SetKind(kind, encoder);
      },
      [&](jpeg_compress_struct* encoder) {
        WriteMetadata(kind, encoder);
        WriteRows(picture, kind, encoder);
      });
}

}  // namespace vela_test
