// Text cut to the size of a fixed buffer.
#pragma once

#include <cstddef>
#include <string>

namespace vela {

/// Size in bytes, terminator included, of the buffers that hold a path or a formatted argument.
inline constexpr std::size_t kPathBufferSize = 4096;

/// Returns what a buffer of `bufferSize` bytes, terminator included, holds of `text`.
inline std::string CutText(const std::string& text, std::size_t bufferSize = kPathBufferSize) {
  return text.substr(0, bufferSize - 1);
}

/// Returns the path of the file `name` in the directory `dir`, cut to what a path buffer holds.
inline std::string JoinPath(const std::string& dir, const std::string& name) {
  std::string path = dir;
  path += '/';
  path += name;
  return path.size() < kPathBufferSize ? path : CutText(path);
}

}  // namespace vela
