// Creates the input files.
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include "likeness/jpeg_maker.h"

namespace vela_test {

using FileMaker = std::function<void(const std::string& path)>;

struct PhotoSize {
  int width = 640;
  int height = 480;
};

/// The photo as ImageMagick writes it with these options, in the format of the file's extension.
FileMaker Written(std::vector<std::string> options, PhotoSize size = {});

/// The same with an alpha channel.
FileMaker WrittenWithAlpha(std::vector<std::string> options, PhotoSize size = {});

/// The same with a colour profile embedded, as profileOf() returns it.
FileMaker WrittenWithProfile(std::vector<std::string> options, std::string (*profileOf)());

/// The photo as a PNG that declares this exponent of the brightness, in 100,000ths.
FileMaker WithGamma(uint32_t exponent);

/// The photo as a PPM, also of sizes that ImageMagick rejects.
FileMaker Raw(PhotoSize size);

/// The photo as a JPEG.
FileMaker Encoded(const JpegKind& kind, PhotoSize size = {});

/// A JPEG of `make`'s picture with EXIF orientation, rewritten in the format of the extension.
FileMaker WithOrientation(int orientation, std::vector<std::string> options = {});

/// The first `tenths` tenths of the file from `make`.
FileMaker Truncated(FileMaker make, int tenths = 6);

/// All but the last bytes of the file from `make`.
FileMaker WithoutEnd(FileMaker make, size_t bytes);

/// The file from `make` with bytes in the middle changed.
FileMaker Damaged(FileMaker make);

/// An existing file.
FileMaker Copied(const std::string& from);

}  // namespace vela_test
