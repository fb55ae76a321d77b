// A small whole JPEG without an encoder.
#pragma once

#include <string>

namespace vela_test {

/// A grey JPEG of this size (1 to 65535 each) that any decoder takes.
std::string GreyJpeg(int width, int height);

}  // namespace vela_test
