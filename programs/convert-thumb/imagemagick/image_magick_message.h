// What ImageMagick says when it fails.
#pragma once

#include <string>
#include <string_view>

namespace vela {

/// Returns the most telling of several messages of ImageMagick, one on each line: the first error
/// of a decoder, or else the first error, or else the first line. The result is without the name of
/// the program, of the descriptor that it was given and of the place in its sources. Empty when
/// there are no messages.
std::string MainMessage(std::string_view messages);

}  // namespace vela
