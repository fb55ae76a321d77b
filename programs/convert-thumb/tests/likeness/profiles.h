// Colour profiles of cameras, monitors and presses.
#pragma once

#include <string>

namespace vela_test {

/// Each returns the profile's bytes.
std::string WideRgbProfile();     ///< green far outside sRGB, gamma 2.2, as in cameras
std::string DisplayRgbProfile();  ///< the primaries of today's displays and phones
std::string GreyProfile();        ///< grey, gamma 2.2
std::string InkProfile();         ///< cyan, magenta, yellow and black

}  // namespace vela_test
