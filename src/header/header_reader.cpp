#include "header/header_reader.h"

#include <cerrno>
#include <cstdlib>

#include "header/reader_process.h"
#include "posix/folder.h"

namespace vela {

namespace {

/// Never destroyed: a thread may still use it while the program exits.
ReaderProcess& TheProcess() {
  static ReaderProcess* const process = [] {
    std::atexit(EndHeaderReader);
    return new ReaderProcess;
  }();
  return *process;
}

}  // namespace

int ReadImageSize(const char* path, uint32_t& width, uint32_t& height) {
  OpenedFile file;
  const int error = OpenRegularFile(path, file);
  if (error != 0) {
    return error;
  }
  const auto answer = TheProcess().Ask(HeaderTopic::kImageSize, file);
  if (!answer || answer->isRead != 1 || answer->width == 0 || answer->height == 0) {
    return EINVAL;
  }
  width = answer->width;
  height = answer->height;
  return 0;
}

std::optional<std::string> ReadExifOrientation(const std::string& path) {
  OpenedFile file;
  if (OpenRegularFile(path, file) != 0) {
    return std::nullopt;
  }
  const auto answer = TheProcess().Ask(HeaderTopic::kExifOrientation, file);
  if (!answer || answer->isRead != 1) {
    return std::nullopt;
  }
  return answer->orientation;
}

void EndHeaderReader() {
  TheProcess().End();
}

}  // namespace vela
