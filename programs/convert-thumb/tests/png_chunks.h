// The parts of PNG files.
#pragma once

#include <cstdint>
#include <string>

namespace vela_test {

/// `count` bytes of a number, big-endian.
std::string BigEndian(uint64_t number, unsigned count);

/// A chunk with its length and checksum.
std::string PngChunk(const std::string& name, const std::string& data);

/// The chunk that declares samples as powers of the brightness, with an exponent in 100,000ths:
/// 100,000 is linear. ImageMagick 7 does not write it for an exponent of the user's choice.
std::string PngGamma(uint32_t exponent);

/// Adds `chunks` to the file `path`, a PNG, between its header and what follows.
void AddToPng(const std::string& path, const std::string& chunks);

}  // namespace vela_test
