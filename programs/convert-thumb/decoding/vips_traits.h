// Properties of a picture that libvips reports.
#pragma once

#include "decoding/pixel_rows.h"
#include "decoding/vips_library.h"
#include "picture/photo_format.h"
#include "picture/photo_traits.h"

namespace vela {

/// Returns true when the picture has a field of this name.
bool HasVipsField(const VipsLibrary& vips, VipsImage* image, const char* name);

/// Returns true when the picture's file has more than one page or frame.
bool HasFurtherPages(const VipsLibrary& vips, VipsImage* image, PhotoFormat format);

/// Returns the background colour of the picture's file, white if there is none. `bits`: of a sample
/// in the file, at most 8.
Background ReadVipsBackground(const VipsLibrary& vips, VipsImage* image, int bits);

/// Returns density, orientation and profile, and whether the pixels are indices into a palette.
PhotoTraits ReadVipsTraits(const VipsLibrary& vips, VipsImage* image, PhotoFormat format);

}  // namespace vela
