#include <vector>

#include "support/images.h"
#include "support/jpeg_encoder.h"
#include "support/quadrants.h"

namespace vela_test {

namespace {

constexpr int kRgbParts = 3;

uint8_t GreyOf(const uint8_t* rgb) {
  return static_cast<uint8_t>((rgb[0] * 299 + rgb[1] * 587 + rgb[2] * 114) / 1000);
}

/// One row in the colours of the file. Inks are stored inverted, as image editors do.
std::vector<uint8_t> Row(const uint8_t* rgb, int width, JpegColour colour) {
  std::vector<uint8_t> row;
  for (int x = 0; x < width; ++x, rgb += kRgbParts) {
    if (colour == JpegColour::kGrey) {
      row.push_back(GreyOf(rgb));
      continue;
    }
    row.insert(row.end(), rgb, rgb + kRgbParts);
    if (colour == JpegColour::kCmyk) {
      row.push_back(255);  // no black ink
    }
  }
  return row;
}

void SetColour(JpegColour colour, jpeg_compress_struct* encoder) {
  switch (colour) {
    case JpegColour::kRgb:
      encoder->input_components = kRgbParts;
      encoder->in_color_space = JCS_RGB;
      break;
    case JpegColour::kGrey:
      encoder->input_components = 1;
      encoder->in_color_space = JCS_GRAYSCALE;
      break;
    case JpegColour::kCmyk:
      encoder->input_components = 4;
      encoder->in_color_space = JCS_CMYK;
      break;
  }
}

void WriteRows(const JpegRecipe& recipe, jpeg_compress_struct* encoder) {
  const std::string pixels = QuadrantPixels(recipe.width, recipe.height);
  const auto* data = reinterpret_cast<const uint8_t*>(pixels.data());
  while (encoder->next_scanline < encoder->image_height) {
    const size_t offset =
        static_cast<size_t>(encoder->next_scanline) * static_cast<size_t>(recipe.width) * kRgbParts;
    std::vector<uint8_t> row = Row(data + offset, recipe.width, recipe.colour);
    JSAMPROW rows[] = {row.data()};
    jpeg_write_scanlines(encoder, rows, 1);
  }
}

void SetUp(const JpegRecipe& recipe, jpeg_compress_struct* encoder) {
  encoder->image_width = static_cast<JDIMENSION>(recipe.width);
  encoder->image_height = static_cast<JDIMENSION>(recipe.height);
  SetColour(recipe.colour, encoder);
  jpeg_set_defaults(encoder);
  jpeg_set_quality(encoder, recipe.quality, TRUE);
}

void WriteProfile(jpeg_compress_struct* encoder) {
  const std::string profile = SrgbProfile();
  jpeg_write_icc_profile(encoder, reinterpret_cast<const JOCTET*>(profile.data()),
                         static_cast<unsigned int>(profile.size()));
}

}  // namespace

std::string EncodeJpeg(const JpegRecipe& recipe) {
  return EncodeJpeg([&](jpeg_compress_struct* encoder) { SetUp(recipe, encoder); },
                    [&](jpeg_compress_struct* encoder) {
                      if (recipe.iccProfile) {
                        WriteProfile(encoder);
                      }
                      WriteRows(recipe, encoder);
                    });
}

}  // namespace vela_test
