// Detects the format of a photo from its first bytes.
#pragma once

namespace vela {

enum class PhotoFormat {
  kUnknown,
  kJpeg,
  kPng,
  kTiff,
  kPnm,  ///< PGM or PPM with binary samples
  kGif,
  kWebp,
  kHeif,  ///< HEIC or AVIF
  kJpeg2000,
};

/// Returns the format of an open file, regardless of its name; kUnknown for any other format and
/// when it cannot be read. Does not change the descriptor's position.
PhotoFormat FormatOf(int descriptor);

}  // namespace vela
