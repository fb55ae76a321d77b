#include <string_view>

#include "platform/standalone/path_text.h"
#include "platform/velaindex.h"
#include "platform/velautils.h"

namespace VELAUtils {

std::string GetPathDirName(const std::string& path) {
  const size_t slash = path.rfind('/');
  if (slash == std::string::npos) {
    return ".";
  }
  const size_t last = path.find_last_not_of('/', slash);
  return last == std::string::npos ? "/" : path.substr(0, last + 1);
}

std::string GetPathExt(const std::string& path) {
  return std::string(vela::ExtensionOf(path));
}

}  // namespace VELAUtils

const char* VELAIndexExtGet(const char* path) {
  if (path == nullptr) {
    return "";
  }
  // The extension ends where the path ends, so its text is terminated as well.
  return vela::ExtensionOf(path).data();
}
