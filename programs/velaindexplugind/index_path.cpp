#include "index_path.h"

#include <filesystem>

namespace vela {

std::string PlainPath(std::string_view path) {
  std::string plain = std::filesystem::path(path).lexically_normal().native();
  // Two slashes in front can have a meaning of their own elsewhere; here they have none.
  const size_t first = plain.find_first_not_of('/');
  if (first == std::string::npos) return "/";
  plain.erase(0, first - 1);
  if (plain.back() == '/') plain.pop_back();
  return plain;
}

std::string_view ParentOf(std::string_view path) {
  if (path.size() <= 1) return {};
  const size_t slash = path.rfind('/');
  return slash == 0 ? std::string_view("/") : path.substr(0, slash);
}

}  // namespace vela
