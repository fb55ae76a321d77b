// Detects the format of a photo from its first bytes.
#pragma once

namespace vela {

enum class PhotoFormat {
  kUnknown,
  kJpeg,
  kOtherJpeg,  ///< with unknown data after its first marker
  kPng,
  kTiff,
  kBigTiff,   ///< TIFF of any size
  kPnm,       ///< PGM or PPM with binary samples
  kOtherPnm,  ///< PBM, and PGM or PPM with samples as text
  kPam,
  kGif,
  kWebp,
  kHeif,       ///< HEIC or AVIF
  kOtherHeif,  ///< HEIC or AVIF of a rarer kind, such as a sequence
  kJpeg2000,
  kJpeg2000Codestream,
  kBmp,
  kPsd,
};

/// Returns the format of an open file, regardless of its name; kUnknown for any other format and
/// when it cannot be read. Does not change the descriptor's position.
PhotoFormat FormatOf(int descriptor);

}  // namespace vela
