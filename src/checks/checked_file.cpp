#include "checks/checked_file.h"

#include <cerrno>

#include "posix/file_content.h"

namespace vela {

FileRead ReadCheckedFile(const std::string& path, std::string& text, int& error) {
  error = ReadFile(path.c_str(), text);
  switch (error) {
    case 0:
      return FileRead::kDone;
    case ENOENT:
    case ENOTDIR:
    case EISDIR:
    case ELOOP:
    case ENAMETOOLONG:
    case ENXIO:
      return FileRead::kFaulty;
    default:
      return FileRead::kUnchecked;
  }
}

}  // namespace vela
