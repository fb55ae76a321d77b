#include "decoding/pnm_reader.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "decoding/netpbm_library.h"

namespace vela {

namespace {

constexpr sample kByteEnd = 255;
constexpr sample kWordEnd = 65535;

FILE* OpenAgain(int descriptor) {
  const int copy = fcntl(descriptor, F_DUPFD_CLOEXEC, 0);
  if (copy < 0) {
    return nullptr;
  }
  FILE* const file = fdopen(copy, "rb");
  if (file == nullptr) {
    close(copy);
  }
  return file;
}

/// An error of the library jumps back here. Nothing that would have to be cleaned up may live
/// between the two.
bool ReadHeaderOf(const NetpbmLibrary& netpbm, FILE* file, pam& header) {
  std::jmp_buf onError;
  if (setjmp(onError) != 0) {
    netpbm.setJump(nullptr);
    return false;
  }
  netpbm.setJump(&onError);
  netpbm.readHeader(file, &header, sizeof header);
  netpbm.setJump(nullptr);
  return true;
}

bool IsUsual(const pam& header) {
  return header.width > 0 && header.height > 0 &&
         static_cast<uint64_t>(header.width) * static_cast<uint64_t>(header.height) <=
             kMostPixels &&
         (header.depth == 1 || header.depth == 3) &&
         (header.maxval == kByteEnd || header.maxval == kWordEnd);
}

/// Makes samples of two bytes, the higher one first.
void JoinBytes(uint8_t* row, size_t samples) {
  auto* const joined = reinterpret_cast<uint16_t*>(row);
  for (size_t i = 0; i < samples; ++i) {
    joined[i] = static_cast<uint16_t>(row[2 * i] << 8 | row[2 * i + 1]);
  }
}

}  // namespace

PnmReader::PnmReader(int descriptor, bool firstPageOnly)
    : file_(OpenAgain(descriptor)), firstPageOnly_(firstPageOnly) {}

bool PnmReader::ReadHeader() {
  const NetpbmLibrary* const netpbm = NetpbmLibrary::Get();
  pam header = {};
  if (netpbm == nullptr || file_ == nullptr || !ReadHeaderOf(*netpbm, file_.get(), header) ||
      !IsUsual(header)) {
    return false;
  }
  size_ = {header.width, header.height};
  channels_ = static_cast<int>(header.depth);
  sampleSize_ = header.maxval == kByteEnd ? sizeof(uint8_t) : sizeof(uint16_t);
  traits_.space = channels_ == 1 ? ColourSpace::kGrey : ColourSpace::kRgb;
  return firstPageOnly_ || !IsFollowed();
}

size_t PnmReader::RowBytes() const {
  return static_cast<size_t>(size_.width) * static_cast<size_t>(channels_) * sampleSize_;
}

bool PnmReader::IsFollowed() const {
  struct stat status;
  const int64_t end = ftello(file_.get()) + static_cast<int64_t>(RowBytes()) * size_.height;
  return fstat(fileno(file_.get()), &status) != 0 || status.st_size > end;
}

bool PnmReader::Start(PictureSize) {
  return true;
}

bool PnmReader::ReadRow(uint8_t* row) {
  if (std::fread(row, 1, RowBytes(), file_.get()) != RowBytes()) {
    error_ = "its data ends too early";
    return false;
  }
  if (sampleSize_ == sizeof(uint16_t)) {
    JoinBytes(row, RowBytes() / sizeof(uint16_t));
  }
  return true;
}

}  // namespace vela
