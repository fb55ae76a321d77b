// Parses the values of options.
#pragma once

#include <optional>
#include <string>

#include "command_line/conversion_plan.h"

namespace vela {

/// Parses a whole number without a sign, from `min` to `max`; empty for any other text.
std::optional<int> ParseWholeNumber(const std::string& text, int min, int max);

/// Parses "WxH>" or "WxH>^", both sides in pixels from 1 to 65535; empty for any other text.
std::optional<ThumbnailBox> ParseThumbnailBox(const std::string& text);

/// Parses degrees clockwise and returns quarter turns, 0 to 3; empty unless a multiple of 90.
std::optional<int> ParseQuarterTurns(const std::string& text);

/// Returns the file name of an output argument: of kDiscardedOutput the null device, of others the
/// text, in which "%%" represents a percent sign. Empty when the text contains any other percent
/// sign or does not name a JPEG file.
std::optional<std::string> ParseOutputPath(const std::string& text);

}  // namespace vela
