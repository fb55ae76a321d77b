#include "turning/jpeg_turn.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <memory>
#include <optional>
#include <vector>

#include "encoding/output_file.h"
#include "failure_line.h"
#include "posix/file_descriptor.h"
#include "turning/turbojpeg_library.h"

namespace vela {

namespace {

constexpr TJXOP kOperations[] = {TJXOP_NONE, TJXOP_ROT90, TJXOP_ROT180, TJXOP_ROT270};

/// A coefficient for each of three samples a pixel, of the old picture and of the turned one.
constexpr size_t kBytesPerPixel = 2 * 3 * sizeof(short);

struct FileContent {
  std::vector<unsigned char> bytes;
  struct stat status = {};
};

bool ReadAll(int descriptor, std::vector<unsigned char>& bytes) {
  size_t done = 0;
  while (done < bytes.size()) {
    const ssize_t got = read(descriptor, bytes.data() + done, bytes.size() - done);
    if (got < 0 && errno == EINTR) {
      continue;
    }
    if (got <= 0) {
      return false;
    }
    done += static_cast<size_t>(got);
  }
  return true;
}

/// Whether nothing but its name leads to it, and nothing but its status and content belongs to it.
bool CanBeReplaced(int descriptor, const struct stat& status) {
  return S_ISREG(status.st_mode) && status.st_nlink == 1 && status.st_uid == geteuid() &&
         status.st_gid == getegid() && !HasExtendedAttributes(descriptor);
}

/// Empty when it cannot be replaced, cannot be read, or is larger than `limit` bytes.
std::optional<FileContent> ReadFile(const std::string& path, size_t limit) {
  const FileDescriptor file(
      open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOCTTY | O_NONBLOCK | O_NOFOLLOW));
  FileContent content;
  if (!file.IsOpen() || fstat(file.Get(), &content.status) != 0 ||
      !CanBeReplaced(file.Get(), content.status) ||
      static_cast<size_t>(content.status.st_size) > limit) {
    return std::nullopt;
  }
  content.bytes.resize(static_cast<size_t>(content.status.st_size));
  return ReadAll(file.Get(), content.bytes) ? std::optional<FileContent>(std::move(content))
                                            : std::nullopt;
}

/// The library's transformer and the turned file that it makes.
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
  const std::optional<FileContent> content = ReadFile(path, memoryLimit);
  const TurbojpegLibrary* const library = content ? TurbojpegLibrary::Get() : nullptr;
  if (library == nullptr) {
    return FileTurn::kImpossible;
  }
  Transformer transformer(*library);
  if (!transformer.Fits(content->bytes, memoryLimit) ||
      !transformer.Turn(content->bytes, quarterTurns)) {
    return FileTurn::kImpossible;
  }
  switch (ReplaceFile(path, transformer.Turned(), transformer.Size(), content->status)) {
    case Replacement::kDone:
      return FileTurn::kDone;
    case Replacement::kImpossible:
      return FileTurn::kImpossible;
    case Replacement::kFailed:
      break;
  }
  TellFailure("cannot replace %s: %s", path.c_str(), std::strerror(errno));
  return FileTurn::kFailed;
}

}  // namespace vela
