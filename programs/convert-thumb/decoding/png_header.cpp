#include "decoding/png_header.h"

#include <algorithm>
#include <csetjmp>

#include "decoding/file_input.h"

namespace vela {

namespace {

/// The smallest exponent, in 100,000ths, for which ImageMagick treats samples as linear.
constexpr png_fixed_point kMinLinearExponent = 75000;
constexpr int kPerCentimetre = 2;
constexpr png_uint_32 kCentimetres = 100;

/// libpng allocates the size that a chunk claims to have.
constexpr png_alloc_size_t kMaxChunk = png_alloc_size_t{16} << 20;
/// The limit does not apply to all of these, and their content is not needed. Each name ends with a
/// null.
constexpr png_byte kSkippedChunks[] = "eXIf\0tEXt\0zTXt\0iTXt\0sPLT\0hIST";
constexpr int kSkippedChunkCount = sizeof kSkippedChunks / 5;

/// Global because callbacks only get libpng's own structure.
const VipsLibrary* library = nullptr;

void AbortCall(png_structp png, png_const_charp) {
  library->abortPng(png, 1);
}

void IgnoreWarning(png_structp, png_const_charp) {}

void ReadInput(png_structp png, png_bytep bytes, size_t size) {
  auto* const file = static_cast<FileInput*>(library->getPngInput(png));
  if (file->Read(bytes, static_cast<int>(size)) != static_cast<int>(size)) {
    library->abortPng(png, 1);
  }
}

/// The library's structures for one file.
struct PngStructures {
  png_structp png = nullptr;
  png_infop info = nullptr;

  PngStructures() {
    png = library->createPng(PNG_LIBPNG_VER_STRING, nullptr, AbortCall, IgnoreWarning);
    info = png == nullptr ? nullptr : library->createPngInfo(png);
  }
  ~PngStructures() {
    if (png != nullptr) {
      library->destroyPng(&png, &info, nullptr);
    }
  }
  PngStructures(const PngStructures&) = delete;
  PngStructures& operator=(const PngStructures&) = delete;
};

/// Errors of the library jump back to setjmp, past any destructors in between.
bool ReadInfo(png_structp png, png_infop info, FileInput& file) {
  std::jmp_buf* const onError = library->setPngJump(png, std::longjmp, sizeof(std::jmp_buf));
  if (onError == nullptr || setjmp(*onError) != 0) {
    return false;
  }
  library->setPngReader(png, &file, ReadInput);
  library->limitPngChunks(png, kMaxChunk);
  library->skipPngChunks(png, PNG_HANDLE_CHUNK_NEVER, kSkippedChunks, kSkippedChunkCount);
  library->readPngInfo(png, info);
  return true;
}

int ToDensity(png_uint_32 perUnit, png_uint_32 divisor) {
  return static_cast<int>(std::min(perUnit / divisor, png_uint_32{kMaxDensity}));
}

JpegDensity DensityOf(png_structp png, png_infop info) {
  png_uint_32 x = 0;
  png_uint_32 y = 0;
  int unit = PNG_RESOLUTION_UNKNOWN;
  JpegDensity density;
  if (library->getPngDensity(png, info, &x, &y, &unit) == 0) {
    return density;
  }
  const bool metres = unit == PNG_RESOLUTION_METER;
  density.unit = metres ? kPerCentimetre : 0;
  density.x = ToDensity(x, metres ? kCentimetres : 1);
  density.y = ToDensity(y, metres ? kCentimetres : 1);
  return density;
}

PngHeader HeaderOf(png_structp png, png_infop info) {
  PngHeader header;
  png_fixed_point exponent = 0;
  header.bitDepth = library->getPngDepth(png, info);
  header.linear = library->getPngGamma(png, info, &exponent) != 0 && exponent >= kMinLinearExponent;
  header.density = DensityOf(png, info);
  return header;
}

}  // namespace

std::optional<PngHeader> ReadPngHeader(const VipsLibrary& vips, int descriptor) {
  library = &vips;
  FileInput file(descriptor);
  const PngStructures structures;
  if (structures.info == nullptr || !ReadInfo(structures.png, structures.info, file)) {
    return std::nullopt;
  }
  return HeaderOf(structures.png, structures.info);
}

}  // namespace vela
