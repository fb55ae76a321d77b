#include "decoding/tiff_colours.h"

#include <fcntl.h>
#include <unistd.h>

#include <cstdint>

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
      return TiffColours::kUsual;
    case PHOTOMETRIC_PALETTE:
      return TiffColours::kPalette;
    case PHOTOMETRIC_YCBCR:
      // The JPEG library makes red, green and blue of them.
      return compression == COMPRESSION_JPEG ? TiffColours::kUsual : TiffColours::kUnusual;
    default:
      return TiffColours::kUnusual;
  }
}

}  // namespace

TiffColours ReadTiffColours(const VipsLibrary& vips, int descriptor) {
  const int copy = fcntl(descriptor, F_DUPFD_CLOEXEC, 0);
  if (copy < 0) {
    return TiffColours::kUnusual;
  }
  TIFF* const tiff = vips.openTiff(copy, kNoName, kReadWithoutMapping);
  if (tiff == nullptr) {
    close(copy);
    return TiffColours::kUnusual;
  }
  uint16_t photometric = 0;
  uint16_t compression = 0;
  const bool known = vips.getTiffField(tiff, TIFFTAG_PHOTOMETRIC, &photometric) != 0 &&
                     vips.getTiffField(tiff, TIFFTAG_COMPRESSION, &compression) != 0;
  vips.closeTiff(tiff);
  lseek(descriptor, 0, SEEK_SET);
  return known ? ColoursOf(photometric, compression) : TiffColours::kUnusual;
}

}  // namespace vela
