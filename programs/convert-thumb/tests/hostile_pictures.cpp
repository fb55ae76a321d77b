#include "hostile_pictures.h"

#include <utility>
#include <vector>

#include "png_chunks.h"

namespace vela_test {
namespace {

constexpr unsigned kByteBits = 8;

/// `count` bytes of a number, little-endian.
std::string Little(uint64_t number, unsigned count) {
  const std::string big = BigEndian(number, count);
  return {big.rbegin(), big.rend()};
}

std::string Zeros(size_t count) {
  return std::string(count, '\0');
}

std::string Png(uint32_t width, uint32_t height, const std::string& data) {
  const std::string rgb("\x08\x02\0\0\0", 5);
  return "\x89PNG\r\n\x1a\n" + PngChunk("IHDR", BigEndian(width, 4) + BigEndian(height, 4) + rgb) +
         PngChunk("IDAT", data) + PngChunk("IEND", "");
}

/// Packs bits, starting with the lowest bit of a byte.
class Bits {
 public:
  void Add(unsigned bits, unsigned count) {
    for (unsigned i = 0; i < count; ++i) {
      current_ |= (bits >> i & 1) << used_;
      if (++used_ == kByteBits) {
        Flush();
      }
    }
  }

  std::string Take() {
    if (used_ > 0) {
      Flush();
    }
    return std::move(bytes_);
  }

 private:
  void Flush() {
    bytes_ += static_cast<char>(current_);
    current_ = 0;
    used_ = 0;
  }

