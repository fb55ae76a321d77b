#include "decoding/exif_traits.h"

#include <algorithm>
#include <memory>

#include <libexif/exif-data.h>

namespace vela {

namespace {

constexpr int kInch = 2;
constexpr int kCentimetre = 3;

struct ExifDataUnref {
  void operator()(ExifData* data) const { exif_data_unref(data); }
};
using OwnedExif = std::unique_ptr<ExifData, ExifDataUnref>;

OwnedExif Load(const uint8_t* data, size_t size) {
  OwnedExif exif(exif_data_new());
  if (exif != nullptr) {
    // This option would repair wrong tags, which changes their values and takes time.
    exif_data_unset_option(exif.get(), EXIF_DATA_OPTION_FOLLOW_SPECIFICATION);
    exif_data_load_data(exif.get(), data, static_cast<unsigned>(size));
  }
  return exif;
}

const ExifEntry* EntryOf(const OwnedExif& exif, ExifTag tag) {
  return exif_content_get_entry(exif->ifd[EXIF_IFD_0], tag);
}

int ShortOf(const OwnedExif& exif, ExifTag tag) {
  const ExifEntry* const entry = EntryOf(exif, tag);
  if (entry == nullptr || entry->format != EXIF_FORMAT_SHORT || entry->size < 2) {
    return 0;
  }
  return exif_get_short(entry->data, exif_data_get_byte_order(exif.get()));
}

/// Returns 0 when the tag is missing or invalid.
int DensityOf(const OwnedExif& exif, ExifTag tag) {
  const ExifEntry* const entry = EntryOf(exif, tag);
  if (entry == nullptr || entry->format != EXIF_FORMAT_RATIONAL || entry->size < 8) {
    return 0;
  }
  const ExifRational value = exif_get_rational(entry->data, exif_data_get_byte_order(exif.get()));
  if (value.denominator == 0) {
    return 0;
  }
  return static_cast<int>(
      std::min(static_cast<double>(value.numerator) / value.denominator, double{kMaxDensity}));
}

void ReadDensity(const OwnedExif& exif, JpegDensity& density) {
  const int x = DensityOf(exif, EXIF_TAG_X_RESOLUTION);
  const int y = DensityOf(exif, EXIF_TAG_Y_RESOLUTION);
  const int unit = ShortOf(exif, EXIF_TAG_RESOLUTION_UNIT);
  if (x == 0 || y == 0) {
    return;
  }
  density.x = x;
  density.y = y;
  if (unit == kInch || unit == kCentimetre) {
    density.unit = unit - 1;
  }
}

}  // namespace

void ReadExifTraits(const uint8_t* data, size_t size, PhotoTraits& traits) {
  const OwnedExif exif = Load(data, size);
  if (exif == nullptr) {
    return;
  }
  const int orientation = ShortOf(exif, EXIF_TAG_ORIENTATION);
  if (orientation >= 1 && orientation <= 8) {
    traits.orientation = orientation;
  }
  ReadDensity(exif, traits.density);
}

}  // namespace vela
