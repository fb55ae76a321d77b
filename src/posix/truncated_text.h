// Text truncated to the size of a fixed buffer.
#pragma once

#include <cstddef>
#include <string>

namespace vela {

/// Size in bytes, terminator included, of the buffers that hold a path or a formatted argument.
inline constexpr std::size_t kPathBufferSize = 4096;

/// Returns `text`, truncated to fit a buffer of `bufferSize` bytes, terminator included.
inline std::string Truncated(const std::string& text, std::size_t bufferSize = kPathBufferSize) {
  return text.substr(0, bufferSize - 1);
}

/// Returns the path of the file `name` in the directory `dir`, truncated to fit a path buffer.
inline std::string JoinPath(const std::string& dir, const std::string& name) {
  std::string path = dir;
  path += '/';
  path += name;
  return path.size() < kPathBufferSize ? path : Truncated(path);
}

}  // namespace vela
