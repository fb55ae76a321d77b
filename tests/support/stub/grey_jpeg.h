// A small complete JPEG, made without an encoder.
#pragma once

#include <string>

namespace vela_test {

/// A grey JPEG of this size (1 to 65535 each) that any decoder accepts.
std::string GreyJpeg(int width, int height);

}  // namespace vela_test
