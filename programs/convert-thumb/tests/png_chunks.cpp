#include "png_chunks.h"

#include <array>

#include "support/files.h"

namespace vela_test {
namespace {

constexpr unsigned kByteBits = 8;
/// Signature and header.
constexpr size_t kFirstBytes = 33;

std::array<uint32_t, 256> CrcTable() {
  std::array<uint32_t, 256> table = {};
  for (uint32_t i = 0; i < table.size(); ++i) {
    uint32_t value = i;
    for (unsigned bit = 0; bit < kByteBits; ++bit) {
      value = (value & 1) != 0 ? 0xEDB88320U ^ (value >> 1) : value >> 1;
    }
    table[i] = value;
  }
  return table;
}

uint32_t Crc(const std::string& bytes) {
  static const std::array<uint32_t, 256> table = CrcTable();
  uint32_t crc = 0xFFFFFFFFU;
  for (const char byte : bytes) {
    crc = table[(crc ^ static_cast<unsigned char>(byte)) & 0xFF] ^ (crc >> kByteBits);
  }
  return crc ^ 0xFFFFFFFFU;
}

}  // namespace

std::string BigEndian(uint64_t number, unsigned count) {
  std::string bytes;
  for (unsigned i = count; i > 0; --i) {
    bytes += static_cast<char>(number >> ((i - 1) * kByteBits) & 0xFF);
  }
  return bytes;
}

std::string PngChunk(const std::string& name, const std::string& data) {
  return BigEndian(data.size(), 4) + name + data + BigEndian(Crc(name + data), 4);
}

std::string PngGamma(uint32_t exponent) {
  return PngChunk("gAMA", BigEndian(exponent, 4));
}

void AddToPng(const std::string& path, const std::string& chunks) {
  std::string bytes = ReadFile(path);
  bytes.insert(kFirstBytes, chunks);
  WriteFile(path, bytes);
}

}  // namespace vela_test
