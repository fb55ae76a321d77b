#include "decoding/pnm_reader.h"

#include <csetjmp>
#include <cstdio>

#include "platform/installed_names.h"
#include "posix/loaded_library.h"
#include "process/source_file.h"

extern "C" {
#include <netpbm/pam.h>
}

namespace vela {

namespace {

constexpr sample kMaxByte = 255;
constexpr sample kMaxWord = 65535;

void DropMessage(const char*) {}

/// The functions of libnetpbm that are used. It is loaded only for a photo that needs it. It has
/// global state, so only one thread at a time may use it.
class NetpbmLibrary final : private LoadedLibrary {
 public:
  /// Returns the library, loaded by the first call, with its messages turned off; null when it, or
  /// one of its functions, is missing.
  static const NetpbmLibrary* Get() {
    static const NetpbmLibrary library;
    return library.IsLoaded() ? &library : nullptr;
  }

  /// Sets the jump target for errors; without one they end the process.
  decltype(&::pm_setjmpbuf) setJump = nullptr;
  decltype(&::pnm_readpaminit) readHeader = nullptr;

 private:
  NetpbmLibrary() : LoadedLibrary(kNetpbmLibrary) {
    decltype(&::pm_init) initialise = nullptr;
    decltype(&::pm_setusermessagefn) setMessage = nullptr;
    decltype(&::pm_setusererrormsgfn) setErrorMessage = nullptr;
    Find("pm_init", initialise);
    Find("pm_setusermessagefn", setMessage);
    Find("pm_setusererrormsgfn", setErrorMessage);
    Find("pm_setjmpbuf", setJump);
    Find("pnm_readpaminit", readHeader);
    if (IsLoaded()) {
      initialise("convert-thumb", 0);
      setMessage(DropMessage);
      setErrorMessage(DropMessage);
    }
  }
};

/// Errors of the library jump back to setjmp, past any destructors in between.
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

bool IsSupported(const pam& header) {
  return header.width > 0 && header.height > 0 &&
         static_cast<uint64_t>(header.width) * static_cast<uint64_t>(header.height) <= kMaxPixels &&
         (header.depth == 1 || header.depth == 3) &&
         (header.maxval == kMaxByte || header.maxval == kMaxWord);
}

/// Converts big-endian samples of two bytes in place.
void JoinBytes(uint8_t* row, size_t samples) {
  auto* const joined = reinterpret_cast<uint16_t*>(row);
  for (size_t i = 0; i < samples; ++i) {
    joined[i] = static_cast<uint16_t>(row[2 * i] << 8 | row[2 * i + 1]);
  }
}

}  // namespace

PnmReader::PnmReader(int descriptor, bool firstPageOnly)
    : descriptor_(descriptor), file_(OpenStream(descriptor)), firstPageOnly_(firstPageOnly) {}

bool PnmReader::ReadHeader() {
  const NetpbmLibrary* const netpbm = NetpbmLibrary::Get();
  pam header = {};
  if (netpbm == nullptr || file_ == nullptr || !ReadHeaderOf(*netpbm, file_.get(), header) ||
      !IsSupported(header)) {
    return false;
  }
  size_ = {header.width, header.height};
  channels_ = static_cast<int>(header.depth);
  sampleSize_ = header.maxval == kMaxByte ? sizeof(uint8_t) : sizeof(uint16_t);
  traits_.space = channels_ == 1 ? ColourSpace::kGrey : ColourSpace::kRgb;
  return firstPageOnly_ || !HasMoreData();
}

size_t PnmReader::RowBytes() const {
  return static_cast<size_t>(size_.width) * static_cast<size_t>(channels_) * sampleSize_;
}

bool PnmReader::HasMoreData() const {
  const int64_t end = ftello(file_.get()) + static_cast<int64_t>(RowBytes()) * size_.height;
  const int64_t size = SizeOf(descriptor_);
  return size < 0 || size > end;
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
