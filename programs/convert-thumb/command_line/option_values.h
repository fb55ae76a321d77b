// The values that options carry.
#pragma once

#include <optional>
#include <string>

#include "command_line/conversion_plan.h"

namespace vela {

/// A whole number without sign, from `least` to `most`; empty for any other text.
std::optional<int> ParseWholeNumber(const std::string& text, int least, int most);

/// "WxH>" or "WxH>^", both sides in pixels from 1 to 65535; empty for any other text.
std::optional<ThumbnailBox> ParseThumbnailBox(const std::string& text);

/// "RADIUS[xSIGMA][+AMOUNT][+THRESHOLD]" in decimal fractions, missing parts as UnsharpMask has
/// them. Empty for any other text and for sizes that no photo is sharpened with.
std::optional<UnsharpMask> ParseUnsharpMask(const std::string& text);

/// Degrees clockwise as quarter turns, 0 to 3; empty when it is no multiple of 90.
std::optional<int> ParseQuarterTurns(const std::string& text);

/// The file name that an output argument stands for: a doubled percent sign is a single one. Empty
/// when the text has any other percent sign or names anything but a JPEG file.
std::optional<std::string> ParseOutputPath(const std::string& text);

}  // namespace vela
