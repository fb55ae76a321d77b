// The command lines that the converter's benchmark compares.
#pragma once

#include <string>
#include <vector>

namespace vela_bench {

using Command = std::vector<std::string>;

constexpr char kImageMagick[] = "/usr/bin/convert-im6.q16";

/// Six sharpened outputs of a photo in one run, as velathumb asks for them, written to `directory`.
/// `program`: the converter or ImageMagick.
Command SixOutputs(const std::string& program, const std::string& photo,
                   const std::string& directory);

/// The smallest of the six alone.
Command SmallestOutput(const std::string& program, const std::string& photo,
                       const std::string& directory);

/// The largest of the six alone, made by vipsthumbnail.
Command LargestByVips(const std::string& photo, const std::string& directory);

/// What cannot be left out: a decode of the JPEG (`width` pixels wide) at a fraction of its size,
/// and the encodes of the six outputs, which SixOutputs has to have made in `directory`.
std::vector<Command> DecodeAndEncodes(const std::string& photo, int width,
                                      const std::string& directory);

}  // namespace vela_bench
