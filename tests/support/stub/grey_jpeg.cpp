#include "support/stub/grey_jpeg.h"

#include <cstddef>

namespace vela_test {

namespace {

std::string Bytes(std::initializer_list<int> values) {
  std::string bytes;
  for (const int value : values) {
    bytes += static_cast<char>(value);
  }
  return bytes;
}

std::string QuantisationTable() {
  constexpr size_t kEntries = 64;
  return Bytes({0xff, 0xdb, 0, 67, 0}) + std::string(kEntries, '\1');
}

std::string FrameHeader(int width, int height) {
  return Bytes(
      {0xff, 0xc0, 0, 11, 8, height >> 8, height & 255, width >> 8, width & 255, 1, 1, 0x11, 0});
}

/// A code table with one code: the bit 0 for the value 0.
std::string CodeTable(int classAndNumber) {
  constexpr size_t kLengths = 16;
  std::string counts(kLengths, '\0');
  counts[0] = '\1';
  return Bytes({0xff, 0xc4, 0, 20, classAndNumber}) + counts + std::string(1, '\0');
}

}  // namespace

std::string GreyJpeg(int width, int height) {
  constexpr size_t kBlockEdge = 8;
  // Every block is two bits: no change of brightness, no detail.
  constexpr size_t kBlocksPerByte = 4;
  const size_t blocks = ((static_cast<size_t>(width) + kBlockEdge - 1) / kBlockEdge) *
                        ((static_cast<size_t>(height) + kBlockEdge - 1) / kBlockEdge);
  const std::string start = Bytes({0xff, 0xd8});
  const std::string scanHeader = Bytes({0xff, 0xda, 0, 8, 1, 1, 0, 0, 63, 0});
  const std::string scan((blocks + kBlocksPerByte - 1) / kBlocksPerByte, '\0');
  return start + QuantisationTable() + FrameHeader(width, height) + CodeTable(0x00) +
         CodeTable(0x10) + scanHeader + scan + Bytes({0xff, 0xd9});
}

}  // namespace vela_test
