// The sets of arguments that every input of the comparison is converted with.
#pragma once

#include <string>
#include <vector>

#include "command_line.h"

namespace vela_test {

constexpr const char* kSix = "six";        ///< six outputs in one run, fitting, sharpened
constexpr const char* kFill = "fill";      ///< filling the box, not sharpened
constexpr const char* kTurned = "turned";  ///< two outputs, turned by 90 degrees
constexpr const char* kSingle = "single";  ///< one small output, sharpened
constexpr const char* kSmall = "small";    ///< one very small output, sharpened
constexpr const char* kMiddle = "middle";  ///< one output of middle size, sharpened
constexpr const char* kBare = "bare";      ///< two outputs with as few options as possible

/// The sets for most inputs.
std::vector<std::string> UsualVectors();

/// The sets for photos that need not be decoded at full size.
std::vector<std::string> PhotographVectors();

/// The outputs of one set, largest first. `large`: of the usual sizes, otherwise smaller ones.
std::vector<ThumbOptions> OutputsOf(const std::string& vector, bool large);

}  // namespace vela_test
