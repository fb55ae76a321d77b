// Reads what libvips knows of a picture besides its samples.
#pragma once

#include "decoding/photo_format.h"
#include "decoding/photo_traits.h"
#include "decoding/pixel_rows.h"
#include "decoding/vips_library.h"

namespace vela {

/// Whether the picture has a field of this name.
bool HasVipsField(const VipsLibrary& vips, VipsImage* image, const char* name);

/// Whether the picture's file has more than one page or frame.
bool HasFurtherPages(const VipsLibrary& vips, VipsImage* image, PhotoFormat format);

/// What the picture's file wants to be seen through it, or else white. `bits`: of a sample in the
/// file, at most 8.
Background ReadVipsBackground(const VipsLibrary& vips, VipsImage* image, int bits);

/// Density, orientation, profile, and whether the pixels are numbers of colours.
PhotoTraits ReadVipsTraits(const VipsLibrary& vips, VipsImage* image, PhotoFormat format);

}  // namespace vela
