#include "turning/jpeg_turn.h"

#include <cerrno>
#include <cstring>
#include <optional>
#include <vector>

#include "platform/installed_names.h"
#include "posix/loaded_library.h"
#include "process/failure_report.h"
#include "process/output_file.h"

#include <turbojpeg.h>

namespace vela {

namespace {

constexpr TJXOP kOperations[] = {TJXOP_NONE, TJXOP_ROT90, TJXOP_ROT180, TJXOP_ROT270};

/// A coefficient for each of three samples per pixel, of both the old and the turned picture.
constexpr size_t kBytesPerPixel = 2 * 3 * sizeof(short);

/// The functions of libturbojpeg that are used. It is loaded only when a file is to be turned:
/// thumbnails do not need it.
class TurbojpegLibrary final : private LoadedLibrary {
 public:
  /// Returns the library, loaded by the first call; null when it, or one of its functions, is
  /// missing.
  static const TurbojpegLibrary* Get() {
    static const TurbojpegLibrary library;
    return library.IsLoaded() ? &library : nullptr;
  }

  decltype(&::tjInitTransform) initTransform = nullptr;
  decltype(&::tjDecompressHeader3) readHeader = nullptr;
  decltype(&::tjTransform) transform = nullptr;
  decltype(&::tjDestroy) destroy = nullptr;
  decltype(&::tjFree) freeBuffer = nullptr;

 private:
  TurbojpegLibrary() : LoadedLibrary(kTurbojpegLibrary) {
    Find("tjInitTransform", initTransform);
    Find("tjDecompressHeader3", readHeader);
    Find("tjTransform", transform);
    Find("tjDestroy", destroy);
    Find("tjFree", freeBuffer);
  }
};

/// The library's transformer and the turned file that it produces.
class Transformer {
 public:
  explicit Transformer(const TurbojpegLibrary& library)
      : library_(library), handle_(library.initTransform()) {}
  ~Transformer() {
    library_.freeBuffer(turned_);
    if (handle_ != nullptr) {
      library_.destroy(handle_);
    }
  }
  Transformer(const Transformer&) = delete;
  Transformer& operator=(const Transformer&) = delete;

  bool Fits(const std::vector<unsigned char>& jpeg, size_t memoryLimit) {
    int width = 0;
    int height = 0;
    int sampling = 0;
    int colours = 0;
    return handle_ != nullptr &&
           library_.readHeader(handle_, jpeg.data(), jpeg.size(), &width, &height, &sampling,
                               &colours) == 0 &&
           static_cast<size_t>(width) * static_cast<size_t>(height) <= memoryLimit / kBytesPerPixel;
  }

  bool Turn(const std::vector<unsigned char>& jpeg, int quarterTurns) {
    tjtransform transform = {};
    transform.op = kOperations[quarterTurns];
    transform.options = TJXOPT_PERFECT;
    return library_.transform(handle_, jpeg.data(), jpeg.size(), 1, &turned_, &size_, &transform,
                              0) == 0;
  }

  const unsigned char* Turned() const { return turned_; }
  size_t Size() const { return size_; }

 private:
  const TurbojpegLibrary& library_;
  tjhandle handle_;
  unsigned char* turned_ = nullptr;
  unsigned long size_ = 0;
};

}  // namespace

FileTurn TurnJpegFile(const std::string& path, int quarterTurns, size_t memoryLimit) {
  const std::optional<ReplaceableFile> file = ReadReplaceableFile(path, memoryLimit);
  const TurbojpegLibrary* const library = file ? TurbojpegLibrary::Get() : nullptr;
  if (library == nullptr) {
    return FileTurn::kImpossible;
  }
  Transformer transformer(*library);
  if (!transformer.Fits(file->bytes, memoryLimit) || !transformer.Turn(file->bytes, quarterTurns)) {
    return FileTurn::kImpossible;
  }
  switch (ReplaceFile(*file, transformer.Turned(), transformer.Size())) {
    case Replacement::kDone:
      return FileTurn::kDone;
    case Replacement::kImpossible:
      return FileTurn::kImpossible;
    case Replacement::kFailed:
      break;
  }
  ReportFailure("cannot replace %s: %s", path.c_str(), std::strerror(errno));
  return FileTurn::kFailed;
}

}  // namespace vela
