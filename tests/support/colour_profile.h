// Colour profiles as files embed them.
#pragma once

#include <lcms2.h>

#include <string>

namespace vela_test {

/// The profile's bytes; closes it.
std::string ProfileBytes(cmsHPROFILE profile);

}  // namespace vela_test
