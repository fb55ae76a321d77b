// JPEGs of every kind, made in this process.
#pragma once

#include <string>

#include "likeness/photo.h"

namespace vela_test {

enum class JpegColours {
  kLumaChroma,     ///< like nearly every photo
  kRgb,            ///< without a change of colour space
  kGrey,           ///< one component
  kCmyk,           ///< cyan, magenta, yellow, black
  kLumaChromaInk,  ///< inks with a change of colour space
};

/// How the picture is to be encoded.
struct JpegKind {
  JpegColours colours = JpegColours::kLumaChroma;
  int quality = 92;
  int across = 2;  ///< samples of the first component for each one of the others, horizontally
  int down = 2;    ///< the same, vertically
  bool progressive = false;
  bool arithmetic = false;
  int restartRows = 0;       ///< rows of blocks between restart markers, 0: no markers
  bool editorMarker = true;  ///< inks only: stored inverted, with the marker for that
  int orientation = -1;      ///< EXIF orientation, -1: no EXIF
  int dotsPerInch = 0;       ///< 0: not stated
  std::string profile;       ///< colour profile, none when empty
};

/// The file's bytes. `picture`: three channels.
std::string EncodeKind(const Samples& picture, const JpegKind& kind);

}  // namespace vela_test
