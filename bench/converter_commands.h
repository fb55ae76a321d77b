// The command lines that the benchmark of the converter compares.
#pragma once

#include <string>
#include <vector>

namespace vela_bench {

using Command = std::vector<std::string>;

constexpr char kImageMagick[] = "/usr/bin/convert-im6.q16";

/// Six sharpened outputs of a photo in one run, as requested by velathumb, written to `directory`.
/// `program`: the converter or ImageMagick.
Command SixOutputs(const std::string& program, const std::string& photo,
                   const std::string& directory);

/// Only the smallest of the six.
Command SmallestOutput(const std::string& program, const std::string& photo,
                       const std::string& directory);

/// Only the largest of the six, made by vipsthumbnail.
Command LargestByVips(const std::string& photo, const std::string& directory);

/// The unavoidable work: decoding the JPEG (`width` pixels wide) at a fraction of its size, and
/// encoding the six outputs, which SixOutputs must have created in `directory`.
std::vector<Command> DecodeAndEncodes(const std::string& photo, int width,
                                      const std::string& directory);

}  // namespace vela_bench
