// The command lines that the converter benchmark compares.
#pragma once

#include <string>
#include <vector>

#include "platform/installed_names.h"

namespace vela_bench {

using Command = std::vector<std::string>;

constexpr const char* kImageMagick = vela::kImageMagickProgram;

/// Makes six sharpened outputs of a photo in `directory` in one run, with the options that
/// velathumb uses. `program`: path of the converter or of ImageMagick.
Command SixOutputs(const std::string& program, const std::string& photo,
                   const std::string& directory);

/// Makes only the smallest of the six outputs.
Command SmallestOutput(const std::string& program, const std::string& photo,
                       const std::string& directory);

/// Makes only the largest of the six outputs, with vipsthumbnail.
Command LargestByVips(const std::string& photo, const std::string& directory);

/// The work that every converter has to do: decode the JPEG (`width` pixels wide) at a fraction of
/// its size, and encode the six outputs, which SixOutputs must have made in `directory` before.
std::vector<Command> DecodeAndEncodes(const std::string& photo, int width,
                                      const std::string& directory);

}  // namespace vela_bench
