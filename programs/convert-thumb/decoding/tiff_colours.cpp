#include "decoding/tiff_colours.h"

#include <cstdint>

#include "process/source_file.h"

namespace vela {

namespace {

constexpr char kNoName[] = "";
constexpr char kReadWithoutMapping[] = "rm";

TiffColours ColoursOf(uint16_t photometric, uint16_t compression) {
  switch (photometric) {
    case PHOTOMETRIC_MINISWHITE:
    case PHOTOMETRIC_MINISBLACK:
    case PHOTOMETRIC_RGB:
    case PHOTOMETRIC_SEPARATED:
      return TiffColours::kSupported;
    case PHOTOMETRIC_PALETTE:
      return TiffColours::kPalette;
    case PHOTOMETRIC_YCBCR:
      // The JPEG library converts them to RGB.
      return compression == COMPRESSION_JPEG ? TiffColours::kSupported : TiffColours::kUnsupported;
    default:
      return TiffColours::kUnsupported;
  }
}

}  // namespace

TiffColours ReadTiffColours(const VipsLibrary& vips, int descriptor) {
  FileDescriptor copy = Duplicate(descriptor);
  if (!copy.IsOpen()) {
    return TiffColours::kUnsupported;
  }
  TIFF* const tiff = vips.openTiff(copy.Get(), kNoName, kReadWithoutMapping);
  if (tiff == nullptr) {
    return TiffColours::kUnsupported;
  }
  copy.Release();
  uint16_t photometric = 0;
  uint16_t compression = 0;
  const bool known = vips.getTiffField(tiff, TIFFTAG_PHOTOMETRIC, &photometric) != 0 &&
                     vips.getTiffField(tiff, TIFFTAG_COMPRESSION, &compression) != 0;
  vips.closeTiff(tiff);
  Rewind(descriptor);
  return known ? ColoursOf(photometric, compression) : TiffColours::kUnsupported;
}

}  // namespace vela
