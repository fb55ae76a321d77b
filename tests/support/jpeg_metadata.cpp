// The contents of a JPEG besides its picture, read from its segments.
#include <cstddef>
#include <cstdint>

#include "support/files.h"
#include "support/image_checks.h"

namespace vela_test {

namespace {

constexpr int kStartOfScan = 0xda;
constexpr int kComment = 0xfe;
constexpr int kApp1 = 0xe1;
constexpr int kApp2 = 0xe2;
constexpr int kApp13 = 0xed;
constexpr int kOrientationTag = 0x0112;

uint32_t Byte(const std::string& text, size_t position) {
  return position < text.size() ? static_cast<uint8_t>(text[position]) : 0;
}

uint32_t Short(const std::string& text, size_t position, bool bigEndian) {
  const uint32_t first = Byte(text, position);
  const uint32_t second = Byte(text, position + 1);
  return bigEndian ? first << 8 | second : second << 8 | first;
}

uint32_t Long(const std::string& text, size_t position, bool bigEndian) {
  const uint32_t first = Short(text, position, bigEndian);
  const uint32_t second = Short(text, position + 2, bigEndian);
  return bigEndian ? first << 16 | second : second << 16 | first;
}

bool StartsWith(const std::string& text, const std::string& beginning) {
  return text.compare(0, beginning.size(), beginning) == 0;
}

/// The orientation in the first directory of an EXIF block (after its "Exif" header).
int OrientationIn(const std::string& tiff) {
  constexpr size_t kEntrySize = 12;
  const bool bigEndian = StartsWith(tiff, "MM");
  const size_t directory = Long(tiff, 4, bigEndian);
  const size_t entries = Short(tiff, directory, bigEndian);
  for (size_t i = 0; i < entries; ++i) {
    const size_t entry = directory + 2 + i * kEntrySize;
    if (Short(tiff, entry, bigEndian) == kOrientationTag) {
      return static_cast<int>(Short(tiff, entry + 8, bigEndian));
    }
  }
  return 0;
}

/// Whether a Photoshop segment contains an IPTC resource that is not empty.
bool HoldsIptc(const std::string& segment) {
  const std::string resource = std::string("8BIM\x04\x04", 6);
  const size_t found = segment.find(resource);
  if (found == std::string::npos) {
    return false;
  }
  // A name, padded to an even length with its length byte, and the size.
  const size_t name = found + resource.size();
  const size_t nameSize = (size_t{Byte(segment, name)} + 2) / 2 * 2;
  return Long(segment, name + nameSize, true) > 0;
}

void RecordSegment(int marker, const std::string& content, JpegMetadata* metadata) {
  const std::string exif("Exif\0\0", 6);
  if (marker == kComment) {
    metadata->comment = true;
  } else if (marker == kApp1 && StartsWith(content, exif)) {
    metadata->exif = true;
    metadata->orientation = OrientationIn(content.substr(exif.size()));
  } else if (marker == kApp1 && StartsWith(content, "http://ns.adobe.com/xap/1.0/")) {
    metadata->xmp = true;
  } else if (marker == kApp2 && StartsWith(content, "ICC_PROFILE")) {
    metadata->icc = true;
  } else if (marker == kApp13 && HoldsIptc(content)) {
    metadata->iptc = true;
  }
}

}  // namespace

JpegMetadata ReadJpegMetadata(const std::string& path) {
  const std::string file = ReadFile(path);
  JpegMetadata metadata;
  size_t position = 2;
  while (position + 4 <= file.size() && Byte(file, position) == 0xff) {
    const int marker = static_cast<int>(Byte(file, position + 1));
    const size_t length = Short(file, position + 2, true);
    if (marker == kStartOfScan || length < 2) {
      break;
    }
    RecordSegment(marker, file.substr(position + 4, length - 2), &metadata);
    position += 2 + length;
  }
  return metadata;
}

}  // namespace vela_test
