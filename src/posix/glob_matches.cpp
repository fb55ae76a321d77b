#include "posix/glob_matches.h"

#include <string_view>

namespace vela {

std::string EscapePattern(const std::string& path) {
  constexpr std::string_view kSpecial = "*?[\\";
  std::string escaped;
  escaped.reserve(path.size());
  for (const char c : path) {
    if (kSpecial.find(c) != std::string_view::npos) {
      escaped += '\\';
    }
    escaped += c;
  }
  return escaped;
}

}  // namespace vela
