// Encodes a picture as JPEG.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <optional>

#include "jpeg_traits.h"
#include "picture.h"

struct FreeEncoded {
  void operator()(unsigned char* memory) const { std::free(memory); }
};

/// The bytes of a file.
struct EncodedJpeg {
  std::unique_ptr<unsigned char, FreeEncoded> bytes;
  size_t size = 0;
};

/// Encodes with `quality` (1 to 100). Colour is stored as finely as in the photo that `traits` are
/// of; a colour picture without any colour is stored as grey. The colour profile goes along when
/// `withProfile`. Empty when memory runs out.
std::optional<EncodedJpeg> EncodeJpeg(const Picture& picture, const JpegTraits& traits, int quality,
                                      bool withProfile);
