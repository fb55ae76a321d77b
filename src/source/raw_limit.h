// Raw photos that are too large to be decoded.
#pragma once

#include <string>

namespace vela {

/// Returns false when the header of the raw photo `rawPath` claims more pixels than the setting
/// raw_pixel_limit allows; true when its size is not known.
bool IsWithinRawLimit(const std::string& rawPath);

}  // namespace vela
