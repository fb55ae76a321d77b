// Tells the format of a photo from its first bytes.
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

/// The format of an open file, whatever its name; kUnknown for any other one and when it cannot be
/// read. Leaves the place where the descriptor reads alone.
PhotoFormat FormatOf(int descriptor);

}  // namespace vela
