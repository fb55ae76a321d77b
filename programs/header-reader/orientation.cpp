#include "orientation.h"

#include <libexif/exif-data.h>
#include <libexif/exif-loader.h>

#include <memory>

namespace vela {

namespace {

struct LoaderUnref {
  void operator()(ExifLoader* loader) const { exif_loader_unref(loader); }
};
struct DataUnref {
  void operator()(ExifData* data) const { exif_data_unref(data); }
};

/// Returns null when there is no EXIF data.
std::unique_ptr<ExifData, DataUnref> LoadData(FILE* file) {
  const std::unique_ptr<ExifLoader, LoaderUnref> loader(exif_loader_new());
  unsigned char chunk[1024];
  size_t count = 0;
  do {
    count = std::fread(chunk, 1, sizeof chunk, file);
  } while (count > 0 && exif_loader_write(loader.get(), chunk, static_cast<unsigned>(count)) != 0);
  return std::unique_ptr<ExifData, DataUnref>(exif_loader_get_data(loader.get()));
}

}  // namespace

bool ReadOrientation(FILE* file, char (&text)[kOrientationTextSize]) {
  const auto data = LoadData(file);
  if (data == nullptr) {
    return false;
  }
  ExifEntry* entry = exif_content_get_entry(data->ifd[EXIF_IFD_0], EXIF_TAG_ORIENTATION);
  if (entry != nullptr) {
    exif_entry_get_value(entry, text, kOrientationTextSize);
  }
  return true;
}

}  // namespace vela
