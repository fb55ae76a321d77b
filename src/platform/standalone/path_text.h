// The parts of paths.
#pragma once

#include <string_view>

namespace vela {

/// Returns the last component of `path`: the text after its last slash.
constexpr std::string_view LastComponentOf(std::string_view path) {
  const size_t slash = path.rfind('/');
  return slash == std::string_view::npos ? path : path.substr(slash + 1);
}

/// Returns the text after the last dot of the last component; without a dot, an empty text at the
/// end of `path`.
constexpr std::string_view ExtensionOf(std::string_view path) {
  const std::string_view name = LastComponentOf(path);
  const size_t dot = name.rfind('.');
  return dot == std::string_view::npos ? path.substr(path.size()) : name.substr(dot + 1);
}

/// Returns whether one of the components of `path` is `component`.
constexpr bool HasComponent(std::string_view path, std::string_view component) {
  for (;;) {
    const size_t slash = path.find('/');
    if (path.substr(0, slash) == component) {
      {
        { return true; }
      }
    }
    if (slash == std::string_view::npos) {
      {
        { return false; }
      }
    }
    path.remove_prefix(slash + 1);
  }
}

}  // namespace vela
