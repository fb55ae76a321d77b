#include "decoding/vips_traits.h"

#include <algorithm>
#include <cstring>

#include "decoding/exif_traits.h"
#include "picture/picture.h"

namespace vela {

namespace {

constexpr char kBackground[] = "background";
constexpr char kPaletteDepth[] = "palette-bit-depth";
constexpr double kMillimetresPerInch = 25.4;
constexpr double kMillimetresPerCentimetre = 10;
/// Rounding error of converting a density to millimetres and back.
constexpr double kDensityError = 1e-3;
constexpr int kPerInch = 1;
constexpr int kPerCentimetre = 2;
constexpr char kCentimetres[] = "cm";

std::vector<uint8_t> BlobOf(const VipsLibrary& vips, VipsImage* image, const char* name) {
  const void* data = nullptr;
  size_t size = 0;
  if (!HasVipsField(vips, image, name) || vips.getBlob(image, name, &data, &size) != 0) {
    return {};
  }
  const auto* const bytes = static_cast<const uint8_t*>(data);
  return std::vector<uint8_t>(bytes, bytes + size);
}

int IntOf(const VipsLibrary& vips, VipsImage* image, const char* name, int otherwise) {
  int value = otherwise;
  if (HasVipsField(vips, image, name)) {
    vips.getInt(image, name, &value);
  }
  return value;
}

int ToDensity(double perMillimetre, double millimetres) {
  return static_cast<int>(
      std::clamp(perMillimetre * millimetres + kDensityError, 0.0, double{kMaxDensity}));
}

bool IsPerCentimetre(const VipsLibrary& vips, VipsImage* image) {
  const char* unit = nullptr;
  return HasVipsField(vips, image, VIPS_META_RESOLUTION_UNIT) &&
         vips.getString(image, VIPS_META_RESOLUTION_UNIT, &unit) == 0 &&
         std::strcmp(unit, kCentimetres) == 0;
}

void ReadDensity(const VipsLibrary& vips, VipsImage* image, PhotoFormat format,
                 JpegDensity& density) {
  // One per millimetre is the default of a picture without a density.
  if (image->Xres == 1 && image->Yres == 1) {
    return;
  }
  const bool inches = format == PhotoFormat::kTiff && !IsPerCentimetre(vips, image);
  const double unit = inches ? kMillimetresPerInch : kMillimetresPerCentimetre;
  density.unit = inches ? kPerInch : kPerCentimetre;
  density.x = ToDensity(image->Xres, unit);
  density.y = ToDensity(image->Yres, unit);
}

bool IsPalette(const VipsLibrary& vips, VipsImage* image, PhotoFormat format) {
  const bool fewGreys = format == PhotoFormat::kPng && image->Type == VIPS_INTERPRETATION_B_W;
  return fewGreys || HasVipsField(vips, image, kPaletteDepth);
}

}  // namespace

bool HasVipsField(const VipsLibrary& vips, VipsImage* image, const char* name) {
  return vips.typeOf(image, name) != 0;
}

bool HasFurtherPages(const VipsLibrary& vips, VipsImage* image, PhotoFormat format) {
  // For JPEG 2000, this is the number of available resolutions.
  return format != PhotoFormat::kJpeg2000 && IntOf(vips, image, VIPS_META_N_PAGES, 1) > 1;
}

Background ReadVipsBackground(const VipsLibrary& vips, VipsImage* image, int bits) {
  Background background = {kBrightest, kBrightest, kBrightest};
  double* samples = nullptr;
  int count = 0;
  if (!HasVipsField(vips, image, kBackground) ||
      vips.getDoubles(image, kBackground, &samples, &count) != 0 || count < 1) {
    return background;
  }
  // A grey value is reported with its stored depth, of 16 bits only the upper 8.
  const double max = (1 << (count == 1 ? bits : 8)) - 1;
  for (size_t i = 0; i < background.size(); ++i) {
    const double sample = samples[std::min(i, static_cast<size_t>(count) - 1)];
    background[i] = static_cast<float>(std::clamp(sample / max, 0.0, 1.0)) * kBrightest;
  }
  return background;
}

PhotoTraits ReadVipsTraits(const VipsLibrary& vips, VipsImage* image, PhotoFormat format) {
  PhotoTraits traits;
  traits.palette = IsPalette(vips, image, format);
  traits.colourProfile = BlobOf(vips, image, VIPS_META_ICC_NAME);
  traits.orientation = IntOf(vips, image, VIPS_META_ORIENTATION, 1);
  ReadDensity(vips, image, format, traits.density);
  const std::vector<uint8_t> exif = BlobOf(vips, image, VIPS_META_EXIF_NAME);
  if (!exif.empty() && format != PhotoFormat::kPng) {
    ReadExifTraits(exif.data(), exif.size(), traits);
  }
  if (format == PhotoFormat::kHeif || format == PhotoFormat::kPng) {
    // The decoder has already turned a HEIF picture; for PNG, ImageMagick ignores the orientation.
    traits.orientation = 1;
  }
  return traits;
}

}  // namespace vela
