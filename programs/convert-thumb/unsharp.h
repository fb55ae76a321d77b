// Sharpens a picture.
#pragma once

#include "conversion_plan.h"
#include "picture.h"

/// Adds to every sample its difference from the blurred picture, as `mask` says.
void Sharpen(Picture& picture, const UnsharpMask& mask);