  std::string bytes_;
  unsigned current_ = 0;
  unsigned used_ = 0;
};

/// That many zeros, compressed: each of the longest repetitions takes 13 bits.
std::string CompressedZeros(uint64_t count) {
  constexpr unsigned kRepetition = 258;
  constexpr uint64_t kChecksumBase = 65521;
  constexpr unsigned kLastBlockWithFixedCodes = 3;
  constexpr unsigned kZero = 0x0C;     // code 00110000, mirrored
  constexpr unsigned kLongest = 0xA3;  // code 11000101, mirrored
  Bits bits;
  bits.Add(kLastBlockWithFixedCodes, 3);
  bits.Add(kZero, 8);
  uint64_t left = count - 1;
  for (; left >= kRepetition; left -= kRepetition) {
    bits.Add(kLongest, 8);
    bits.Add(0, 5);
  }
  for (; left > 0; --left) {
    bits.Add(kZero, 8);
  }
  bits.Add(0, 7);
  return "\x78\x9c" + bits.Take() + BigEndian(count % kChecksumBase << 16 | 1, 4);
}

struct TiffEntry {
  unsigned tag;
  uint32_t value;
};

/// A page of a TIFF: entries of one number each, in the order of their tags.
std::string TiffPage(const std::vector<TiffEntry>& entries, uint32_t next) {
  constexpr unsigned kLong = 4;
  std::string page = Little(entries.size(), 2);
  for (const TiffEntry& entry : entries) {
    page += Little(entry.tag, 2) + Little(kLong, 2) + Little(1, 4) + Little(entry.value, 4);
  }
  return page + Little(next, 4);
}

constexpr unsigned kNestedPagesTag = 330;
constexpr size_t kTiffEntrySize = 12;
constexpr uint32_t kTiffData = 8;
constexpr uint32_t kTiffFirstPage = 16;

std::vector<TiffEntry> TiffEntries(uint32_t width, uint32_t height) {
  return {{256, width}, {257, height}, {258, 8},
          {259, 1},     {262, 1},      {273, kTiffData},
          {277, 1},     {278, height}, {279, width * height}};
}

std::string TiffHeader() {
  return std::string("II*\0", 4) + Little(kTiffFirstPage, 4) + Zeros(kTiffFirstPage - kTiffData);
}

/// Offset of a page when all pages have that many entries.
uint32_t TiffPlace(size_t page, size_t entries) {
  return static_cast<uint32_t>(kTiffFirstPage + page * (2 + entries * kTiffEntrySize + 4));
}

}  // namespace

std::string ClaimingJpeg(uint32_t width, uint32_t height) {
  const std::string start("\xFF\xD8\xFF\xDB\0\x43\0", 7);
  const std::string frame("\xFF\xC0\0\x0B\x08", 5);
  const std::string component("\x01\x01\x11\0", 4);
  // One code of one bit: a block equal to the previous one.
  const std::string codes = "\xFF\xC4" + BigEndian(20, 2);
  const std::string lengths = "\x01" + Zeros(15);
  const std::string scan("\xFF\xDA\0\x08\x01\x01\0\0\x3F\0", 10);
  return start + std::string(64, '\x01') + frame + BigEndian(height, 2) + BigEndian(width, 2) +
         component + codes + Zeros(1) + lengths + Zeros(1) + codes + "\x10" + lengths + Zeros(1) +
         scan;
}

std::string ClaimingPng(uint32_t width, uint32_t height) {
  return Png(width, height, CompressedZeros(1000));
}

std::string ClaimingGif(uint32_t width, uint32_t height) {
  const std::string size = Little(width, 2) + Little(height, 2);
  return "GIF89a" + size + std::string("\x80\0\0\0\0\0\xFF\xFF\xFF", 9) + "," + Zeros(4) + size +
         std::string("\0\x02\x02\x4c\x01\0;", 7);
}

std::string ClaimingTiff(uint32_t width, uint32_t height) {
  return TiffHeader() + TiffPage(TiffEntries(width, height), 0);
}

std::string ClaimingWebp(uint32_t width, uint32_t height) {
  const std::string canvas = Zeros(4) + Little(width - 1, 3) + Little(height - 1, 3);
  // One pixel of lossless data, which does not fill the canvas.
  const std::string pixel("\x2f\0\0\0\x10\x07\x10\x11\x11\x88\x88\x08\0\0", 14);
  const std::string chunks =
      "WEBPVP8X" + Little(canvas.size(), 4) + canvas + "VP8L" + Little(pixel.size(), 4) + pixel;
  return "RIFF" + Little(chunks.size(), 4) + chunks;
}

std::string ClaimingPpm(uint32_t width, uint32_t height) {
  return "P6 " + std::to_string(width) + " " + std::to_string(height) + " 255\n" + Zeros(1000);
}

std::string ClaimingBmp(uint32_t width, uint32_t height) {
  return "BM" + Little(1054, 4) + Zeros(4) + Little(54, 4) + Little(40, 4) + Little(width, 4) +
         Little(height, 4) + Little(1, 2) + Little(24, 2) + Zeros(24) + Zeros(1000);
}

std::string ClaimingPsd(uint32_t width, uint32_t height) {
  return "8BPS" + BigEndian(1, 2) + Zeros(6) + BigEndian(3, 2) + BigEndian(height, 4) +
         BigEndian(width, 4) + BigEndian(8, 2) + BigEndian(3, 2) + Zeros(14) + Zeros(1000);
}

std::string BlackPng(uint32_t width, uint32_t height) {
  return Png(width, height, CompressedZeros((uint64_t{width} * 3 + 1) * height));
}

std::string LongGif(uint32_t width, uint32_t height, size_t frames) {
  // A separate code for every pixel, of the width that codes have right after a reset.
  Bits bits;
  constexpr unsigned kCodeBits = 3;
  constexpr unsigned kReset = 4;
  constexpr unsigned kEnd = 5;
  for (uint32_t i = 0; i < width * height; ++i) {
    if (i % 2 == 0) {
      bits.Add(kReset, kCodeBits);
    }
    bits.Add(i % 2, kCodeBits);
  }
  bits.Add(kEnd, kCodeBits);
  const std::string data = bits.Take();
  const std::string size = Little(width, 2) + Little(height, 2);
  std::string frame = "," + Zeros(4) + size + std::string("\0\x02", 2);
  constexpr size_t kBlock = 255;
  for (size_t i = 0; i < data.size(); i += kBlock) {
    const std::string block = data.substr(i, kBlock);
    frame += static_cast<char>(block.size()) + block;
  }
  frame += Zeros(1);
  std::string gif = "GIF89a" + size + std::string("\x80\0\0\0\0\0\xFF\xFF\xFF", 9);
  for (size_t i = 0; i < frames; ++i) {
    gif += frame;
  }
  return gif + ";";
}

std::string ManyPagesTiff(size_t pages, size_t loopTo) {
  constexpr uint32_t kSide = 2;
  const std::vector<TiffEntry> entries = TiffEntries(kSide, kSide);
  std::string tiff = TiffHeader();
  for (size_t i = 0; i < pages; ++i) {
    const size_t next = i + 1 < pages ? i + 1 : loopTo;
    tiff += TiffPage(entries, next < pages ? TiffPlace(next, entries.size()) : 0);
  }
  return tiff;
}

std::string NestedTiff(size_t depth) {
  constexpr uint32_t kSide = 2;
  std::vector<TiffEntry> entries = TiffEntries(kSide, kSide);
  entries.push_back({kNestedPagesTag, 0});
  std::string tiff = TiffHeader();
  for (size_t i = 0; i < depth; ++i) {
    entries.back().value = TiffPlace((i + 1) % depth, entries.size());
    tiff += TiffPage(entries, 0);
  }
  return tiff;
}

std::string RepeatLastScan(const std::string& jpeg, size_t times) {
  const size_t scan = jpeg.rfind("\xFF\xDA");
  const size_t end = jpeg.size() - 2;
  const std::string last = jpeg.substr(scan, end - scan);
  std::string repeated = jpeg.substr(0, end);
  for (size_t i = 1; i < times; ++i) {
    repeated += last;
  }
  return repeated + "\xFF\xD9";
}

}  // namespace vela_test
